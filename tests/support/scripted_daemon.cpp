#include "tests/support/scripted_daemon.h"

#include <json/reader.h>
#include <json/writer.h>
#include <linux/sockios.h>
#include <sched.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <memory>
#include <stdexcept>
#include <utility>

#include "host/framing.h"
#include "tests/support/fork_guard.h"

namespace test {
namespace {

constexpr char kSocketPath[] = "/var/run/tovoelasticd.sock";

Json::Value Parse(const std::string& text) {
  const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
  Json::Value value;
  reader->parse(text.data(), text.data() + text.size(), &value, nullptr);
  return value;
}

int Listen() {
  const int fd = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strcpy(address.sun_path, kSocketPath);
  unlink(kSocketPath);
  if (fd < 0 || bind(fd, reinterpret_cast<sockaddr*>(&address), sizeof(address)) != 0 ||
      listen(fd, SOMAXCONN) != 0) {
    throw std::runtime_error(std::string("cannot listen: ") + std::strerror(errno));
  }
  return fd;
}

void SendRaw(int fd, const std::string& bytes) {
  send(fd, bytes.data(), bytes.size(), MSG_NOSIGNAL);
}

// The peer has taken a byte when none waits in the socket.
bool IsTaken(int fd) {
  int waiting = 0;
  return ioctl(fd, SIOCOUTQ, &waiting) != 0 || waiting == 0;
}

void SendOneByOne(int fd, const std::string& bytes) {
  for (const char byte : bytes) {
    if (send(fd, &byte, 1, MSG_NOSIGNAL) != 1) return;
    while (!IsTaken(fd)) sched_yield();
  }
}

void ReadPart(int fd, std::size_t bytes) {
  std::string part(bytes, '\0');
  recv(fd, part.data(), part.size(), MSG_WAITALL);
}

}  // namespace

Reaction Reply(const std::string& text) { return {Reaction::kReply, text}; }

Reaction Success() { return Reply(R"({"success":true})"); }

Reaction Failure(int code, const std::string& msg) {
  Json::Value reply;
  reply["success"] = false;
  reply["error"]["code"] = code;
  reply["error"]["msg"] = msg;
  return Reply(Json::writeString(Json::StreamWriterBuilder(), reply));
}

ScriptedDaemon::ScriptedDaemon(React react) : ScriptedDaemon({}, std::move(react)) {}

ScriptedDaemon::ScriptedDaemon(std::vector<Reaction> script)
    : ScriptedDaemon(std::move(script), nullptr) {}

ScriptedDaemon::ScriptedDaemon(std::vector<Reaction> script, React react)
    : script_(std::move(script)),
      react_(std::move(react)),
      listener_(Listen()),
      thread_([this] { Serve(); }) {}

ScriptedDaemon::~ScriptedDaemon() {
  shutdown(listener_, SHUT_RDWR);  // wakes the accept
  thread_.join();
  close(listener_);
  unlink(kSocketPath);
}

void ScriptedDaemon::Serve() {
  for (;;) {
    const int fd = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
    if (fd < 0) {
      if (errno == EINTR) continue;
      return;
    }
    Handle(fd);
    close(fd);
  }
}

void ScriptedDaemon::Handle(int fd) {
  Reaction reaction = Success();
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    const auto turn = static_cast<std::size_t>(connections_++);
    if (turn < script_.size()) reaction = script_[turn];
  }
  if (reaction.kind == Reaction::kRejectSend) return;
  if (reaction.kind == Reaction::kReadPart) return ReadPart(fd, reaction.bytes);

  std::string text;
  if (!host::RecvFrame(fd, text)) return;
  ForkGuard guard = HoldForks();
  const Json::Value request = Parse(text);
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    requests_.push_back(request);
  }
  guard.unlock();  // what follows may wait for a process that the test starts
  if (react_) reaction = react_(request);
  if (reaction.kind == Reaction::kReply) host::SendFrame(fd, reaction.text);
  if (reaction.kind == Reaction::kRawBytes) SendRaw(fd, reaction.text);
  if (reaction.kind == Reaction::kOneByOne) SendOneByOne(fd, reaction.text);
}

std::vector<Json::Value> ScriptedDaemon::Requests() {
  const std::lock_guard<std::mutex> lock(mutex_);
  return requests_;
}

void ScriptedDaemon::ForgetRequests() {
  const std::lock_guard<std::mutex> lock(mutex_);
  requests_.clear();
}

std::vector<std::string> ScriptedDaemon::Commands() {
  std::vector<std::string> commands;
  for (const Json::Value& request : Requests()) {
    std::string command = request["command"].asString() + " " + request["data"]["id"].asString();
    if (request["data"].isMember("doc_id")) command += " " + request["data"]["doc_id"].asString();
    commands.push_back(command);
  }
  return commands;
}

int ScriptedDaemon::Connections() {
  const std::lock_guard<std::mutex> lock(mutex_);
  return connections_;
}

}  // namespace test
