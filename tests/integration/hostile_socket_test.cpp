// The shipped library where the search daemon's socket is something else, or leads to a daemon that
// takes no connection, or that takes one and says nothing.
#include <dlfcn.h>
#include <fcntl.h>
#include <gmock/gmock.h>
#include <poll.h>
#include <sched.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <sys/un.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <filesystem>
#include <functional>
#include <future>
#include <memory>
#include <ostream>
#include <string>
#include <vector>

#include "appindex/elastic_control.h"
#include "appindex/index_mgr.h"
#include "host/framing.h"
#include "tests/support/controlled_time.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"
#include "tests/support/searchd_process.h"
#include "tests/unit/appindex/error_of.h"

namespace {

// The longest time, in seconds, that a socket was told to wait for room in a listener's queue.
std::atomic<long> g_longest_wait{0};
std::atomic<bool> g_wait_is_over{false};  // such a wait ends at once

}  // namespace

// Sees the waits that the library's client asks for.
extern "C" __attribute__((visibility("default"))) int setsockopt(int fd, int level, int name,
                                                                 const void* value,
                                                                 socklen_t size) noexcept {
  using Function = int(int, int, int, const void*, socklen_t);
  static auto* const real = reinterpret_cast<Function*>(dlsym(RTLD_NEXT, "setsockopt"));
  if (name != SO_SNDTIMEO) return real(fd, level, name, value, size);
  timeval wait{};
  std::memcpy(&wait, value, sizeof(wait));
  if (wait.tv_sec > g_longest_wait) g_longest_wait = wait.tv_sec;
  if (g_wait_is_over && wait.tv_sec > 0) wait = {0, 1};
  return real(fd, level, name, &wait, sizeof(wait));
}

namespace velkor::appindex {
namespace {

using test::ConfOf;
using test::ErrorOf;
using test::Fd;
using test::kSocket;
using test::ScriptedDaemon;
using ::testing::StartsWith;

constexpr long kTenDaysSeconds = 864000;

Fd Listen(int backlog) {
  unlink(kSocket);
  Fd fd(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  const sockaddr_un address = test::SocketAddress(kSocket);
  EXPECT_EQ(bind(fd.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof(address)), 0);
  if (backlog >= 0) {
    EXPECT_EQ(listen(fd.Get(), backlog), 0);
  }
  return fd;
}

// What stands at the socket's path.
struct Place {
  const char* name;
  std::function<void()> make;
  bool there;  // whether the path leads to something
  friend void PrintTo(const Place& place, std::ostream* out) { *out << place.name; }
};

class SocketPlace : public test::DeviceRootTest, public testing::WithParamInterface<Place> {};

TEST_P(SocketPlace, LosesNothingOfTheQueueAndIsUsedOnceItIsADaemons) {
  GetParam().make();
  test::Enqueue(test::Request(1, test::Install("App")));
  const std::string error = ErrorOf([] { ProcessQueue(); });
  if (GetParam().there) {
    EXPECT_THAT(error, StartsWith("913: Connect failed, req="));
    EXPECT_EQ(test::ReadFile(test::kBatch), test::Request(1, ConfOf("App")) + "\n");
  } else {
    EXPECT_EQ(error, "nothing");
    EXPECT_EQ(test::ReadFile(test::kQueue), test::Request(1, ConfOf("App")) + "\n");
  }
  std::filesystem::remove_all(kSocket);
  ScriptedDaemon daemon;
  ProcessQueue();
  EXPECT_EQ(daemon.Commands(), test::AddCommands("App"));
  EXPECT_FALSE(test::Exists(test::kBatch));
}

INSTANTIATE_TEST_SUITE_P(
    , SocketPlace,
    testing::Values(
        Place{"Nothing", [] {}, false},
        Place{"ALinkToNowhere", [] { ASSERT_EQ(symlink("/gone", kSocket), 0); }, false},
        Place{"ALinkToItself", [] { ASSERT_EQ(symlink(kSocket, kSocket), 0); }, false},
        Place{"ASocketThatNobodyHolds", [] { Listen(8); }, true},
        Place{"ASocketThatNobodyListensOn", [] { static const Fd kept = Listen(-1); }, true},
        Place{"ASocketForDatagrams", [] { ASSERT_EQ(symlink("/dev/log", kSocket), 0); }, true},
        Place{"AFile", [] { test::WriteFile(kSocket, R"({"success":true})"); }, true},
        Place{"ADirectory", [] { test::MakeDirs(kSocket); }, true},
        Place{"AFifo", [] { ASSERT_EQ(mkfifo(kSocket, 0666), 0); }, true}),
    [](const auto& param_info) { return param_info.param.name; });

class SilentDaemon : public test::DeviceRootTest {
 protected:
  // The library's call, in a thread of its own.
  static std::future<std::string> Commit() {
    return std::async(std::launch::async,
                      [] { return ErrorOf([] { elastic::IndexCommit("enu"); }); });
  }

  static bool IsOver(const std::future<std::string>& call) {
    return call.wait_for(std::chrono::seconds(0)) == std::future_status::ready;
  }

  // Takes all the room for connections that wait to be accepted.
  void FillBacklog() {
    const sockaddr_un address = test::SocketAddress(kSocket);
    do {
      waiting_.push_back(
          std::make_unique<Fd>(socket(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0)));
    } while (connect(waiting_.back()->Get(), reinterpret_cast<const sockaddr*>(&address),
                     sizeof(address)) == 0);
    EXPECT_EQ(errno, EAGAIN);
    waiting_.pop_back();
  }

  std::vector<std::unique_ptr<Fd>> waiting_;
};

// Accepts until a request comes, and answers it.
void ServeOne(int listener) {
  for (;;) {
    const Fd fd(accept4(listener, nullptr, nullptr, SOCK_CLOEXEC));
    std::string request;
    if (!host::RecvFrame(fd.Get(), request)) continue;  // one that took room only
    EXPECT_TRUE(host::SendFrame(fd.Get(), R"({"success":true})"));
    return;
  }
}

TEST_F(SilentDaemon, RoomForTheConnectionIsWaitedFor) {
  const Fd listener = Listen(0);
  FillBacklog();
  std::future<std::string> call = Commit();
  while (g_longest_wait == 0) sched_yield();  // it has met the full queue
  EXPECT_FALSE(IsOver(call));
  waiting_.clear();
  ServeOne(listener.Get());
  EXPECT_EQ(call.get(), "nothing");
  EXPECT_GT(g_longest_wait, kTenDaysSeconds - 60);
}

TEST_F(SilentDaemon, RoomThatNeverComesIsAFailedConnect) {
  const Fd listener = Listen(0);
  FillBacklog();
  g_wait_is_over = true;
  EXPECT_THAT(Commit().get(), StartsWith("913: Connect failed, req="));
  EXPECT_GT(g_longest_wait, kTenDaysSeconds - 60);
  g_wait_is_over = false;
  waiting_.clear();
  std::future<std::string> call = Commit();
  ServeOne(listener.Get());
  EXPECT_EQ(call.get(), "nothing");
}

TEST_F(SilentDaemon, EndOfADaemonThatNeverAcceptedIsAFailure) {
  auto listener = std::make_unique<Fd>(Listen(8));
  std::future<std::string> call = Commit();
  pollfd waiting = {listener->Get(), POLLIN, 0};
  ASSERT_EQ(poll(&waiting, 1, -1), 1);  // its connection is there
  EXPECT_FALSE(IsOver(call));
  listener.reset();
  EXPECT_THAT(call.get(), StartsWith("913: "));
}

TEST_F(SilentDaemon, AnswerIsWaitedForAndTheEndOfTheDaemonEndsTheWait) {
  std::promise<void> asked;
  std::promise<void> killed;
  ScriptedDaemon daemon([&](const Json::Value&) {
    asked.set_value();
    killed.get_future().wait();
    return test::Reaction{test::Reaction::kHangUp, ""};
  });
  std::future<std::string> call = Commit();
  asked.get_future().wait();
  EXPECT_FALSE(IsOver(call));
  killed.set_value();
  EXPECT_THAT(call.get(), StartsWith("913: Recv failed, req="));
}

TEST_F(SilentDaemon, SilenceInTheMiddleOfAReplyIsWaitedThrough) {
  const Fd listener = Listen(8);
  std::future<std::string> call = Commit();
  const Fd peer(accept4(listener.Get(), nullptr, nullptr, SOCK_CLOEXEC));
  std::string request;
  ASSERT_TRUE(host::RecvFrame(peer.Get(), request));
  const std::string text = R"({"success":true})";
  const std::string frame = host::FrameHeader(text.size()) + text;
  for (std::size_t at = 0; at < frame.size(); ++at) {
    EXPECT_FALSE(IsOver(call)) << at;
    ASSERT_EQ(send(peer.Get(), &frame[at], 1, MSG_NOSIGNAL), 1);
  }
  EXPECT_EQ(call.get(), "nothing");
}

}  // namespace
}  // namespace velkor::appindex
