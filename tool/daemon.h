// One exchange with the search daemon, as one who searches has it.
#pragma once

#include <json/value.h>

#include <chrono>
#include <string>

namespace tool {

// How long the daemon has to take the connection, and then to answer. The first request for an
// index waits until all of it has been read, and a commit keeps others waiting.
constexpr std::chrono::seconds kConnectPatience(10);
constexpr std::chrono::seconds kAnswerPatience(60);

// Sends a command of doc/protocol.md and returns the reply, which reports success. Waits for the
// answer as long as that, but not for a daemon that is not there. Uses SIGALRM and its timer.
//
// Throws a Failure with code 913 when the daemon does not answer, or not in a way that can be
// understood; else velkor::Error with the daemon's own code.
Json::Value AskDaemon(const std::string& command,
                      const Json::Value& data = Json::Value(Json::objectValue),
                      std::chrono::microseconds patience = kAnswerPatience);

// Throws the Failure of an answer that cannot be understood, with what is wrong with it.
[[noreturn]] void FailOfNonsense(const std::string& what);

}  // namespace tool
