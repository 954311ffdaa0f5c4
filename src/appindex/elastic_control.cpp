#include "appindex/elastic_control.h"

#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <iterator>
#include <utility>

#include "appindex/elastic_control_internal.h"
#include "appindex/observer_internal.h"
#include "appindex/utilities/json_helpers.h"
#include "common/check.h"
#include "common/json_strict.h"
#include "device/tovodaemon.h"

namespace velkor::appindex::elastic {
namespace {

constexpr char kModule[] = "elastic_control";
constexpr long kElasticdConnectTimeout = 864000;  // ten days, in seconds
constexpr int kMaxSocketChecks = 16;
constexpr std::chrono::seconds kSocketPause(1);

// 609 lies between them and is a real failure.
constexpr int kDaemonDbNotReady[] = {607, 608, 610};
constexpr std::chrono::seconds kNotReadyPause(30);
constexpr int kBusyMinMinutes = 15;
constexpr int kBusyMinuteSteps = 5;

constexpr char kIndexIdPrefix[] = "appindex_";

// "white space" is spelled with the blank: so the daemon names that analyzer.
constexpr char kAppIndexMappings[] = R"({
  "property_id": "id",
  "default": {
    "type": "string",
    "analyzer": "tovostandard",
    "required": false,
    "stored": true,
    "_all": true
  },
  "properties": {
    "id": {"analyzer": "keyword", "required": true, "_all": false},
    "owner": {"analyzer": "keyword", "_all": false},
    "title": {"type": "text"},
    "desc": {"type": "text"},
    "keywords": {"type": "text"},
    "search_title": {
      "type": "text",
      "analyzer": "white space",
      "preprocess": ["tolower", "ngram"]
    }
  }
})";

void Pause(Observer::Wait reason, std::chrono::seconds pause) {
  Tell(&Observer::OnWait, reason, pause);
  sleep(static_cast<unsigned>(pause.count()));
}

// Gives up in silence: the connect that follows fails and says so.
void WaitForSocket() {
  for (int failed = 1; access(kElasticdSockPath, F_OK) != 0 && failed < kMaxSocketChecks;
       ++failed) {
    LogNotice(kModule, 74, "elastic socket is not ready, retry ... " + std::to_string(failed));
    Pause(Observer::Wait::kSocket, kSocketPause);
  }
}

// The reply to almost every request. Parsing it would cost as much as sending a document.
constexpr char kPlainSuccess[] = R"({"success":true})";

bool ParseReply(Json::Value& response, const std::string& text) {
  if (text != kPlainSuccess) return fromString(response, text);
  response = Json::Value(Json::objectValue);
  response["success"] = true;
  return true;
}

bool IsReply(const Json::Value& reply) {
  return reply.isObject() && reply.isMember("success") && reply["success"].isBool();
}

[[noreturn]] void ThrowDaemonError(const Json::Value& response, const std::string& request_text) {
  const Json::Value& error = response["error"];
  int code = 0;
  std::string msg;
  GetJsonValue(code, error, "code", true);
  GetJsonValue(msg, error, "msg", true);
  LogFailureText({kModule, 94, "SendRequestImpl"}, "Request failed: " + request_text);
  throw Error(code, "Request failed, msg=" + msg);
}

// Pauses before the next attempt when the daemon's answer is one that passes by itself.
bool PauseForRetry(int code) {
  if (std::count(std::begin(kDaemonDbNotReady), std::end(kDaemonDbNotReady), code) != 0) {
    LogNotice(kModule, 108,
              "DB is not good yet, retry... (Error Code: " + std::to_string(code) + ")");
    Pause(Observer::Wait::kNotReady, kNotReadyPause);
    return true;
  }
  if (code == Error::kDaemonBusy) {
    LogNotice(kModule, 114, "Retry since tovoelasticd is busy");
    Pause(Observer::Wait::kBusy, std::chrono::minutes(rand() % kBusyMinuteSteps + kBusyMinMinutes));
    return true;
  }
  return false;
}

// What every command's data begin with.
Json::Value MakeData(const std::string& lang) {
  Json::Value data(Json::objectValue);
  data["id"] = GetAppIndexID(lang);
  return data;
}

void SendCommand(const char* command, Json::Value data) {
  Json::Value request(Json::objectValue);
  request["command"] = command;
  request["data"] = std::move(data);
  SendRequest(request);
}

std::string IdOf(const Json::Value& doc) {
  std::string id;
  GetStrictString(id, doc, "id", true);
  return id;
}

// Put together as text: a Json::Value of the request would copy the whole document.
std::string UpsertText(const std::string& lang, const std::string& doc_id, const Json::Value& doc) {
  return R"({"command":"document_upsert_by_id","data":{"id":)" + toString(GetAppIndexID(lang)) +
         R"(,"doc_id":)" + toString(doc_id) + R"(,"data":)" + toString(doc) + "}}";
}

}  // namespace

void SendRequestImpl(Json::Value& response, const RequestText& request) {
  WaitForSocket();

  tovodaemon::DomainSockConnection conn(kElasticdSockPath);
  CheckOrThrow(conn.Connect(kElasticdConnectTimeout), {kModule, 84, "SendRequestImpl"},
               "!conn.Connect(kElasticdConnectTimeout)", Error::kElasticdRequestError,
               [&] { return "Connect failed, req=" + request(); });
  const std::string request_text = request();  // while the daemon wakes up
  CheckOrThrow(conn.Send(request_text), {kModule, 86, "SendRequestImpl"},
               "!conn.Send(req.toString())", Error::kElasticdRequestError,
               [&] { return "Send failed, req=" + request_text; });
  std::string reply;
  CheckOrThrow(conn.Recv(reply) && ParseReply(response, reply) && IsReply(response),
               {kModule, 89, "SendRequestImpl"},
               "!conn.Recv(resp_raw) || !res.fromString(resp_raw) || !res.isMember(\"success\") || "
               "!res[\"success\"].isBool()",
               Error::kElasticdRequestError, [&] { return "Recv failed, req=" + request_text; });
  if (!response["success"].asBool()) ThrowDaemonError(response, request_text);
  conn.Disconnect();
}

void SendRequestImpl(Json::Value& response, const Json::Value& request) {
  SendRequestImpl(response, [&] { return toString(request); });
}

void SendRequest(const Json::Value& request) {
  SendRequest([&] { return toString(request); });
}

void SendRequest(const RequestText& request) {
  Json::Value response;
  for (;;) {
    try {
      SendRequestImpl(response, request);
      return;
    } catch (const Error& error) {
      if (!PauseForRetry(error.code)) throw;
    }
  }
}

Json::Value GetAppIndexMappings(const std::string& mappings) {
  Json::Value ret;
  CheckOrThrow(fromString(ret, mappings), {kModule, 58, "GetAppIndexMappings"},
               "!ret.fromString(mappings)", Error::kGeneralError);
  return ret;
}

Json::Value GetAppIndexMappings() { return GetAppIndexMappings(kAppIndexMappings); }

std::string GetAppIndexID(const std::string& lang) { return kIndexIdPrefix + lang; }

void AppIndexCreate(const std::string& lang) {
  Json::Value data = MakeData(lang);
  data["path"] = kIndexDbDir + lang;
  data["settings"] = Json::Value(Json::objectValue);
  data["mappings"] = GetAppIndexMappings();
  SendCommand("index_create", std::move(data));
}

void AppIndexDelete(const std::string& lang) { SendCommand("index_delete", MakeData(lang)); }

std::string UpsertRequest(const std::string& lang, const Json::Value& doc) {
  return UpsertText(lang, IdOf(doc), doc);
}

void IndexUpsert(const std::string& lang, const Json::Value& doc) {
  SendRequest([&, doc_id = IdOf(doc)] { return UpsertText(lang, doc_id, doc); });
}

void IndexDelete(const std::string& lang, const std::string& doc_id) {
  Json::Value data = MakeData(lang);
  data["doc_id"] = doc_id;
  SendCommand("document_del_by_id", std::move(data));
}

void IndexCommit(const std::string& lang) { SendCommand("commit", MakeData(lang)); }

}  // namespace velkor::appindex::elastic
