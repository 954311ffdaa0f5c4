// How much memory the library takes. What it holds is counted block by block, so that each number
// is the same in every run.
#include <appindex/device_identity.h>
#include <appindex/index_mgr.h>
#include <appindex/string_pool.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <cstdio>
#include <exception>
#include <filesystem>
#include <string>
#include <vector>

#include "appindex/index_mgr_internal.h"
#include "appindex/index_queue_internal.h"
#include "bench/costs/content.h"
#include "bench/costs/heap.h"
#include "bench/costs/instant_daemon.h"
#include "bench/costs/queue_content.h"
#include "bench/costs/samples.h"
#include "device/tovo_webui.h"
#include "host/device_root.h"

// In place of the C library's: the pause takes no memory.
extern "C" __attribute__((visibility("default"))) int usleep(useconds_t /*microseconds*/) {
  return 0;
}

namespace {

using velkor::appindex::GetSupportedLangs;

constexpr int kRepeatedAdds = 100;

std::size_t BytesOfTexts(const std::string& texts_root) {
  std::size_t bytes = 0;
  for (const std::string& lang : GetSupportedLangs()) {
    const Json::Value sections = TOVO::PMX::LocalizedStringParser::ParseTexts(texts_root + lang);
    for (const Json::Value& section : sections) {
      for (const Json::Value& text : section) bytes += text.asString().size();
    }
  }
  return bytes;
}

void Print(const std::string& name, long size, const char* side, std::size_t bytes) {
  bench::PrintSample(name, size, side, static_cast<double>(bytes), "B");
}

void MeasurePool(const std::string& name, long size, const std::string& texts_root) {
  Print(name, size, bench::kLimit, BytesOfTexts(texts_root));
  const std::size_t before = bench::HeapNow();
  velkor::appindex::StringPool pool;
  pool.GetLangPack(texts_root);
  Print(name, size, bench::kSubject, bench::HeapNow() - before);
}

// The texts of the example device's own modules, and made ones, which are short.
void MeasurePools() {
  MeasurePool("pool-memory", 0, "/usr/tovo/tovoman/webman/texts/");
  for (const long texts : {10, 100, 1000, 10000}) {
    const std::string root = "/var/packages/Texts/texts" + std::to_string(texts) + "/";
    bench::WriteTexts(root, texts);
    MeasurePool("made-pool-memory", texts, root);
  }
}

void AddAll() {
  for (const std::string& conf_path : velkor::appindex::FindIndexConf()) {
    velkor::appindex::Add(conf_path, true);
  }
}

// The device's applications are added once, which fills the pool, and then over and over.
void MeasureRepeatedAdds() {
  const bench::InstantDaemon daemon;
  const std::size_t before = bench::HeapNow();
  AddAll();
  Print("repeated-adds", kRepeatedAdds, bench::kLimit, bench::HeapNow() - before);
  for (int i = 0; i < kRepeatedAdds; ++i) AddAll();
  Print("repeated-adds", kRepeatedAdds, bench::kSubject, bench::HeapNow() - before);
}

// Beside each queue one of as many lines as it has paths.
void MeasureQueues() {
  const auto peak_of = [](long lines) {
    const std::string path = "/tmp/queue";
    bench::WriteContent(path, bench::Joined(bench::QueueLines(lines)));
    const std::size_t before = bench::HeapNow();
    bench::BeginPeak();
    velkor::appindex::ReadBatch(path);
    return bench::HeapPeak() - before;
  };
  peak_of(1);  // makes what is kept from one reading to the next
  for (const long lines : {100, 1000, 10000, 100000}) {
    Print("queue-memory", lines, bench::kLimit, peak_of(bench::kQueuedPaths));
    Print("queue-memory", lines, bench::kSubject, peak_of(lines));
  }
}

}  // namespace

int main(int argc, char** argv) {
  CLI::App app("Memory that the library takes");
  std::string root;
  app.add_option("root", root, "A device root for this program alone")->required();
  CLI11_PARSE(app, argc, argv);
  try {
    host::EnterDeviceRoot(root);
    MeasurePools();
    MeasureQueues();
    MeasureRepeatedAdds();
    return 0;
  } catch (const std::exception& e) {
    std::fprintf(stderr, "memory_cost: %s\n", e.what());
    return 2;
  }
}
