// What a full rebuild costs: beyond its pauses, or without them in processor time.
#include <appindex/device_identity.h>
#include <appindex/index_mgr.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <cstdio>
#include <exception>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "appindex/elastic_control_internal.h"
#include "appindex/index_mgr_internal.h"
#include "bench/costs/content.h"
#include "bench/costs/instant_daemon.h"
#include "bench/costs/samples.h"
#include "bench/measure.h"
#include "host/device_root.h"

namespace {

using velkor::appindex::GetSupportedLangs;

constexpr useconds_t kPauseMicroseconds = 10000;
constexpr int kExchanges = 200;

bool pausing = true;
std::vector<double> pauses;  // what each of 10 ms took

void Sleep(useconds_t microseconds) {
  const timespec time{static_cast<time_t>(microseconds / 1000000),
                      static_cast<long>(microseconds % 1000000) * 1000};
  nanosleep(&time, nullptr);
}

}  // namespace

// In place of the C library's: the same, but each pause is measured, so that what else the machine
// does lengthens the pauses of the limit as much as those of the rebuild.
extern "C" __attribute__((visibility("default"))) int usleep(useconds_t microseconds) {
  if (!pausing) return 0;
  const double seconds = bench::SecondsOf([&] { Sleep(microseconds); });
  if (microseconds == kPauseMicroseconds) pauses.push_back(seconds);
  return 0;
}

namespace {

struct Document {
  std::string lang;
  Json::Value content;
};

std::vector<Document> AllDocuments() {
  velkor::appindex::StringPool pool;
  std::vector<Document> documents;
  for (const std::string& conf_path : velkor::appindex::FindIndexConf()) {
    const Json::Value records = velkor::appindex::FindIndexables(conf_path);
    for (const std::string& lang : GetSupportedLangs()) {
      for (const Json::Value& record : records) {
        documents.push_back({lang, MakeDocument(pool, lang, record)});
      }
    }
  }
  return documents;
}

// What an exchange takes when a pause comes before it: the processor has gone to sleep meanwhile,
// and nothing of what is needed is at hand any more.
double SecondsOfExchange(const std::vector<Document>& documents) {
  double seconds = 0;
  for (int i = 0; i < kExchanges; ++i) {
    const Document& document = documents[static_cast<std::size_t>(i) % documents.size()];
    const std::string frame =
        bench::Frame(velkor::appindex::elastic::UpsertRequest(document.lang, document.content));
    Sleep(kPauseMicroseconds);
    seconds += bench::SecondsOf([&] { bench::BareExchange(frame); });
  }
  return seconds / kExchanges;
}

// The limit is a pause for each document and nothing else. What comes on top of it, for each
// document, stands beside what its exchange takes alone.
void MeasureWithPauses(const std::string& name) {
  const double rebuild = bench::SecondsOf([] { velkor::appindex::Reindex(); });
  double total = 0;
  for (const double seconds : pauses) total += seconds;
  const double pause = total / static_cast<double>(pauses.size());
  const std::vector<Document> documents = AllDocuments();
  const auto count = static_cast<double>(documents.size());
  bench::PrintSample(name, 0, bench::kSubject, rebuild, "s");
  bench::PrintSample(name, 0, bench::kLimit, count * pause, "s");
  bench::PrintSample(name + "-beyond", 0, bench::kSubject, rebuild / count - pause, "s");
  bench::PrintSample(name + "-beyond", 0, bench::kLimit, SecondsOfExchange(documents), "s");
}

// The limit is making the text of each document and sending it. All in the first time, as on a
// device where a process rebuilds once.
void MeasureProcessor(const std::string& name, long applications) {
  const double rebuild = bench::ProcessorSecondsOf([] { velkor::appindex::Reindex(); });
  const std::vector<Document> documents = AllDocuments();
  const double sending = bench::ProcessorSecondsOf([&] {
    for (const Document& document : documents) {
      bench::BareExchange(
          bench::Frame(velkor::appindex::elastic::UpsertRequest(document.lang, document.content)));
    }
  });
  const auto count = static_cast<double>(documents.size());
  bench::PrintSample(name, applications, bench::kSubject, rebuild / count, "s");
  bench::PrintSample(name, applications, bench::kLimit, sending / count, "s");
}

}  // namespace

int main(int argc, char** argv) {
  CLI::App app("Cost of a full rebuild");
  std::string root;
  std::string name;
  bool instant = false;
  long applications = 0;
  app.add_option("root", root, "A device root; its search daemon runs unless --instant is given")
      ->required();
  app.add_option("name", name, "The name of what is printed")->required();
  app.add_flag("--instant", instant, "With a daemon that answers at once");
  app.add_option("--applications", applications,
                 "Replace the device's packages by so many, and measure without pauses");
  CLI11_PARSE(app, argc, argv);
  try {
    host::EnterDeviceRoot(root);
    const auto daemon = instant ? std::make_unique<bench::InstantDaemon>() : nullptr;
    if (applications == 0) {
      MeasureWithPauses(name);
      return 0;
    }
    std::filesystem::remove_all("/usr/tovo/tovoman/webman/modules");
    std::filesystem::create_directories("/usr/tovo/tovoman/webman/modules");
    std::filesystem::remove_all("/var/packages");
    bench::WritePackages(applications);
    std::filesystem::create_directories("/var/packages/Velkor/etc");
    pausing = false;
    MeasureProcessor(name, applications);
    return 0;
  } catch (const std::exception& e) {
    std::fprintf(stderr, "reindex_cost: %s\n", e.what());
    return 2;
  }
}
