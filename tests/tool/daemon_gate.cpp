#include "tests/tool/daemon_gate.h"

#include <json/writer.h>

#include <cstdio>
#include <stdexcept>

#include "host/framing.h"
#include "tests/support/indexing.h"
#include "tests/support/searchd_process.h"

namespace test {
namespace {

constexpr char kDaemonsSocket[] = "/var/run/behind-the-gate.sock";

std::string AskDaemonBehind(const Json::Value& request) {
  const Fd connection = Connect(kDaemonsSocket);
  std::string reply;
  if (!host::SendFrame(connection.Get(), Json::writeString(Json::StreamWriterBuilder(), request)) ||
      !host::RecvFrame(connection.Get(), reply)) {
    throw std::runtime_error("the daemon behind the gate does not answer");
  }
  return reply;
}

}  // namespace

DaemonGate::DaemonGate(int held) : held_(held) {
  if (std::rename(kSocket, kDaemonsSocket) != 0)
    throw std::runtime_error("no daemon to stand before");
  daemon_ = std::make_unique<ScriptedDaemon>(
      [this](const Json::Value& request) { return Pass(request); });
}

DaemonGate::~DaemonGate() {
  Open();
  daemon_.reset();
  std::rename(kDaemonsSocket, kSocket);
}

void DaemonGate::AwaitHeld() {
  std::unique_lock<std::mutex> lock(mutex_);
  changed_.wait(lock, [this] { return is_held_; });
}

void DaemonGate::Open() {
  const std::lock_guard<std::mutex> lock(mutex_);
  is_open_ = true;
  changed_.notify_all();
}

Reaction DaemonGate::Pass(const Json::Value& request) {
  {
    std::unique_lock<std::mutex> lock(mutex_);
    if (request["data"].isMember("doc_id") && ++documents_ == held_) {
      is_held_ = true;
      changed_.notify_all();
      changed_.wait(lock, [this] { return is_open_; });
    }
  }
  return Reply(AskDaemonBehind(request));
}

}  // namespace test
