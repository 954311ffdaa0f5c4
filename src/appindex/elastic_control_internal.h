// Internal seams of the module elastic_control: one exchange with the search daemon, the same with
// its retries, and the schema of an app index.
#pragma once

#include <json/value.h>

#include <functional>
#include <string>

namespace velkor::appindex::elastic {

constexpr char kElasticdSockPath[] = "/var/run/tovoelasticd.sock";

// Where the daemon keeps the app indexes, one directory per language.
constexpr char kIndexDbDir[] = "/var/packages/Velkor/etc/appindex.db/";

// Sends one request on a connection of its own and puts the daemon's reply into `response` when it
// reports success; otherwise throws Error 913 (transport), the daemon's own code, or 120 (a failure
// reply without a code or without a text). `response` is untouched when no reply could be parsed.
// The request is given as a value, or as what makes its JSON text, for each exchange anew.
using RequestText = std::function<std::string()>;
void SendRequestImpl(Json::Value& response, const Json::Value& request);
void SendRequestImpl(Json::Value& response, const RequestText& request);

// The same, again and again while the daemon answers that its database is not ready or that it is
// busy. The reply is dropped.
void SendRequest(const Json::Value& request);
void SendRequest(const RequestText& request);

// What IndexUpsert sends. Throws Error 120 when the document has no "id" that is a string.
std::string UpsertRequest(const std::string& lang, const Json::Value& doc);

// The schema of an app index as the daemon is told it. Throws Error 502, logged, when `mappings` is
// not JSON.
Json::Value GetAppIndexMappings(const std::string& mappings);
Json::Value GetAppIndexMappings();

}  // namespace velkor::appindex::elastic
