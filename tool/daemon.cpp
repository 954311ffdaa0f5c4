#include "tool/daemon.h"

#include "appindex/elastic_control_internal.h"
#include "appindex/error.h"
#include "appindex/utilities/json_helpers.h"
#include "device/tovodaemon.h"

namespace tool {
namespace {

constexpr long kConnectSeconds = 10;

}  // namespace

Json::Value AskDaemon(const std::string& command, const Json::Value& data) {
  Json::Value request;
  request["command"] = command;
  request["data"] = data;

  // Not SendRequestImpl of the library: it waits for the socket, and logs what fails.
  tovodaemon::DomainSockConnection connection(velkor::appindex::elastic::kElasticdSockPath);
  std::string text;
  Json::Value reply;
  const bool answered = connection.Connect(kConnectSeconds) &&
                        connection.Send(velkor::toString(request)) && connection.Recv(text) &&
                        velkor::fromString(reply, text) && reply.isObject() &&
                        reply["success"].isBool();
  if (!answered) throw velkor::Error(velkor::Error::kElasticdRequestError, "no answer");
  if (!reply["success"].asBool()) {
    int code = 0;
    std::string message;
    velkor::GetJsonValue(code, reply["error"], "code", true);
    velkor::GetJsonValue(message, reply["error"], "msg", true);
    throw velkor::Error(code, message);
  }
  return reply;
}

}  // namespace tool
