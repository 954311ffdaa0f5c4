// The way of an application into the index and out of it: its descriptor gives records, each record
// gives a document per language, each document is upserted, each language committed.
#include "appindex/index_mgr.h"

#include <sys/stat.h>
#include <unistd.h>

#include "appindex/config.h"
#include "appindex/device_identity.h"
#include "appindex/elastic_control.h"
#include "appindex/elastic_control_internal.h"
#include "appindex/error.h"
#include "appindex/index_mgr_internal.h"
#include "appindex/observer_internal.h"
#include "appindex/utilities/file_utils.h"
#include "common/check.h"

namespace velkor::appindex {
namespace {

constexpr mode_t kIndexDbMode = 0700;

// Leaves the daemon time for searches between two writes, also between a last and a next first one.
constexpr useconds_t kUpsertPauseMicroseconds = 10000;

// A rebuild creates every index before it fills them, so a missing index inside one is rare and one
// inside that rarer. A daemon that never keeps an index must not lead to a rebuild without end.
constexpr int kMaxNestedRebuilds = 8;
int nested_rebuilds = 0;

StringPool string_pool;

// Counts ahead for an observer. What is wrong with a descriptor is logged and thrown when its turn
// comes.
std::size_t CountDocuments(const std::set<std::string>& conf_paths) {
  const MutedLog muted;
  std::size_t items = 0;
  for (const std::string& conf_path : conf_paths) {
    try {
      items += FindIndexables(conf_path).size();
    } catch (const Error&) {
    }
  }
  return items * GetSupportedLangs().size();
}

void TellWork(const std::set<std::string>& conf_paths) {
  if (current_observer != nullptr) Tell(&Observer::OnWork, CountDocuments(conf_paths));
}

void TellWork(const std::string& conf_path) {
  if (current_observer != nullptr) TellWork(std::set<std::string>{conf_path});
}

void RecoverByRebuild() {
  struct Nesting {
    Nesting() { ++nested_rebuilds; }
    ~Nesting() { --nested_rebuilds; }
  };
  const Nesting nesting;
  Reindex();
}

void AddInEveryLanguage(const std::string& conf_path, bool commit) {
  Descriptor descriptor(conf_path);
  for (const std::string& lang : GetSupportedLangs()) {
    for (const Json::Value& record : descriptor.FindIndexables()) {
      const Json::Value doc = MakeDocument(string_pool, lang, record);
      usleep(kUpsertPauseMicroseconds);
      elastic::IndexUpsert(lang, doc);
      Tell(&Observer::OnDocument, conf_path, lang);
    }
    if (commit) elastic::IndexCommit(lang);
  }
}

void RecreateIndex(const std::string& lang) {
  try {
    elastic::AppIndexDelete(lang);
  } catch (const Error& error) {
    if (error.code != Error::kDaemonIndexMissing) throw;
  }
  elastic::AppIndexCreate(lang);
}

void AddOrRebuild(const std::string& conf_path, bool commit) {
  LogNotice(kIndexMgr, 190, "Add: " + conf_path);
  try {
    AddInEveryLanguage(conf_path, commit);
    return;
  } catch (const Error& error) {
    if (error.code != Error::kDaemonIndexMissing || nested_rebuilds >= kMaxNestedRebuilds) throw;
  }
  LogFailureText({kIndexMgr, 245, "Add"}, "Do reindex to recover missing indices");
  RecoverByRebuild();
}

}  // namespace

void Add(const std::string& conf_path, bool commit) {
  if (Basename(conf_path) != kIndexConf) return;
  TellWork(conf_path);
  AddOrRebuild(conf_path, commit);
}

void Del(const std::string& conf_path, bool commit) {
  if (Basename(conf_path) != kIndexConf) return;
  TellWork(conf_path);
  LogNotice(kIndexMgr, 255, "Del: " + conf_path);
  Descriptor descriptor(conf_path);
  for (const std::string& lang : GetSupportedLangs()) {
    for (const Json::Value& record : descriptor.FindIndexables()) {
      elastic::IndexDelete(lang, record["id"].asString());
      Tell(&Observer::OnDocument, conf_path, lang);
    }
    if (commit) elastic::IndexCommit(lang);
  }
}

void Reindex() {
  // Before anything is deleted: a directory that cannot be read leaves the index as it is.
  const std::set<std::string> conf_paths = FindIndexConf();
  Config config;
  TellWork(conf_paths);
  LogNotice(kIndexMgr, 290, "Reindex app");

  mkdir(elastic::kIndexDbDir, kIndexDbMode);  // there already, as a rule
  for (const std::string& lang : GetSupportedLangs()) RecreateIndex(lang);
  for (const std::string& conf_path : conf_paths) AddOrRebuild(conf_path, false);
  for (const std::string& lang : GetSupportedLangs()) elastic::IndexCommit(lang);

  config.indexed_version = config.GetCurrentVersion();
  config.Save();
}

}  // namespace velkor::appindex
