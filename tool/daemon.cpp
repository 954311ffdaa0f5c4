#include "tool/daemon.h"

#include <sys/socket.h>
#include <sys/time.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstring>

#include "appindex/elastic_control_internal.h"
#include "appindex/error.h"
#include "appindex/utilities/json_helpers.h"
#include "device/tovodaemon.h"
#include "tool/failure.h"

namespace tool {
namespace {

using std::chrono::microseconds;
using velkor::Error;

volatile std::sig_atomic_t bounded_fd = -1;
volatile std::sig_atomic_t expired = 0;

// Ends the exchange, in whichever call it is.
void Expire(int /*signal*/) {
  const int kept = errno;
  expired = 1;
  shutdown(bounded_fd, SHUT_RDWR);
  errno = kept;
}

// Shuts a connection down when its time is over, unless it has gone by then. One at a time.
class TimeLimit {
 public:
  TimeLimit(int fd, microseconds patience) {
    bounded_fd = fd;
    expired = 0;
    struct sigaction action {};
    action.sa_handler = Expire;
    sigaction(SIGALRM, &action, &before_);
    Set(std::max(patience, microseconds(1)));  // none would mean no limit
  }
  ~TimeLimit() {
    Set(microseconds(0));
    sigaction(SIGALRM, &before_, nullptr);
  }
  TimeLimit(const TimeLimit&) = delete;
  TimeLimit& operator=(const TimeLimit&) = delete;

 private:
  static void Set(microseconds time) {
    itimerval timer{};
    timer.it_value.tv_sec = time.count() / 1000000;
    timer.it_value.tv_usec = time.count() % 1000000;
    setitimer(ITIMER_REAL, &timer, nullptr);
  }

  struct sigaction before_ {};
};

// The device's connection, with a bound on the exchange.
class Connection : public tovodaemon::DomainSockConnection {
 public:
  using DomainSockConnection::DomainSockConnection;

  // False when no whole answer has come, with `expired` telling whether for want of time.
  bool Exchange(const std::string& request, std::string& reply, microseconds patience) {
    const TimeLimit limit(fd_, patience);
    return Send(request) && Recv(reply);
  }
};

[[noreturn]] void FailOfDaemon(const std::string& what, const std::string& advice) {
  throw Failure(
      std::string(velkor::appindex::elastic::kElasticdSockPath) + ": the search daemon " + what,
      advice, kDaemonUnreachable, Error::kElasticdRequestError);
}

// Not SendRequestImpl of the library: it waits for the socket and for ever, and logs what fails.
std::string Exchange(const std::string& request, microseconds patience) {
  constexpr char kStart[] = "start tovoelasticd and try again";
  constexpr char kSeeLog[] = "see what it says in the system log, or start it anew";
  Connection connection(velkor::appindex::elastic::kElasticdSockPath);
  if (!connection.Connect(kConnectPatience.count())) {
    const int error = errno;
    FailOfDaemon(std::string("does not answer: ") + std::strerror(error),
                 error == EACCES ? AdviceOn(error) : kStart);
  }
  std::string reply;
  if (connection.Exchange(request, reply, patience)) return reply;
  if (expired == 0) FailOfDaemon("has closed the connection without an answer", kSeeLog);
  const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(patience).count();
  FailOfDaemon("has not answered in " + std::to_string(seconds) + " s", kSeeLog);
}

}  // namespace

void FailOfNonsense(const std::string& what) {
  FailOfDaemon("has given an answer that makes no sense: " + what,
               "install the daemon that belongs to this appindex");
}

Json::Value AskDaemon(const std::string& command, const Json::Value& data, microseconds patience) {
  Json::Value request;
  request["command"] = command;
  request["data"] = data;
  const std::string text = Exchange(velkor::toString(request), patience);
  Json::Value reply;
  const bool is_reply =
      velkor::fromString(reply, text) && reply.isObject() && reply["success"].isBool();
  if (is_reply && reply["success"].asBool()) return reply;
  const Json::Value error = is_reply ? reply["error"] : Json::Value();
  if (!error.isObject() || !error["code"].isInt() || !error["msg"].isString()) {
    FailOfNonsense("it is no reply");
  }
  throw Error(error["code"].asInt(), error["msg"].asString());
}

}  // namespace tool
