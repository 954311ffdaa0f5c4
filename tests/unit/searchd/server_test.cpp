// Serving connections where the system refuses what that takes, and the end while replies are on
// their way.
#include "host/searchd/server.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/signalfd.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstring>
#include <future>
#include <optional>
#include <string>
#include <thread>

#include "host/framing.h"
#include "host/sdk/unique_fd.h"
#include "host/searchd/handler.h"
#include "tests/unit/host/temp_dir.h"
#include "tests/unit/searchd/failing_calls.h"

namespace searchd {
namespace {

using host::sdk::UniqueFd;
using std::chrono::seconds;

// Replies with the request; to "large" with more than a socket takes at once.
class Echo : public Handler {
 public:
  bool IsQuick(const std::string&) override { return true; }
  Answer Handle(const std::string& request, uid_t) override {
    return {request == "large" ? std::string(kLargeReply, 'x') : request, nullptr};
  }
  std::string TooLong() override { return "too long"; }
  void Reopen() override {}
  bool HasIdleWork() override { return false; }
  void DoIdleWork() override {}

  static constexpr std::size_t kLargeReply = std::size_t{8} * 1024 * 1024;
};

// Answers on a thread of its own, and has something to do while idle from then on: when the waiting
// thread has looked for that already, and found nothing.
class BusyOnceItAnswers : public Echo {
 public:
  bool IsQuick(const std::string&) override {
    looks_next_ = true;
    return false;
  }
  Answer Handle(const std::string& request, uid_t client) override {
    looked_.get_future().wait();
    has_work_ = true;
    return Echo::Handle(request, client);
  }
  bool HasIdleWork() override {
    if (looks_next_.exchange(false)) looked_.set_value();
    return has_work_;
  }
  void DoIdleWork() override {
    has_work_ = false;
    done_.set_value();
  }

  bool IsDone() {
    constexpr std::chrono::minutes kForEver(1);
    return done_.get_future().wait_for(kForEver) == std::future_status::ready;
  }

 private:
  std::atomic<bool> looks_next_ = false;
  std::atomic<bool> has_work_ = false;
  std::promise<void> looked_;
  std::promise<void> done_;
};

class ServerTest : public ::testing::Test {
 protected:
  ServerTest() {
    listener_ = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
    address_.sun_family = AF_UNIX;
    (dir_ / "socket").copy(address_.sun_path, sizeof(address_.sun_path) - 1);
    EXPECT_EQ(bind(listener_, reinterpret_cast<const sockaddr*>(&address_), sizeof(address_)), 0);
    EXPECT_EQ(listen(listener_, 10), 0);
    std::array<int, 2> ends{};
    EXPECT_EQ(pipe2(ends.data(), O_CLOEXEC | O_NONBLOCK), 0);
    signals_ = ends[0];
    signals_end_.emplace(ends[1]);
  }
  ~ServerTest() override {
    if (thread_.joinable()) {
      Signal(SIGTERM);
      Join();
    }
    failing_call = {};
  }

  // Serves in a thread of its own, with `call` failing.
  void Start(const FailingCall& call = {}) { Start(echo_, call); }
  void Start(Handler& handler, const FailingCall& call = {}) {
    failing_call = call;
    thread_ = std::thread([this, &handler] {
      Server server(handler, listener_, signals_, seconds(3600));
      server.Run(1);
    });
  }

  // What arrives as from a signalfd.
  void Signal(std::uint32_t number) const {
    signalfd_siginfo info{};
    info.ssi_signo = number;
    EXPECT_EQ(write(signals_end_->Get(), &info, sizeof(info)), static_cast<ssize_t>(sizeof(info)));
  }

  // Waits for its end, and expects that what was to fail has been called.
  void Join() {
    thread_.join();
    EXPECT_EQ(failing_call.name, "") << "it was not called";
  }

  int Connect() const {
    const int client = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    EXPECT_EQ(connect(client, reinterpret_cast<const sockaddr*>(&address_), sizeof(address_)), 0);
    return client;
  }

  // The reply to a request of a new client; the error when there is none.
  std::string Ask(const std::string& request) const {
    const UniqueFd client(Connect());
    std::string reply;
    if (host::SendFrame(client.Get(), request) && host::RecvFrame(client.Get(), reply)) {
      return reply;
    }
    return std::strerror(errno);
  }

  // Waits until a reply has begun to arrive.
  static void WaitForReply(const UniqueFd& client) {
    char byte = 0;
    EXPECT_EQ(recv(client.Get(), &byte, 1, MSG_PEEK), 1);
  }

  static bool IsClosed(const UniqueFd& client) {
    char byte = 0;
    return read(client.Get(), &byte, 1) == 0;
  }

 private:
  const TempDir dir_;
  sockaddr_un address_{};
  int listener_ = -1;  // the server's, like the next
  int signals_ = -1;
  std::optional<UniqueFd> signals_end_;
  Echo echo_;
  std::thread thread_;
};

class RefusedAcceptTest : public ServerTest, public ::testing::WithParamInterface<int> {};

TEST_P(RefusedAcceptTest, MakesTheClientWaitAndNoMore) {
  Start({"accept4", GetParam(), 0});
  EXPECT_EQ(Ask("one"), "one");
  EXPECT_EQ(Ask("two"), "two");
}

INSTANTIATE_TEST_SUITE_P(, RefusedAcceptTest,
                         ::testing::Values(EMFILE, ENFILE, ENOBUFS, ENOMEM, ECONNABORTED),
                         [](const auto& error) {
                           return std::string(strerrorname_np(error.param));
                         });

TEST_F(ServerTest, AClientThatCannotBeWaitedForIsLetGoAtOnce) {
  const UniqueFd client(Connect());
  ASSERT_EQ(write(client.Get(), "\0\0", 2), 2) << "a part of a request";
  // Not for what wakes it, for signals, for the listening socket.
  Start({"epoll_ctl", ENOSPC, 3});
  EXPECT_TRUE(IsClosed(client));
  EXPECT_EQ(Ask("another"), "another");
}

TEST_F(ServerTest, AListeningSocketThatCannotBeWaitedForIsTriedAgain) {
  Start({"epoll_ctl", ENOSPC, 2});
  EXPECT_EQ(Ask("one"), "one");
}

TEST_F(ServerTest, AWaitThatIsInterruptedGoesOn) {
  Start({"epoll_wait", EINTR, 0});
  EXPECT_EQ(Ask("one"), "one");
}

TEST_F(ServerTest, WhatARequestLeavesToDoIsDoneThoughNoOtherOneComes) {
  BusyOnceItAnswers handler;
  Start(handler);
  EXPECT_EQ(Ask("one"), "one");
  EXPECT_TRUE(handler.IsDone());
  Signal(SIGTERM);
  Join();
}

TEST_F(ServerTest, AReplyThatIsOnItsWayAtTheEndIsSent) {
  Start();
  const UniqueFd client(Connect());
  ASSERT_TRUE(host::SendFrame(client.Get(), "large"));
  WaitForReply(client);
  Signal(SIGTERM);
  std::string reply;
  EXPECT_TRUE(host::RecvFrame(client.Get(), reply));
  EXPECT_EQ(reply.size(), Echo::kLargeReply);
  Join();
}

TEST_F(ServerTest, AReplyThatCannotBeWaitedForDoesNotHoldUpTheEnd) {
  Start({"poll", EINTR, 0});
  const UniqueFd client(Connect());
  ASSERT_TRUE(host::SendFrame(client.Get(), "large"));
  WaitForReply(client);
  Signal(SIGTERM);
  Join();
  std::string reply;
  EXPECT_FALSE(host::RecvFrame(client.Get(), reply));
  EXPECT_EQ(errno, EPROTO) << "a part of it was there";
}

}  // namespace
}  // namespace searchd
