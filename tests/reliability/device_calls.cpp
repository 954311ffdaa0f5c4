#include <sys/stat.h>

#include "appindex/config.h"
#include "appindex/device_identity.h"
#include "appindex/elastic_control.h"
#include "appindex/index_mgr.h"
#include "appindex/observer.h"
#include "appindex/string_pool.h"
#include "tests/reliability/exported_calls.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"

namespace test {
namespace {

using namespace velkor::appindex;

constexpr char kTextsRoot[] = "/var/packages/App/target/ui/texts/";

void CallIdentity() {
  Expect(GetSupportedLangs().size() == 21, "languages");
  Expect(GetPlatform() == kPlatform && GetModel() == kModel, "identity");
  Json::Value filter;
  filter["platform"].append("another platform than this");
  filter["model"].append(kModel);
  Expect(IsPassFilter(filter, true) && !IsPassFilter(filter, false), "filter");
}

void CallConfig() {
  Config config;
  config.indexed_version = config.GetCurrentVersion();
  config.Save();
  Expect(Config().indexed_version == kVersion, "saved version");
  struct stat record {};
  Expect(stat(kRecord, &record) == 0 && (record.st_mode & 07777U) == 0600, "mode of the record");
}

void CallTexts() {
  const LanguagePack pack(kTextsRoot);
  Expect(pack.GetString("ger", "app", "title") == "Der Titel der Anwendung", "text of a pack");
  StringPool pool;
  // Where the search for the texts fails, whatever the reason, the built-in ones serve.
  pool.SetTextsRootByConfPath(ConfOf("App"));
  pool.GetString("enu", "app:title");
  pool.SetTextsRootByStringSet(ConfOf("App"), "texts");
  Expect(pool.GetString("fre", "app:title") == "The application's title", "English in its place");
  Expect(pool.GetString("ger", "app", "title") == "Der Titel der Anwendung", "text of a pool");
  Expect(pool.GetLangPack(kTextsRoot)->GetString("enu", "no", "key") == "no:key", "no text");
}

class Watcher : public Observer {
 public:
  void OnRequest(std::size_t, std::size_t) override {}
  void OnWork(std::size_t) override {}
  void OnDocument(const std::string&, const std::string&) override { ++documents_; }
  void OnWait(Wait, std::chrono::milliseconds) override {}
  int Documents() const { return documents_; }

 private:
  int documents_ = 0;
};

void CallObserved() {
  struct Watched {
    Watched() { SetObserver(&watcher); }
    ~Watched() { SetObserver(nullptr); }
    Watcher watcher;
  };
  const Watched watched;
  Del(ConfOf("App"), false);
  Expect(watched.watcher.Documents() == 2 * 21, "observed documents");
}

void CallIndexCommands() {
  const std::string lang = "enu";
  Expect(elastic::GetAppIndexID(lang) == "appindex_enu", "id");
  try {
    elastic::AppIndexDelete(lang);
  } catch (const velkor::Error& error) {
    if (error.code != velkor::Error::kDaemonIndexMissing) throw;
  }
  elastic::AppIndexCreate(lang);
  Json::Value document;
  document["id"] = "a document that is here for a moment";
  elastic::IndexUpsert(lang, document);
  elastic::IndexDelete(lang, "a document that is here for a moment");
  elastic::IndexCommit(lang);
}

}  // namespace

std::vector<ExportedCall> DeviceCalls() {
  return {
      {{"velkor::appindex::GetSupportedLangs", "velkor::appindex::GetPlatform",
        "velkor::appindex::GetModel", "velkor::appindex::IsPassFilter"},
       {},
       CallIdentity},
      {{"velkor::appindex::Config::Config", "velkor::appindex::Config::GetCurrentVersion",
        "velkor::appindex::Config::Save"},
       [] { WriteFile(kRecord, R"({"indexed_version":"the version before"})", 0600); },
       CallConfig},
      {{"velkor::appindex::LanguagePack::LanguagePack", "velkor::appindex::LanguagePack::GetString",
        "velkor::appindex::StringPool::StringPool", "velkor::appindex::StringPool::GetString",
        "velkor::appindex::StringPool::GetLangPack",
        "velkor::appindex::StringPool::SetTextsRootByConfPath",
        "velkor::appindex::StringPool::SetTextsRootByStringSet"},
       {},
       CallTexts},
  };
}

std::vector<ExportedCall> DaemonCalls() {
  const std::string conf = ConfOf("App");
  return {
      {{"velkor::appindex::elastic::GetAppIndexID", "velkor::appindex::elastic::AppIndexCreate",
        "velkor::appindex::elastic::AppIndexDelete", "velkor::appindex::elastic::IndexUpsert",
        "velkor::appindex::elastic::IndexDelete", "velkor::appindex::elastic::IndexCommit"},
       {},
       CallIndexCommands},
      {{"velkor::appindex::Reindex"}, {}, [] { Reindex(); }},
      {{"velkor::appindex::SetObserver", "velkor::appindex::Observer::~Observer"},
       {},
       CallObserved},
      {{"velkor::appindex::Del"}, {}, [conf] { Del(conf, true); }},
      {{"velkor::appindex::Add"}, {}, [conf] { Add(conf, true); }},
      {{"velkor::appindex::ProcessQueue"},
       [conf] {
         Enqueue(Request(2, "/var/packages/Gone from here/target/ui/index.conf"));
         Enqueue(Request(1, conf));
       },
       [] {
         ProcessQueue();
         Expect(!Exists(kQueue) && !Exists(kBatch), "nothing left of the queue");
       }},
  };
}

void PrepareDevice() {
  WriteFile(ConfOf("App"), R"({"app":"App","stringset":"texts","title":"app:title",
      "desc":"app:desc","keywords":["app:title",{"text":"Bilder","weight":2}],
      "enable":{"platform":["helios"]},
      "modules":[{"params":"view=shared","title":"A part of the application"}]})");
  WriteFile(kTextsRoot + std::string("enu/strings"),
            "[app]\ntitle=\"The application's title\"\ndesc=\"What it is for, in many words\"\n");
  WriteFile(kTextsRoot + std::string("ger/strings"),
            "[app]\ntitle=\"Der Titel der Anwendung\"\ndesc=\"Wozu sie gut ist, ausgefuehrt\"\n");
}

}  // namespace test
