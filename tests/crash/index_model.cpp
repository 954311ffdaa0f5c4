#include "tests/crash/index_model.h"

namespace test {

Reaction IndexModel::React(const Json::Value& request) {
  const std::lock_guard<std::mutex> lock(mutex_);
  const Json::Value& data = request["data"];
  const std::string id = data["id"].asString();
  const bool exists = current_.count(id) != 0;
  if (request["command"] == "index_create") {
    if (exists) return Failure(602, "index exists");
    committed_[id] = current_[id] = {};
    return Success();
  }
  if (!exists) return Failure(601, "no such index");
  return Change(request["command"].asString(), data);
}

Reaction IndexModel::Change(const std::string& command, const Json::Value& data) {
  const std::string id = data["id"].asString();
  if (command == "index_delete") {
    current_.erase(id);
    committed_.erase(id);
  } else if (command == "document_upsert_by_id") {
    current_[id][data["doc_id"].asString()] = data["data"];
  } else if (command == "document_del_by_id") {
    current_[id].erase(data["doc_id"].asString());
  } else if (command == "commit") {
    committed_[id] = current_[id];
  } else {
    return Failure(604, "unknown command");
  }
  return Success();
}

IndexModel::Indexes IndexModel::Committed() {
  const std::lock_guard<std::mutex> lock(mutex_);
  return committed_;
}

void IndexModel::Set(const Indexes& indexes) {
  const std::lock_guard<std::mutex> lock(mutex_);
  current_ = committed_ = indexes;
}

}  // namespace test
