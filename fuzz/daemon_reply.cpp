// What comes from the daemon's socket after a request: as a stream of bytes, and as the text of one
// frame.
#include <json/value.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <iterator>
#include <optional>
#include <string>

#include "appindex/elastic_control_internal.h"
#include "appindex/error.h"
#include "device/tovodaemon.h"
#include "fuzz/no_waiting.h"
#include "fuzz/target.h"
#include "host/framing.h"

namespace fuzz {
namespace {

namespace elastic = velkor::appindex::elastic;

// More than this fits into no socket at once; nobody reads while the target writes.
constexpr std::size_t kMostBytes = std::size_t{64} * 1024;

constexpr unsigned kSocketPause = 1;  // before a daemon that is not there; the others are longer

constexpr int kPassing[] = {607, 608, 610, 1400};

std::string incoming;  // what the daemon sends on the next connection before it closes
int open_connections = 0;

// The end of a connection at which `incoming` arrives.
int ConnectToIncoming() {
  std::array<int, 2> ends{};
  Require(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends.data()) == 0,
          "there is a socket");
  const ssize_t sent = send(ends[1], incoming.data(), incoming.size(), MSG_DONTWAIT);
  Require(sent == static_cast<ssize_t>(incoming.size()), "the socket takes everything");
  close(ends[1]);
  return ends[0];
}

Json::Value Request() {
  Json::Value request(Json::objectValue);
  request["command"] = "commit";
  return request;
}

// The code of the error that the exchange ends in; nothing when it succeeds.
std::optional<int> ExchangeOnce() {
  Json::Value response("untouched");
  std::optional<int> code;
  try {
    elastic::SendRequestImpl(response, Request());
  } catch (const velkor::Error& error) {
    code = error.code;
    Require(!error.reason.empty(), "a failure has a reason");
  }
  const bool is_success = response.isObject() && response.get("success", false) == true;
  Require(is_success == !code, "an exchange succeeds exactly when the reply says so");
  Require(open_connections == 0, "the connection is closed");
  return code;
}

bool PassesByItself(std::optional<int> code) {
  return code && std::count(std::begin(kPassing), std::end(kPassing), *code) != 0;
}

// With a daemon that has recovered when it is asked again.
std::optional<int> ExchangeWithRetries(bool& waited) {
  on_sleep = [&](unsigned seconds) {
    if (seconds == kSocketPause) return;
    waited = true;
    const std::string success = R"({"success":true})";
    incoming = host::FrameHeader(success.size()) + success;
  };
  std::optional<int> code;
  try {
    elastic::SendRequest(Request());
  } catch (const velkor::Error& error) {
    code = error.code;
  }
  on_sleep = nullptr;
  return code;
}

void Arrives(const std::string& bytes) {
  incoming = bytes;
  const std::optional<int> once = ExchangeOnce();
  bool waited = false;
  const std::optional<int> in_the_end = ExchangeWithRetries(waited);
  Require(waited == PassesByItself(once), "what passes by itself is asked again, and nothing else");
  Require(in_the_end == (waited ? std::nullopt : once), "every other answer holds");
}

void IsReceivedWholeOrNotAtAll(const std::string& bytes) {
  incoming = bytes;
  const int fd = ConnectToIncoming();
  std::string message = "before";
  const bool received = host::RecvFrame(fd, message);
  close(fd);
  const bool has_header = bytes.size() >= host::kFrameHeaderBytes;
  const std::size_t length = has_header ? host::FrameLength(bytes.data()) : 0;
  const bool is_complete = has_header && length <= host::kMaxFrameBytes &&
                           bytes.size() - host::kFrameHeaderBytes >= length;
  Require(received == is_complete, "a frame is received when it is there");
  Require(message == (received ? bytes.substr(host::kFrameHeaderBytes, length) : ""),
          "a message is what the frame holds, or empty");
}

}  // namespace

void Try(const std::string& input) {
  const std::string bytes = input.substr(0, kMostBytes);
  IsReceivedWholeOrNotAtAll(bytes);
  Arrives(bytes);
  Arrives(host::FrameHeader(bytes.size()) + bytes);
}

}  // namespace fuzz

// The device's client, but for where it connects to.
namespace tovodaemon {

SockConnection::SockConnection() : fd_(-1) {}

SockConnection::~SockConnection() { SockConnection::Disconnect(); }

void SockConnection::Disconnect() {
  if (fd_ == -1) return;
  close(fd_);
  fd_ = -1;
  --fuzz::open_connections;
}

// The daemon reads every request.
bool SockConnection::Send(const std::string& message) {
  return fd_ != -1 && message.size() <= host::kMaxFrameBytes;
}

bool SockConnection::Recv(std::string& message) { return host::RecvFrame(fd_, message); }

DomainSockConnection::DomainSockConnection(const std::string& path) : path_(path) {}

bool DomainSockConnection::Connect(long /*timeout_seconds*/) {
  fuzz::Require(path_ == fuzz::elastic::kElasticdSockPath, "the daemon's socket is asked for");
  fd_ = fuzz::ConnectToIncoming();
  ++fuzz::open_connections;
  return true;
}

}  // namespace tovodaemon
