// A place between the program and the real daemon, where a test can hold the program up.
#pragma once

#include <condition_variable>
#include <memory>
#include <mutex>
#include <string>

#include "tests/support/scripted_daemon.h"

namespace test {

// Takes the socket of the running daemon for its own and passes every request and reply on. The
// answer to document number `held`, counted from 1, waits until the gate is opened.
class DaemonGate {
 public:
  explicit DaemonGate(int held);
  // Opens the gate and gives the daemon its socket back.
  ~DaemonGate();
  DaemonGate(const DaemonGate&) = delete;
  DaemonGate& operator=(const DaemonGate&) = delete;

  // Returns when a client waits for the answer.
  void AwaitHeld();
  void Open();

 private:
  Reaction Pass(const Json::Value& request);

  const int held_;
  std::mutex mutex_;
  std::condition_variable changed_;
  int documents_ = 0;
  bool is_held_ = false;
  bool is_open_ = false;
  std::unique_ptr<ScriptedDaemon> daemon_;  // the last to come and the first to go
};

}  // namespace test
