// The shape of the daemon's reply to a search.
#pragma once

#include <json/value.h>

namespace tool {

// Throws the Failure of an answer that makes no sense, which names the member, where one that a
// search shows is missing or not of the type that doc/protocol.md gives it.
void RequireSearchReply(const Json::Value& reply);

}  // namespace tool
