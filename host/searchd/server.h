// Serving connections: one request and one reply each.
//
// A few threads take turns. One of them waits on all sockets at once; when a request is complete it
// lets another take its place and answers. So no thread ever waits for a single client, and a
// request is answered by the thread that received it.
#pragma once

#include <chrono>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <vector>

#include "host/sdk/unique_fd.h"
#include "host/searchd/connection.h"
#include "host/searchd/handler.h"

namespace searchd {

// As many clients may be delivering requests or taking replies; more wait to be accepted.
constexpr std::size_t kMaxConnections = 256;

class Server {
 public:
  // Takes a listening socket, and a signalfd that becomes readable when it is time to stop. A
  // client has `time_limit` to deliver its request and again to take the reply. Throws
  // std::runtime_error.
  Server(Handler& handler, int listener, int stop_signals, std::chrono::milliseconds time_limit);

  // Serves with `threads` threads, the caller's included. Returns after a stop signal, when the
  // requests at hand are answered; requests that are not complete then are dropped.
  void Run(unsigned threads);

 private:
  using State = Connection::State;
  using TimePoint = Connection::TimePoint;
  using Clock = std::chrono::steady_clock;

  using Task = std::function<void()>;

  void Work();
  Task Serve(std::shared_ptr<Connection> connection, const std::string& request);
  void FinishSending();

  // For the thread that waits, with turn_ held.
  Task NextTask();
  std::shared_ptr<Connection> WaitForRequest();
  int WaitMilliseconds(bool idle_work) const;
  std::shared_ptr<Connection> HandleEvent(int fd);
  std::shared_ptr<Connection> Accept();
  std::shared_ptr<Connection> Continue(std::shared_ptr<Connection> connection);
  void TakeBack();
  void DropExpired();
  void UpdateListening();
  void Watch(int fd, unsigned events);
  void Unwatch(int fd);

  Handler& handler_;
  const host::sdk::UniqueFd listener_;
  const host::sdk::UniqueFd stop_signals_;
  const host::sdk::UniqueFd events_;
  const host::sdk::UniqueFd wake_;
  const std::chrono::milliseconds time_limit_;

  std::mutex turn_;  // held by the thread that waits; guards what follows
  std::map<int, std::shared_ptr<Connection>> connections_;
  bool listening_ = false;
  TimePoint accept_again_;  // set after the system had no descriptor to give
  bool stopped_ = false;

  std::mutex returned_mutex_;
  std::vector<std::shared_ptr<Connection>> returned_;  // whose replies take more than one send
};

}  // namespace searchd
