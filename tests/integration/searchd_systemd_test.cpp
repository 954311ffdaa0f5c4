// The search daemon under a service manager: what it says to it, and a socket that it is given. The
// test stands in for the manager.
#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <time.h>
#include <unistd.h>

#include <csignal>
#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "host/framing.h"
#include "tests/support/datagram_socket.h"
#include "tests/support/searchd_test.h"

namespace test {
namespace {

namespace fs = std::filesystem;

constexpr int kFirstHandedOver = 3;

// In the process that is to become the daemon: `sockets` are handed over to it.
void HandOver(const std::vector<int>& sockets) {
  // Out of the way first, as one may have the number that another needs.
  std::vector<int> copies;
  for (const int fd : sockets) copies.push_back(fcntl(fd, F_DUPFD_CLOEXEC, 100));
  for (std::size_t i = 0; i < copies.size(); ++i) {
    dup2(copies[i], kFirstHandedOver + static_cast<int>(i));
  }
  setenv("LISTEN_FDS", std::to_string(sockets.size()).c_str(), 1);
  setenv("LISTEN_PID", std::to_string(getpid()).c_str(), 1);
}

class SearchdSystemd : public SearchdTest {
 protected:
  // A listening socket at the place of the daemon's.
  Fd Listener(int type = SOCK_STREAM) const {
    fs::create_directories(root_ / "var/run");
    Fd fd(socket(AF_UNIX, type | SOCK_CLOEXEC, 0));
    const sockaddr_un address = SocketAddress(Socket());
    EXPECT_EQ(bind(fd.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof(address)), 0);
    return fd;
  }

  void ExpectRefused(const std::vector<int>& sockets, const std::string& why) const {
    ExpectRefused([&] { HandOver(sockets); }, why);
  }
  void ExpectRefused(const std::function<void()>& hand_over, const std::string& why) const {
    const auto process = Launch({}, hand_over);
    EXPECT_FALSE(process->IsReady());
    const SearchdProcess::Result result = process->Wait();
    EXPECT_EQ(result.status, 1);
    EXPECT_NE(result.error_text.find("socket activation: "), std::string::npos)
        << result.error_text;
    EXPECT_NE(result.error_text.find(why), std::string::npos) << result.error_text;
  }
};

ino_t InodeOf(const fs::path& path) {
  struct stat status {};
  return lstat(path.c_str(), &status) == 0 ? status.st_ino : 0;
}

std::int64_t NowMicroseconds() {
  timespec now{};
  clock_gettime(CLOCK_MONOTONIC, &now);
  return std::int64_t{now.tv_sec} * 1000000 + now.tv_nsec / 1000;
}

TEST_F(SearchdSystemd, IsToldOfTheStartReloadsAndTheEnd) {
  fs::create_directories(root_ / "run");
  DatagramSocket manager(root_ / "run/notify");
  daemon_ = Launch({}, [] { setenv("NOTIFY_SOCKET", "/run/notify", 1); });
  ASSERT_TRUE(daemon_->IsReady());
  EXPECT_EQ(manager.ReadUntil("READY"), std::vector<std::string>{"READY=1"});

  const std::int64_t before = NowMicroseconds();
  kill(daemon_->Pid(), SIGHUP);
  const std::vector<std::string> reload = manager.ReadUntil("READY=1");
  ASSERT_EQ(reload.size(), 2U);
  const std::string begin = "RELOADING=1\nMONOTONIC_USEC=";
  ASSERT_EQ(reload[0].rfind(begin, 0), 0U) << reload[0];
  const std::int64_t when = std::stoll(reload[0].substr(begin.size()));
  EXPECT_GE(when, before);
  EXPECT_LE(when, NowMicroseconds());
  EXPECT_EQ(reload[1], "READY=1");

  EXPECT_EQ(daemon_->Stop(SIGTERM).status, 0);
  EXPECT_EQ(manager.ReadUntil("STOPPING"), std::vector<std::string>{"STOPPING=1"});
}

TEST_F(SearchdSystemd, MayHandOverTheSocket) {
  const Fd listener = Listener();
  ASSERT_EQ(listen(listener.Get(), 10), 0);
  const ino_t inode = InodeOf(Socket());
  // Whoever connects before the daemon is there waits for it.
  const Fd early = Connect(Socket());
  ASSERT_TRUE(host::SendFrame(early.Get(), ToText(IdRequest("index_list", ""))));
  daemon_ = Launch({}, [&] { HandOver({listener.Get()}); });
  ASSERT_TRUE(daemon_->IsReady());
  std::string reply;
  ASSERT_TRUE(host::RecvFrame(early.Get(), reply));
  EXPECT_EQ(CodeOf(FromText(reply)), 0) << reply;
  Fill("enu");
  EXPECT_EQ(Find("enu", "file"), "files");
  EXPECT_EQ(InodeOf(Socket()), inode) << "not replaced at the start";

  EXPECT_EQ(daemon_->Stop(SIGTERM).status, 0);
  EXPECT_EQ(InodeOf(Socket()), inode) << "nor removed at the end";
  daemon_ = Launch({}, [&] { HandOver({listener.Get()}); });
  EXPECT_EQ(Find("enu", "file"), "files");
}

TEST_F(SearchdSystemd, MayStartItInTheBackgroundWithASocket) {
  if (!MayGoToTheBackground()) GTEST_SKIP() << "needs root with ThreadSanitizer";
  const Fd listener = Listener();
  ASSERT_EQ(listen(listener.Get(), 10), 0);
  SearchdProcess start({"--root", root_}, false, [&] { HandOver({listener.Get()}); });
  EXPECT_EQ(start.Wait().status, 0);
  Fill("enu");
  StopBackground();
}

TEST_F(SearchdSystemd, IsRefusedAWrongSocket) {
  const Fd not_listening = Listener();
  ExpectRefused({not_listening.Get()}, "descriptor 3 is not a Unix stream socket that listens");
  fs::remove(Socket());
  const Fd datagrams = Listener(SOCK_DGRAM);
  ExpectRefused({datagrams.Get()}, "descriptor 3 is not a Unix stream socket that listens");
  const Fd internet(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
  ASSERT_EQ(listen(internet.Get(), 1), 0);
  ExpectRefused({internet.Get()}, "descriptor 3 is not a Unix stream socket that listens");
  const Fd file(open("/dev/null", O_RDWR | O_CLOEXEC));
  ExpectRefused({file.Get()}, "descriptor 3");
}

TEST_F(SearchdSystemd, IsRefusedSeveralSockets) {
  const Fd listener = Listener();
  ASSERT_EQ(listen(listener.Get(), 10), 0);
  ExpectRefused({listener.Get(), listener.Get()}, "2 sockets were handed over, there must be one");
}

TEST_F(SearchdSystemd, IsRefusedANumberOfSocketsThatIsNone) {
  ExpectRefused(
      [] {
        setenv("LISTEN_FDS", "some", 1);
        setenv("LISTEN_PID", std::to_string(getpid()).c_str(), 1);
      },
      "LISTEN_FDS: Invalid argument");
}

TEST_F(SearchdSystemd, IsIgnoredWhenItMeansAnotherProcess) {
  daemon_ = Launch({}, [] {
    setenv("LISTEN_FDS", "1", 1);
    setenv("LISTEN_PID", "1", 1);
  });
  ASSERT_TRUE(daemon_->IsReady());
  Fill("enu");
}

}  // namespace
}  // namespace test
