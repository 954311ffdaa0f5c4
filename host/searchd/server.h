// Serving connections: one request and one reply each.
//
// One thread waits on all sockets at once and answers what takes no time; the rest it hands to a
// few workers. So no thread ever waits for a single client, and no search or commit holds up
// another.
#pragma once

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <deque>
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
  // Takes a listening socket, and a signalfd: SIGHUP makes the handler reopen what it holds, any
  // other signal is the time to stop. A client has `time_limit` to deliver its request and again to
  // take the reply. Throws std::runtime_error.
  Server(Handler& handler, int listener, int signals, std::chrono::milliseconds time_limit);

  // Serves: the caller's thread waits for requests and answers quick ones, `workers` threads (one
  // or more) answer the others. Returns after a stop signal, when the requests that have arrived
  // are answered; requests that are not complete then are dropped.
  void Run(unsigned workers);

 private:
  using State = Connection::State;
  using TimePoint = Connection::TimePoint;
  using Clock = std::chrono::steady_clock;

  using Task = std::function<void()>;

  void Work();
  void Post(Task task);
  Task Serve(std::shared_ptr<Connection> connection, const std::string& request);
  void FinishSending();

  // For the thread that waits.
  Task NextTask();
  Task IdleTask();
  Task ReopenTask();
  std::shared_ptr<Connection> WaitForRequest();
  int WaitMilliseconds(bool idle_work) const;
  std::shared_ptr<Connection> HandleEvent(int fd);
  void TakeSignal();
  std::shared_ptr<Connection> Accept();
  std::shared_ptr<Connection> Continue(std::shared_ptr<Connection> connection);
  void TakeBack();
  void DropExpired();
  void UpdateListening();
  void PauseAccepting(const char* what);
  bool Watch(int fd, unsigned events);
  void Unwatch(int fd);

  Handler& handler_;
  const host::sdk::UniqueFd listener_;
  const host::sdk::UniqueFd signals_;
  const host::sdk::UniqueFd events_;
  const host::sdk::UniqueFd wake_;
  const std::chrono::milliseconds time_limit_;

  // The waiting thread's own.
  std::map<int, std::shared_ptr<Connection>> connections_;
  bool listening_ = false;
  TimePoint accept_again_;                // set after the system had nothing to give
  TimePoint stop_by_ = TimePoint::max();  // the stop signal sets it
  bool stopped_ = false;
  bool reopen_ = false;

  std::mutex tasks_mutex_;
  std::condition_variable posted_;
  std::deque<Task> tasks_;
  std::atomic<bool> idle_work_runs_ = false;

  std::mutex returned_mutex_;
  std::vector<std::shared_ptr<Connection>> returned_;  // whose replies take more than one send
};

}  // namespace searchd
