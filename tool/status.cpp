#include "tool/status.h"

#include <exception>

#include "appindex/config.h"
#include "appindex/device_identity.h"
#include "appindex/elastic_control.h"
#include "common/check.h"
#include "tool/daemon.h"
#include "tool/failure.h"

namespace tool {
namespace {

namespace index = velkor::appindex;

Version ReadVersion() {
  const velkor::MutedLog muted;
  Version version;
  try {
    index::Config config;
    version.recorded = config.indexed_version;
    version.current = config.GetCurrentVersion();
  } catch (const std::exception& exception) {
    version.problem = Explain(exception).line;
  }
  return version;
}

std::map<std::string, Index> ReadIndexes() {
  std::map<std::string, Index> indexes;
  const Json::Value reply = AskDaemon("index_list");
  for (const std::string& lang : index::GetSupportedLangs()) {
    Index& found = indexes[lang];
    for (const Json::Value& listed : reply["indexes"]) {
      if (listed["id"].asString() != index::elastic::GetAppIndexID(lang)) continue;
      const bool damaged = listed.isMember("error");
      found.state = damaged ? Index::kDamaged : Index::kWhole;
      if (damaged) found.damage = listed["error"].asString();
      if (!damaged) found.documents = listed["documents"].asUInt64();
    }
  }
  return indexes;
}

Json::Value ToJson(const RequestFile& file) {
  Json::Value value;
  value["path"] = file.path;
  value["exists"] = file.state != RequestFile::kMissing;
  if (file.state == RequestFile::kUnreadable) value["problem"] = file.cause;
  if (file.state != RequestFile::kReadable) return value;
  value["lines"] = Json::UInt64(file.lines);
  value["requests"] = Json::UInt64(file.requests.size());
  value["age_seconds"] = Json::Int64(file.age);
  return value;
}

Json::Value ToJson(const Step& step, const Status& status) {
  Json::Value value;
  value["from"] = step.from == &status.batch ? "batch" : "queue";
  value["op"] = NameOfOperation(step.op);
  value["path"] = step.path;
  if (!step.problem.empty()) value["problem"] = step.problem;
  return value;
}

Json::Value ToJson(const Lock& lock) {
  Json::Value value;
  value["path"] = lock.path;
  value["holders"] = Json::Value(Json::arrayValue);
  for (const LockHolder& holder : lock.holders) {
    Json::Value one;
    one["pid"] = holder.pid;
    one["program"] = holder.program;
    value["holders"].append(one);
  }
  return value;
}

Json::Value ToJson(const Version& version) {
  Json::Value value;
  value["recorded"] = version.recorded;
  value["current"] = version.current;
  value["differs"] = version.Differs();
  if (!version.problem.empty()) value["problem"] = version.problem;
  return value;
}

Json::Value ToJson(const std::string& lang, const Index& found) {
  Json::Value value;
  value["lang"] = lang;
  value["state"] = found.state == Index::kWhole     ? "whole"
                   : found.state == Index::kDamaged ? "damaged"
                                                    : "missing";
  if (found.state == Index::kWhole) value["documents"] = Json::UInt64(found.documents);
  if (found.state == Index::kDamaged) value["problem"] = found.damage;
  return value;
}

}  // namespace

bool Status::IsEven() const {
  for (const auto& [lang, found] : indexes) {
    const Index& first = indexes.begin()->second;
    if (found.state != first.state || found.documents != first.documents) return false;
  }
  return true;
}

void Gather(Status& status, int proc) {
  status.batch = ReadRequestFile(index::kBatchPath);
  status.queue = ReadRequestFile(index::kQueuePath);
  status.order = Order(status.batch, status.queue);
  for (const char* path : {index::kProcessLockPath, index::kQueuePath}) {
    status.locks.push_back({path, LockHolders(proc, path)});
  }
  status.version = ReadVersion();
  try {
    status.indexes = ReadIndexes();
  } catch (const std::exception& exception) {
    status.daemon_problem = Explain(exception).line;
  }
}

Json::Value ToJson(const Status& status) {
  Json::Value value;
  value["daemon"]["reachable"] = status.daemon_problem.empty();
  if (!status.daemon_problem.empty()) value["daemon"]["problem"] = status.daemon_problem;
  value["batch"] = ToJson(status.batch);
  value["queue"] = ToJson(status.queue);
  for (const char* list : {"order", "locks", "indexes"})
    value[list] = Json::Value(Json::arrayValue);
  for (const Step& step : status.order) value["order"].append(ToJson(step, status));
  for (const Lock& lock : status.locks) value["locks"].append(ToJson(lock));
  value["version"] = ToJson(status.version);
  for (const auto& [lang, found] : status.indexes) value["indexes"].append(ToJson(lang, found));
  value["even"] = status.IsEven();
  return value;
}

}  // namespace tool
