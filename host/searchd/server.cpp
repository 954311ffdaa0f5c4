#include "host/searchd/server.h"

#include <poll.h>
#include <sched.h>
#include <sys/epoll.h>
#include <sys/eventfd.h>
#include <sys/signalfd.h>
#include <sys/socket.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstdint>
#include <stdexcept>
#include <thread>
#include <utility>

#include "host/searchd/request_error.h"
#include "host/searchd/service_manager.h"

namespace searchd {
namespace {

using std::chrono::milliseconds;

// No request for this long is a pause in which other work is not in the way.
constexpr int kIdleMilliseconds = 2;
constexpr milliseconds kAcceptPause(100);
// A client sends its request right after it has connected. Looking for it this long spares it the
// time to wake a sleeping thread a second time.
constexpr std::chrono::microseconds kLookForRequest(100);
// How long requests are taken after the stop signal, if there is always one that has arrived.
constexpr milliseconds kLastRequests(1000);
// How long the end of the daemon waits for a client to take its reply.
constexpr int kLastSendMilliseconds = 1000;

}  // namespace

Server::Server(Handler& handler, int listener, int signals, milliseconds time_limit)
    : handler_(handler),
      listener_(listener),
      signals_(signals),
      events_(epoll_create1(EPOLL_CLOEXEC)),
      wake_(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)),
      time_limit_(time_limit) {
  if (!events_.IsOpen() || !wake_.IsOpen() || !Watch(wake_.Get(), EPOLLIN) ||
      !Watch(signals_.Get(), EPOLLIN)) {
    throw std::runtime_error(WithErrno("cannot wait for clients", errno));
  }
}

void Server::Run(unsigned workers) {
  std::vector<std::thread> threads;
  for (unsigned i = 0; i < workers; ++i) threads.emplace_back([this] { Work(); });
  while (Task task = NextTask()) Post(std::move(task));
  for (unsigned i = 0; i < workers; ++i) Post(nullptr);
  for (std::thread& thread : threads) thread.join();
  FinishSending();
}

void Server::Post(Task task) {
  const std::lock_guard lock(tasks_mutex_);
  tasks_.push_back(std::move(task));
  posted_.notify_one();
}

// Carries out tasks until an empty one says that there are no more.
void Server::Work() {
  for (;;) {
    Task task;
    {
      std::unique_lock lock(tasks_mutex_);
      posted_.wait(lock, [this] { return !tasks_.empty(); });
      task = std::move(tasks_.front());
      tasks_.pop_front();
    }
    if (!task) return;
    task();
  }
}

// Waits for something that a worker is to do; none when it is time to stop. Answers quick requests
// on the way: for them it is not worth waking a worker.
Server::Task Server::NextTask() {
  for (;;) {
    std::shared_ptr<Connection> connection = WaitForRequest();
    if (stopped_) return nullptr;
    if (std::exchange(reopen_, false)) return ReopenTask();
    if (!connection) return IdleTask();
    std::string request = connection->TakeRequest();
    if (!handler_.IsQuick(request)) {
      return [this, connection = std::move(connection), request = std::move(request)]() mutable {
        if (const Task after = Serve(std::move(connection), request)) after();
        // The waiting thread may have gone to wait before there was anything to do while idle.
        if (handler_.HasIdleWork()) eventfd_write(wake_.Get(), 1);
      };
    }
    if (Task after = Serve(std::move(connection), request)) return after;
  }
}

// One at a time; its end wakes the waiting thread, which then looks whether there is more to do.
Server::Task Server::IdleTask() {
  idle_work_runs_ = true;
  return [this] {
    handler_.DoIdleWork();
    idle_work_runs_ = false;
    eventfd_write(wake_.Get(), 1);
  };
}

Server::Task Server::ReopenTask() {
  return [this] {
    NotifyReloading();
    handler_.Reopen();
    NotifyReady();
  };
}

// Returns what is to be done when the reply is on its way.
Server::Task Server::Serve(std::shared_ptr<Connection> connection, const std::string& request) {
  Answer answer = handler_.Handle(request, connection->Client());
  connection->Reply(answer.text, Clock::now() + time_limit_);
  if (connection->GetState() == State::kSending) {
    {
      const std::lock_guard lock(returned_mutex_);
      returned_.push_back(std::move(connection));
    }
    eventfd_write(wake_.Get(), 1);
  }
  return std::move(answer.after);
}

void Server::FinishSending() {
  TakeBack();
  for (auto& [fd, connection] : connections_) {
    pollfd writable{fd, POLLOUT, 0};
    while (connection->GetState() == State::kSending &&
           poll(&writable, 1, kLastSendMilliseconds) > 0) {
      connection->Continue();
    }
  }
  connections_.clear();
}

// Returns a connection with a complete request, or null when it is time to stop, to reopen or to do
// idle work.
std::shared_ptr<Connection> Server::WaitForRequest() {
  for (;;) {
    DropExpired();
    UpdateListening();
    const bool stopping = stop_by_ != TimePoint::max();
    const bool idle_work = !stopping && !idle_work_runs_ && handler_.HasIdleWork();
    epoll_event event{};
    const int wait = stopping ? 0 : WaitMilliseconds(idle_work);
    const int found = epoll_wait(events_.Get(), &event, 1, wait);
    stopped_ = stopping && (found == 0 || Clock::now() >= stop_by_);
    if (stopped_ || (found == 0 && idle_work)) return nullptr;
    if (found <= 0) continue;
    if (auto connection = HandleEvent(event.data.fd)) return connection;
    if (reopen_) return nullptr;
  }
}

int Server::WaitMilliseconds(bool idle_work) const {
  if (idle_work) return kIdleMilliseconds;
  TimePoint next = TimePoint::max();
  for (const auto& [fd, connection] : connections_) next = std::min(next, connection->Deadline());
  if (!listening_) next = std::min(next, std::max(accept_again_, Clock::now() + kAcceptPause));
  if (next == TimePoint::max()) return -1;
  const auto left = std::chrono::ceil<milliseconds>(next - Clock::now()).count();
  return static_cast<int>(std::clamp<std::int64_t>(left, 0, 60 * 1000));
}

// Returns a connection whose request is complete.
std::shared_ptr<Connection> Server::HandleEvent(int fd) {
  if (fd == listener_.Get()) return Accept();
  if (fd == signals_.Get()) {
    TakeSignal();
    return nullptr;
  }
  if (fd == wake_.Get()) {
    TakeBack();
    return nullptr;
  }
  const auto found = connections_.find(fd);
  if (found == connections_.end()) return nullptr;
  std::shared_ptr<Connection> connection = std::move(found->second);
  connections_.erase(found);
  Unwatch(fd);
  connection->Continue();
  return Continue(std::move(connection));
}

void Server::TakeSignal() {
  signalfd_siginfo signal{};
  if (read(signals_.Get(), &signal, sizeof(signal)) != sizeof(signal)) return;
  if (signal.ssi_signo == SIGHUP) {
    reopen_ = true;
  } else {
    NotifyStopping();
    stop_by_ = Clock::now() + kLastRequests;
  }
}

std::shared_ptr<Connection> Server::Accept() {
  const int fd = accept4(listener_.Get(), nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK);
  if (fd < 0) {
    if (errno == EMFILE || errno == ENFILE || errno == ENOBUFS || errno == ENOMEM) {
      PauseAccepting("cannot accept a client");
    }
    return nullptr;
  }
  auto connection = std::make_shared<Connection>(fd, Clock::now() + time_limit_);
  const TimePoint look_until = Clock::now() + kLookForRequest;
  connection->Continue();
  while (connection->GetState() == State::kReceiving && Clock::now() < look_until) {
    sched_yield();
    connection->Continue();
  }
  return Continue(std::move(connection));
}

// For a system that has nothing left to give, of which errno tells.
void Server::PauseAccepting(const char* what) {
  syslog(LOG_WARNING, "%s", WithErrno(what, errno).c_str());
  accept_again_ = Clock::now() + kAcceptPause;
}

// Sees to it that a connection goes on from the state that it is in; one that cannot be waited for
// is closed.
std::shared_ptr<Connection> Server::Continue(std::shared_ptr<Connection> connection) {
  if (connection->GetState() == State::kTooLong) {
    connection->Reply(handler_.TooLong(), Clock::now() + time_limit_);
  }
  if (connection->GetState() == State::kReceived) return connection;
  if (connection->GetState() == State::kDone) return nullptr;
  const int fd = connection->Fd();
  if (Watch(fd, connection->GetState() == State::kSending ? EPOLLOUT : EPOLLIN)) {
    connections_[fd] = std::move(connection);
  } else {
    syslog(LOG_ERR, "%s", WithErrno("cannot wait for a client", errno).c_str());
  }
  return nullptr;
}

void Server::TakeBack() {
  eventfd_t count = 0;
  eventfd_read(wake_.Get(), &count);
  std::vector<std::shared_ptr<Connection>> returned;
  {
    const std::lock_guard lock(returned_mutex_);
    returned.swap(returned_);
  }
  for (auto& connection : returned) Continue(std::move(connection));
}

void Server::DropExpired() {
  const TimePoint now = Clock::now();
  for (auto it = connections_.begin(); it != connections_.end();) {
    if (it->second->Deadline() > now) {
      ++it;
      continue;
    }
    Unwatch(it->first);
    it = connections_.erase(it);
  }
}

void Server::UpdateListening() {
  const bool listen = connections_.size() < kMaxConnections && Clock::now() >= accept_again_;
  if (listen == listening_) return;
  listening_ = listen;
  if (!listen) {
    Unwatch(listener_.Get());
  } else if (!Watch(listener_.Get(), EPOLLIN)) {
    PauseAccepting("cannot wait for clients");
    listening_ = false;
  }
}

// False, with errno set, when the system has no room for it.
bool Server::Watch(int fd, unsigned events) {
  epoll_event event{};
  event.events = events;
  event.data.fd = fd;
  return epoll_ctl(events_.Get(), EPOLL_CTL_ADD, fd, &event) == 0;
}

void Server::Unwatch(int fd) { epoll_ctl(events_.Get(), EPOLL_CTL_DEL, fd, nullptr); }

}  // namespace searchd
