#include "tests/crash/daemon_model.h"

#include <tuple>
#include <utility>

namespace test {
namespace {

constexpr int kDone = 0;
constexpr int kNoSuchIndex = 601;

bool MayBeDone(int code) { return code == kDone || code == DaemonModel::kNoReply; }

}  // namespace

bool DaemonModel::Case::operator<(const Case& other) const {
  return std::tie(on_disk, committed, current) <
         std::tie(other.on_disk, other.committed, other.current);
}

DaemonModel::DaemonModel(const std::map<std::string, std::optional<Documents>>& indexes) {
  for (const auto& [id, documents] : indexes) indexes_[id] = {{documents, documents, documents}};
}

void DaemonModel::Answered(const Json::Value& request, int code) {
  const std::string id = request["data"]["id"].asString();
  Cases outcomes;
  for (const Case& before : indexes_.at(id)) {
    if (code == kNoSuchIndex && before.current) continue;  // it would not be answered so
    outcomes.merge(Outcomes(request, before, code));
  }
  indexes_[id] = outcomes;
  if (request["command"] != "commit" || code == kNoSuchIndex) return;
  // It saves first which indexes there are.
  WasIdle(code == kDone);
}

void DaemonModel::WasIdle(bool to_the_end) {
  for (auto& [id, cases] : indexes_) {
    Cases after = to_the_end ? Cases() : cases;
    for (const Case& before : cases) after.insert(Saved(before));
    cases = after;
  }
}

// The files of an index hold what is committed to it, whether or not it is known yet that it is
// there.
DaemonModel::Case DaemonModel::Saved(Case before) {
  before.on_disk = before.committed;
  return before;
}

// What may be true of the index that the request concerns after it was answered with `code`.
DaemonModel::Cases DaemonModel::Outcomes(const Json::Value& request, const Case& before, int code) {
  const std::string command = request["command"].asString();
  if (command == "commit") return OutcomesOfCommit(before, code);
  if (command == "index_create") return OutcomesOfCreation(before, code);
  Cases outcomes;
  if (code != kDone) outcomes.insert(before);
  if (!before.current) return outcomes;
  Case done = before;
  if (command == "index_delete") {
    done.committed = done.current = std::nullopt;
  } else {
    const std::string document = request["data"]["doc_id"].asString();
    if (command == "document_upsert_by_id") {
      done.current->insert(document);
    } else {
      done.current->erase(document);
    }
    // A failure may be that of changes before it, which are lost then.
    if (code != kDone) outcomes.insert({before.on_disk, before.committed, before.committed});
  }
  if (MayBeDone(code)) outcomes.insert(done);
  return outcomes;
}

DaemonModel::Cases DaemonModel::OutcomesOfCreation(const Case& before, int code) {
  // If the index was deleted, but not for good, its files are cleared away for the new one. That
  // may be as far as a failure has come.
  Case cleared = before;
  if (before.on_disk && !before.current) cleared.on_disk = Documents();
  Cases outcomes;
  if (code != kDone) outcomes = {before, cleared};
  if (MayBeDone(code) && !before.current) {
    outcomes.insert({cleared.on_disk, Documents(), Documents()});
  }
  return outcomes;
}

DaemonModel::Cases DaemonModel::OutcomesOfCommit(const Case& before, int code) {
  Cases outcomes;
  if (before.current) outcomes.insert({before.current, before.current, before.current});
  // One that fails has done all of it, or nothing and the changes wait or are lost.
  if (code != kDone) {
    outcomes.insert(before);
    outcomes.insert({before.on_disk, before.committed, before.committed});
  }
  return outcomes;
}

bool DaemonModel::Allows(const std::string& index, const std::string& found) const {
  for (const Case& one : indexes_.at(index)) {
    if (Text(one.on_disk) == found) return true;
  }
  return false;
}

std::string DaemonModel::Text(const std::string& index) const {
  std::string text;
  for (const Case& one : indexes_.at(index)) text += "\"" + Text(one.on_disk) + "\" ";
  return text;
}

std::string DaemonModel::Text(const Content& content) {
  if (!content) return kMissing;
  std::string text;
  for (const std::string& id : *content) text += (text.empty() ? "" : " ") + id;
  return text;
}

}  // namespace test
