// The search daemon as its clients see it.
#pragma once

#include <json/value.h>
#include <sys/types.h>

#include <string>
#include <vector>

namespace bench {

// One request and its reply, on a connection of its own. Throws when the exchange fails; the reply
// is not looked at.
std::string Exchange(const std::string& request);

// The same, for a request that must succeed.
Json::Value Ask(const std::string& request);

// The process that answers.
pid_t DaemonProcess();

// As the library words it.
std::string UpsertRequest(const std::string& lang, const Json::Value& document);
std::string CommitRequest(const std::string& lang);
std::string SearchRequest(const std::string& lang, const std::string& query);

// Sends requests, which must all succeed without a result, from some clients at once; returns when
// all are answered.
void SendAll(const std::vector<std::string>& requests);

}  // namespace bench
