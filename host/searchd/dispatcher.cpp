#include "host/searchd/dispatcher.h"

#include <syslog.h>

#include <map>
#include <utility>

#include "host/framing.h"
#include "host/searchd/index_directory.h"
#include "host/searchd/json_text.h"
#include "host/searchd/permission.h"
#include "host/searchd/request_error.h"
#include "host/searchd/system_log.h"

namespace searchd {
namespace {

constexpr std::size_t kMaxQuickBytes = std::size_t{16} * 1024;
constexpr std::size_t kCommandNameWithin = 64;

constexpr unsigned kDefaultLimit = 20;
constexpr unsigned kMaxLimit = 1000;
constexpr unsigned kMaxOffset = 1000000;

std::string FailureText(Code code, const std::string& message) {
  Json::Value reply(Json::objectValue);
  reply["success"] = false;
  reply["error"]["code"] = static_cast<int>(code);
  reply["error"]["msg"] = message;
  return JsonText(reply);
}

// `members` is the text of what the reply says beside its success.
std::string SuccessText(const std::string& members) {
  return R"({"success":true)" + (members.empty() ? "" : "," + members) + "}";
}

std::string RequiredString(const Json::Value& data, const char* member) {
  if (!data[member].isString()) {
    throw RequestError(Code::kRejected, std::string("\"") + member + "\" must be a string");
  }
  return data[member].asString();
}

unsigned OptionalNumber(const Json::Value& data, const char* member, unsigned absent,
                        unsigned most) {
  if (!data.isMember(member)) return absent;
  const Json::Value& value = data[member];
  if (!value.isUInt() || value.asUInt() > most) {
    throw RequestError(Code::kRejected,
                       std::string("\"") + member + "\" must be 0 to " + std::to_string(most));
  }
  return value.asUInt();
}

bool OptionalFlag(const Json::Value& data, const char* member) {
  if (!data.isMember(member)) return false;
  if (!data[member].isBool()) {
    throw RequestError(Code::kRejected, std::string("\"") + member + "\" must be true or false");
  }
  return data[member].asBool();
}

void CheckSettings(const Json::Value& settings) {
  if (settings.isNull() || (settings.isObject() && settings.empty())) return;
  throw RequestError(Code::kRejected, "\"settings\" must be an empty object");
}

Json::Value EmptyObject() { return Json::Value(Json::objectValue); }

}  // namespace

// Changes of a document are queued, not carried out, unless too many wait.
bool Dispatcher::IsQuick(const std::string& request) {
  return request.size() <= kMaxQuickBytes && request.find("\"document_") < kCommandNameWithin &&
         !catalog_.IsCrowded();
}

Answer Dispatcher::Handle(const std::string& request, uid_t client) {
  Answer answer;
  try {
    answer.text = SuccessText(Run(request, client, answer.after));
    if (answer.text.size() > host::kMaxFrameBytes) {
      throw RequestError(Code::kRejected, "the reply would be too long: ask for fewer hits");
    }
  } catch (const KnownDamage& e) {
    answer.text = FailureText(e.GetCode(), e.what());
  } catch (const RequestError& e) {
    if (e.GetCode() == Code::kStorage) syslog(LOG_ERR, "storage failure: %s", e.what());
    answer.text = FailureText(e.GetCode(), e.what());
  } catch (const std::exception& e) {
    syslog(LOG_ERR, "request failed: %s", e.what());
    answer.text = FailureText(Code::kStorage, e.what());
  }
  return answer;
}

std::string Dispatcher::TooLong() {
  return FailureText(Code::kRejected, "the request is longer than " +
                                          std::to_string(host::kMaxFrameBytes) + " bytes");
}

void Dispatcher::Reopen() {
  ReopenSystemLog();
  catalog_.Reopen();
  syslog(LOG_NOTICE, "reopened, %zu indexes", catalog_.All().size());
}

bool Dispatcher::HasIdleWork() {
  return catalog_.NeedsSave() || catalog_.FindWithWork() != nullptr;
}

void Dispatcher::DoIdleWork() {
  catalog_.SaveIfNeeded();
  if (const auto index = catalog_.FindWithWork()) index->DoWork();
}

const Dispatcher::Command& Dispatcher::FindCommand(const std::string& name) {
  static const std::map<std::string, Command> commands = {
      {"index_create", {true, &Dispatcher::Create}},
      {"index_delete", {true, &Dispatcher::Delete}},
      {"document_upsert_by_id", {true, &Dispatcher::Upsert}},
      {"document_del_by_id", {true, &Dispatcher::DeleteDocument}},
      {"commit", {true, &Dispatcher::Commit}},
      {"search", {false, &Dispatcher::Search}},
      {"index_list", {false, &Dispatcher::List}},
  };
  const auto found = commands.find(name);
  if (found == commands.end()) {
    throw RequestError(Code::kUnknownCommand,
                       "unknown command: " + (name.size() <= 100 ? name : "a very long one"));
  }
  return found->second;
}

std::string Dispatcher::Run(const std::string& text, uid_t client, std::function<void()>& after) {
  Json::Value request = ParseJson(text);
  if (!request.isObject()) throw RequestError(Code::kRejected, "the request must be an object");
  const std::string name = RequiredString(request, "command");
  const Command& command = FindCommand(name);
  if (command.changes && !MayChangeIndexes(client)) {
    throw RequestError(Code::kNotPermitted,
                       "user " + std::to_string(client) + " may not use " + name);
  }
  Json::Value& data = request["data"];
  if (data.isNull()) data = EmptyObject();
  if (!data.isObject()) throw RequestError(Code::kRejected, "\"data\" must be an object");

  Request arguments{std::move(data), text.size(), nullptr};
  std::string reply = (this->*command.run)(arguments);
  after = std::move(arguments.after);
  return reply;
}

void Dispatcher::ApplyAfterReply(Request& request, const std::shared_ptr<Index>& index) {
  request.after = [index] { index->ApplyChanges(); };
}

std::string Dispatcher::Create(Request& request) {
  const Json::Value& data = request.data;
  const std::string id = RequiredString(data, "id");
  const std::string path = CheckedIndexPath(RequiredString(data, "path"));
  CheckSettings(data["settings"]);
  catalog_.Create({id, path, data["mappings"]});
  syslog(LOG_NOTICE, "index created: %s in %s", id.c_str(), path.c_str());
  return {};
}

std::string Dispatcher::Delete(Request& request) {
  const std::string id = RequiredString(request.data, "id");
  catalog_.Delete(id);
  syslog(LOG_NOTICE, "index deleted: %s", id.c_str());
  return {};
}

std::string Dispatcher::Upsert(Request& request) {
  const auto index = catalog_.Find(RequiredString(request.data, "id"));
  const std::string document_id = RequiredString(request.data, "doc_id");
  if (index->Upsert(document_id, std::move(request.data["data"]), request.bytes)) {
    ApplyAfterReply(request, index);
  }
  return {};
}

std::string Dispatcher::DeleteDocument(Request& request) {
  const auto index = catalog_.Find(RequiredString(request.data, "id"));
  if (index->Delete(RequiredString(request.data, "doc_id"))) ApplyAfterReply(request, index);
  return {};
}

std::string Dispatcher::Commit(Request& request) {
  const auto index = catalog_.Find(RequiredString(request.data, "id"));
  catalog_.Save();
  index->Commit();
  return {};
}

std::string Dispatcher::Search(Request& request) {
  const Json::Value& data = request.data;
  const auto index = catalog_.Find(RequiredString(data, "id"));
  SearchRequest search;
  search.query = RequiredString(data, "query");
  search.offset = OptionalNumber(data, "offset", 0, kMaxOffset);
  search.limit = OptionalNumber(data, "limit", kDefaultLimit, kMaxLimit);
  search.explain = OptionalFlag(data, "explain");
  const SearchResult result = index->Search(search);
  std::string reply = "\"total\":" + std::to_string(result.total);
  if (!result.matched.empty()) reply += ",\"matched\":\"" + result.matched + '"';
  if (result.cut) reply += ",\"cut\":true";
  return reply + ",\"hits\":" + result.hits;
}

std::string Dispatcher::List(Request&) {
  Json::Value indexes(Json::arrayValue);
  for (const auto& index : catalog_.All()) {
    Json::Value entry = EmptyObject();
    entry["id"] = index->Definition().id;
    entry["path"] = index->Definition().path;
    try {
      entry["documents"] = index->DocumentCount();
    } catch (const RequestError& e) {
      entry["error"] = e.what();
    }
    indexes.append(std::move(entry));
  }
  return "\"indexes\":" + JsonText(indexes);
}

}  // namespace searchd
