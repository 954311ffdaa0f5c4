#include <appindex/device_identity.h>
#include <appindex/elastic_control.h>
#include <appindex/index_mgr.h>
#include <unistd.h>

#include "appindex/elastic_control_internal.h"
#include "appindex/index_mgr_internal.h"
#include "bench/costs/cases.h"
#include "bench/costs/instant_daemon.h"

// In place of the C library's: the pause is no part of these costs.
extern "C" __attribute__((visibility("default"))) int usleep(useconds_t /*microseconds*/) {
  return 0;
}

namespace bench {
namespace {

constexpr char kDescriptor[] = "/usr/tovo/tovoman/webman/modules/ControlPanel/index.conf";

struct Document {
  std::string lang;
  Json::Value content;
  std::string frame;  // its request as it is sent
};

struct Documents {
  InstantDaemon daemon;
  std::vector<Document> all;
};

std::shared_ptr<Documents> DocumentsOf(const std::string& conf_path) {
  auto documents = std::make_shared<Documents>();
  velkor::appindex::StringPool pool;
  const Json::Value records = velkor::appindex::FindIndexables(conf_path);
  for (const std::string& lang : velkor::appindex::GetSupportedLangs()) {
    for (const Json::Value& record : records) {
      Json::Value content = MakeDocument(pool, lang, record);
      std::string frame = Frame(velkor::appindex::elastic::UpsertRequest(lang, content));
      documents->all.push_back({lang, std::move(content), std::move(frame)});
    }
  }
  return documents;
}

}  // namespace

Cases ExchangeCases() {
  const auto documents = DocumentsOf(kDescriptor);
  const auto count = static_cast<double>(documents->all.size());
  Case upsert{"upsert", 0, count, nullptr, nullptr};
  upsert.clock = Case::kElapsed;
  upsert.subject = [documents] {
    for (const Document& document : documents->all) {
      velkor::appindex::elastic::IndexUpsert(document.lang, document.content);
    }
  };
  upsert.limit = [documents] {
    for (const Document& document : documents->all) BareExchange(document.frame);
  };

  Case add{"add", 0, count, nullptr, nullptr};
  add.subject = [documents] { velkor::appindex::Add(kDescriptor, false); };
  add.limit = [documents] {
    for (const Document& document : documents->all) {
      BareExchange(
          Frame(velkor::appindex::elastic::UpsertRequest(document.lang, document.content)));
    }
  };
  return {upsert, add};
}

}  // namespace bench
