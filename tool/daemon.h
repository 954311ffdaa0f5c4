// One exchange with the search daemon, as one who searches has it.
#pragma once

#include <json/value.h>

#include <string>

namespace tool {

// Sends a command of doc/protocol.md and returns the reply, which reports success. Waits for the
// answer, but not for a daemon that is not there.
//
// Throws velkor::Error: 913 when the daemon does not answer, else the daemon's own code.
Json::Value AskDaemon(const std::string& command,
                      const Json::Value& data = Json::Value(Json::objectValue));

}  // namespace tool
