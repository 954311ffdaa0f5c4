#include "tool/status.h"

#include <algorithm>
#include <ctime>
#include <exception>

#include "appindex/config.h"
#include "appindex/device_identity.h"
#include "appindex/elastic_control.h"
#include "appindex/error.h"
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

// As RFC 3339 writes it, in universal time.
std::string TimeText(std::time_t time) {
  std::tm parts{};
  char text[32];
  gmtime_r(&time, &parts);
  std::strftime(text, sizeof(text), "%Y-%m-%dT%H:%M:%SZ", &parts);
  return text;
}

void AddProblem(Json::Value& value, const Problem& problem) {
  if (problem.line.empty()) return;
  value["problem"] = problem.line;
  value["fails"] = problem.fails;
  if (problem.code != 0) value["code"] = problem.code;
}

Json::Value ToJson(const RequestFile& file) {
  Json::Value value;
  value["path"] = file.path;
  value["exists"] = file.state != RequestFile::kMissing;
  if (file.state == RequestFile::kUnreadable) value["problem"] = file.cause;
  if (file.state != RequestFile::kReadable) return value;
  value["lines"] = Json::UInt64(file.lines);
  value["requests"] = Json::UInt64(file.requests.size());
  value["written"] = TimeText(file.written);
  value["age_seconds"] = Json::Int64(file.age);
  return value;
}

Json::Value ToJson(const Step& step, const Status& status) {
  Json::Value value;
  value["from"] = step.from == &status.batch ? "batch" : "queue";
  value["op"] = NameOfOperation(step.op);
  value["path"] = step.path;
  AddProblem(value, step.problem);
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
    if (holder.has_ended) one["ended"] = true;
    value["holders"].append(one);
  }
  AddProblem(value, lock.problem);
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

const Step* Status::FirstFailing(const RequestFile& file) const {
  const auto found = std::find_if(order.begin(), order.end(), [&](const Step& step) {
    return step.from == &file && step.problem.fails;
  });
  return found == order.end() ? nullptr : &*found;
}

bool Status::IsWorked() const {
  return std::any_of(locks.begin(), locks.end(), [](const Lock& lock) {
    return lock.path == index::kProcessLockPath && !lock.holders.empty();
  });
}

bool Status::IsLockedOut() const {
  return std::any_of(locks.begin(), locks.end(),
                     [](const Lock& lock) { return !lock.problem.line.empty(); });
}

std::string Status::Waiting() const {
  if (IsNotReady(daemon_code)) {
    return "whoever works the queue waits 30 s and asks again, without limit";
  }
  if (daemon_code == velkor::Error::kDaemonBusy) {
    return "whoever works the queue waits 15 to 19 min and asks again, without limit";
  }
  if (batch.state == RequestFile::kMissing || !IsWorked()) return "";
  return "while the search daemon says nothing, is not ready (asked again after 30 s) or is busy "
         "(asked again after 15 to 19 min), whoever works the batch waits, without limit";
}

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
  status.locks = ReadLocks(proc);
  status.version = ReadVersion();
  try {
    status.indexes = ReadIndexes();
  } catch (const Json::Exception& exception) {
    status.daemon_problem =
        std::string("the search daemon's answer is not as it must be: ") + exception.what();
  } catch (const velkor::Error& error) {
    status.daemon_problem = Explain(error).line;
    status.daemon_refuses = true;
    status.daemon_code = error.code;
  } catch (const std::exception& exception) {
    status.daemon_problem = Explain(exception).line;
  }
}

Json::Value ToJson(const Status& status) {
  Json::Value value;
  value["daemon"]["reachable"] = status.daemon_problem.empty() || status.daemon_refuses;
  if (!status.daemon_problem.empty()) value["daemon"]["problem"] = status.daemon_problem;
  if (status.daemon_refuses) value["daemon"]["code"] = status.daemon_code;
  value["batch"] = ToJson(status.batch);
  value["queue"] = ToJson(status.queue);
  for (const RequestFile* file : {&status.batch, &status.queue}) {
    const Step* failing = status.FirstFailing(*file);
    if (failing == nullptr) continue;
    value["held_up_by"] = ToJson(*failing, status);
    value["held_up_by"]["since"] = TimeText(file->written);
    value["held_up_by"]["waiting_seconds"] = Json::Int64(file->age);
    break;
  }
  for (const char* list : {"order", "locks", "indexes"})
    value[list] = Json::Value(Json::arrayValue);
  for (const Step& step : status.order) value["order"].append(ToJson(step, status));
  for (const Lock& lock : status.locks) value["locks"].append(ToJson(lock));
  value["version"] = ToJson(status.version);
  for (const auto& [lang, found] : status.indexes) value["indexes"].append(ToJson(lang, found));
  if (!status.indexes.empty()) value["even"] = status.IsEven();
  const std::string waiting = status.Waiting();
  if (!waiting.empty()) value["waiting"] = waiting;
  return value;
}

}  // namespace tool
