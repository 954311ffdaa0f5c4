#include "device/tovodaemon.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sched.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <sys/un.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <climits>
#include <cstring>
#include <functional>
#include <future>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "host/framing.h"
#include "tests/unit/host/temp_dir.h"

namespace {

constexpr long kTenDays = 864000;

// Lets a test look at the descriptor.
class Connection : public tovodaemon::DomainSockConnection {
 public:
  using DomainSockConnection::DomainSockConnection;
  int Fd() const { return fd_; }
};

sockaddr_un AddressOf(const std::string& path) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::memcpy(address.sun_path, path.c_str(), path.size());
  return address;
}

class Socket {
 public:
  explicit Socket(int type) : fd_(socket(AF_UNIX, type | SOCK_CLOEXEC, 0)) { EXPECT_NE(fd_, -1); }
  ~Socket() { close(fd_); }
  Socket(const Socket&) = delete;
  Socket& operator=(const Socket&) = delete;

  int Fd() const { return fd_; }
  void Bind(const std::string& path) const {
    const sockaddr_un address = AddressOf(path);
    EXPECT_EQ(bind(fd_, reinterpret_cast<const sockaddr*>(&address), sizeof(address)), 0);
  }
  int ConnectTo(const std::string& path) const {
    const sockaddr_un address = AddressOf(path);
    return connect(fd_, reinterpret_cast<const sockaddr*>(&address), sizeof(address));
  }

 private:
  int fd_;
};

class DomainSockConnectionTest : public testing::Test {
 protected:
  DomainSockConnectionTest() : path_(dir_ / "daemon.sock"), listener_(SOCK_STREAM) {
    listener_.Bind(path_);
  }

  void Listen(int backlog = 8) const { ASSERT_EQ(listen(listener_.Fd(), backlog), 0); }

  // The daemon's end of the next connection; the caller closes it.
  int Accept() const {
    const int fd = accept4(listener_.Fd(), nullptr, nullptr, SOCK_CLOEXEC);
    EXPECT_NE(fd, -1);
    return fd;
  }

  // Takes all the room for connections that wait to be accepted, and returns how many it took.
  int FillBacklog() {
    for (;;) {
      waiting_.push_back(std::make_unique<Socket>(SOCK_STREAM | SOCK_NONBLOCK));
      if (waiting_.back()->ConnectTo(path_) != 0) {
        EXPECT_EQ(errno, EAGAIN);
        return static_cast<int>(waiting_.size()) - 1;
      }
    }
  }

  const TempDir dir_;
  const std::string path_;
  const Socket listener_;
  std::vector<std::unique_ptr<Socket>> waiting_;
};

// True when the peer of `fd` has closed its end.
bool PeerHasClosed(int fd) {
  char byte = 0;
  return recv(fd, &byte, 1, MSG_DONTWAIT) == 0;
}

TEST_F(DomainSockConnectionTest, CarriesAMessageEachWay) {
  Listen();
  std::thread daemon([this] {
    const int fd = Accept();
    std::string request;
    EXPECT_TRUE(host::RecvFrame(fd, request));
    EXPECT_TRUE(host::SendFrame(fd, "reply to " + request));
    close(fd);
  });
  Connection connection(path_);
  EXPECT_TRUE(connection.Connect(kTenDays));
  EXPECT_TRUE(connection.Send("request"));
  std::string reply;
  EXPECT_TRUE(connection.Recv(reply));
  EXPECT_EQ(reply, "reply to request");
  daemon.join();
}

TEST_F(DomainSockConnectionTest, MessagesThatArriveTogetherAreReceivedOneByOne) {
  Listen();
  Connection connection(path_);
  ASSERT_TRUE(connection.Connect(kTenDays));
  const int daemon = Accept();
  const std::string both("\0\0\0\3one\0\0\0\5three", 16);
  ASSERT_EQ(write(daemon, both.data(), both.size()), static_cast<ssize_t>(both.size()));
  std::string message;
  EXPECT_TRUE(connection.Recv(message));
  EXPECT_EQ(message, "one");
  EXPECT_TRUE(connection.Recv(message));
  EXPECT_EQ(message, "three");
  close(daemon);
}

TEST_F(DomainSockConnectionTest, WhatOneConnectionHasReceivedIsNotTheNextOnes) {
  Listen();
  Connection connection(path_);
  ASSERT_TRUE(connection.Connect(kTenDays));
  const int first = Accept();
  const std::string half("\0\0\0\3one\0\0\0\5thr", 14);
  ASSERT_EQ(write(first, half.data(), half.size()), static_cast<ssize_t>(half.size()));
  std::string message;
  EXPECT_TRUE(connection.Recv(message));
  ASSERT_TRUE(connection.Connect(kTenDays));
  const int second = Accept();
  ASSERT_TRUE(host::SendFrame(second, "another"));
  EXPECT_TRUE(connection.Recv(message));
  EXPECT_EQ(message, "another");
  close(first);
  close(second);
}

TEST_F(DomainSockConnectionTest, AnyTimeOutWillDoWhenTheDaemonListens) {
  Listen(64);
  for (const long timeout : {kTenDays, 1L, 0L, -1L, LONG_MAX, LONG_MIN}) {
    Connection connection(path_);
    EXPECT_TRUE(connection.Connect(timeout)) << timeout;
  }
}

TEST_F(DomainSockConnectionTest, ConnectingLeavesErrnoAlone) {
  Listen();
  Connection connection(path_);
  errno = 0;
  EXPECT_TRUE(connection.Connect(kTenDays));
  EXPECT_EQ(errno, 0);
}

TEST_F(DomainSockConnectionTest, TheDescriptorIsClosedOnExec) {
  Listen();
  Connection connection(path_);
  ASSERT_TRUE(connection.Connect(kTenDays));
  EXPECT_EQ(fcntl(connection.Fd(), F_GETFD), FD_CLOEXEC);
}

TEST_F(DomainSockConnectionTest, SendingHasNoTimeOut) {
  Listen();
  Connection connection(path_);
  ASSERT_TRUE(connection.Connect(kTenDays));
  timeval time{1, 1};
  socklen_t size = sizeof(time);
  ASSERT_EQ(getsockopt(connection.Fd(), SOL_SOCKET, SO_SNDTIMEO, &time, &size), 0);
  EXPECT_EQ(time.tv_sec, 0);
  EXPECT_EQ(time.tv_usec, 0);
}

TEST_F(DomainSockConnectionTest, ConnectGivesUpWhenTheDaemonTakesNoConnections) {
  Listen(0);
  FillBacklog();
  for (const long timeout : {0L, -1L, LONG_MIN}) {
    Connection connection(path_);
    EXPECT_FALSE(connection.Connect(timeout));
    EXPECT_EQ(errno, ETIMEDOUT);
    EXPECT_EQ(connection.Fd(), -1);
  }
}

TEST_F(DomainSockConnectionTest, NobodyListening) {
  Connection connection(path_);
  EXPECT_FALSE(connection.Connect(kTenDays));
  EXPECT_EQ(errno, ECONNREFUSED);
  EXPECT_EQ(connection.Fd(), -1);
}

TEST_F(DomainSockConnectionTest, NoSocketFile) {
  Connection connection(dir_ / "absent");
  EXPECT_FALSE(connection.Connect(kTenDays));
  EXPECT_EQ(errno, ENOENT);
}

TEST_F(DomainSockConnectionTest, ASocketOfAnotherTypeIsRefused) {
  const Socket datagrams(SOCK_DGRAM);
  datagrams.Bind(dir_ / "log");
  Connection connection(dir_ / "log");
  EXPECT_FALSE(connection.Connect(kTenDays));
  EXPECT_EQ(errno, EPROTOTYPE);
}

TEST_F(DomainSockConnectionTest, APathThatNoSocketCanHaveIsRefused) {
  Connection too_long(std::string(sizeof(sockaddr_un::sun_path), 'p'));
  EXPECT_FALSE(too_long.Connect(kTenDays));
  EXPECT_EQ(errno, ENAMETOOLONG);
  for (const std::string& path : {std::string(), std::string("\0abstract", 9), path_ + '\0'}) {
    Connection connection(path);
    EXPECT_FALSE(connection.Connect(kTenDays));
    EXPECT_EQ(errno, EINVAL);
  }
}

TEST_F(DomainSockConnectionTest, AFailedConnectLeavesNoDescriptor) {
  const std::size_t before = OpenDescriptors();
  Connection connection(path_);
  EXPECT_FALSE(connection.Connect(kTenDays));
  EXPECT_EQ(OpenDescriptors(), before);
}

TEST_F(DomainSockConnectionTest, NothingIsSentOrReceivedUnlessConnected) {
  Connection connection(path_);
  EXPECT_FALSE(connection.Send("text"));
  EXPECT_EQ(errno, ENOTCONN);
  std::string message = "before";
  errno = 0;
  EXPECT_FALSE(connection.Recv(message));
  EXPECT_EQ(errno, ENOTCONN);
  EXPECT_EQ(message, "");
}

TEST_F(DomainSockConnectionTest, DisconnectClosesAndMayBeRepeated) {
  Listen();
  Connection connection(path_);
  ASSERT_TRUE(connection.Connect(kTenDays));
  const int daemon_end = Accept();
  EXPECT_FALSE(PeerHasClosed(daemon_end));
  connection.Disconnect();
  EXPECT_EQ(connection.Fd(), -1);
  EXPECT_TRUE(PeerHasClosed(daemon_end));
  connection.Disconnect();
  EXPECT_EQ(connection.Fd(), -1);
  close(daemon_end);
}

TEST_F(DomainSockConnectionTest, TheDestructorCloses) {
  Listen();
  int daemon_end = -1;
  {
    Connection connection(path_);
    ASSERT_TRUE(connection.Connect(kTenDays));
    daemon_end = Accept();
  }
  EXPECT_TRUE(PeerHasClosed(daemon_end));
  close(daemon_end);
}

TEST_F(DomainSockConnectionTest, ConnectingAgainClosesTheFirstConnection) {
  Listen();
  Connection connection(path_);
  ASSERT_TRUE(connection.Connect(kTenDays));
  const int first = Accept();
  ASSERT_TRUE(connection.Connect(kTenDays));
  const int second = Accept();
  EXPECT_TRUE(PeerHasClosed(first));
  EXPECT_FALSE(PeerHasClosed(second));
  close(first);
  close(second);
}

TEST_F(DomainSockConnectionTest, ADaemonThatGoesAwayIsAFailureWithoutASignal) {
  Listen();
  Connection connection(path_);
  ASSERT_TRUE(connection.Connect(kTenDays));
  close(Accept());
  EXPECT_FALSE(connection.Send("request"));
  EXPECT_EQ(errno, EPIPE);
  std::string reply = "before";
  EXPECT_FALSE(connection.Recv(reply));
  EXPECT_EQ(reply, "");
}

// Interrupts a thread that waits in a call, with a handler that does not restart calls.
class Interruption {
 public:
  Interruption() {
    struct sigaction action {};
    action.sa_handler = [](int) { ++handled; };
    EXPECT_EQ(sigaction(SIGUSR1, &action, &before_), 0);
  }
  ~Interruption() { sigaction(SIGUSR1, &before_, nullptr); }
  Interruption(const Interruption&) = delete;
  Interruption& operator=(const Interruption&) = delete;

  // Runs `call`, which has to wait until `release` has been called, in a thread; interrupts it
  // there twice, then calls `release`. Returns what `call` returns.
  bool Interrupt(const std::function<bool()>& call, const std::function<void()>& release) {
    bool result = false;
    std::thread thread([&] {
      tid_ = gettid();
      result = call();
      returned_ = true;
    });
    while (tid_ == 0) sched_yield();
    for (int time = 0; time < 2; ++time) {
      AwaitWaiting();
      const int before = handled;
      tgkill(getpid(), tid_, SIGUSR1);
      while (handled == before && !returned_) sched_yield();
    }
    AwaitWaiting();
    EXPECT_FALSE(returned_) << "the interrupted call gave up";
    if (!returned_) release();
    thread.join();
    return result;
  }

 private:
  // Returns when the kernel shows the thread as sleeping, or when the call is over.
  void AwaitWaiting() const {
    const std::string path = "/proc/self/task/" + std::to_string(tid_) + "/stat";
    while (!returned_) {
      const std::string stat = ReadFile(path);
      const std::size_t name_end = stat.rfind(") ");
      ASSERT_NE(name_end, std::string::npos);
      if (stat[name_end + 2] == 'S') return;
      sched_yield();
    }
  }

  std::atomic<pid_t> tid_{0};
  std::atomic<bool> returned_{false};
  static std::atomic<int> handled;
  struct sigaction before_ {};
};

std::atomic<int> Interruption::handled{0};

TEST_F(DomainSockConnectionTest, AnInterruptedConnectGoesOnWaiting) {
  Listen(0);
  const int waiting = FillBacklog();
  Connection connection(path_);
  const auto connect_unnoticed = [&] {
    errno = 0;
    return connection.Connect(kTenDays) && errno == 0;
  };
  const auto make_room = [&] {
    for (int i = 0; i < waiting; ++i) close(Accept());
  };
  ASSERT_TRUE(Interruption().Interrupt(connect_unnoticed, make_room));
  const int daemon_end = Accept();
  EXPECT_TRUE(connection.Send("request"));
  std::string request;
  EXPECT_TRUE(host::RecvFrame(daemon_end, request));
  EXPECT_EQ(request, "request");
  close(daemon_end);
}

TEST_F(DomainSockConnectionTest, AnInterruptedRecvGoesOnWaiting) {
  Listen();
  Connection connection(path_);
  ASSERT_TRUE(connection.Connect(kTenDays));
  const int daemon_end = Accept();
  std::string reply;
  EXPECT_TRUE(Interruption().Interrupt([&] { return connection.Recv(reply); },
                                       [&] { EXPECT_TRUE(host::SendFrame(daemon_end, "reply")); }));
  EXPECT_EQ(reply, "reply");
  close(daemon_end);
}

TEST_F(DomainSockConnectionTest, AnInterruptedSendLosesNothing) {
  Listen();
  Connection connection(path_);
  ASSERT_TRUE(connection.Connect(kTenDays));
  const int daemon_end = Accept();
  std::string message;
  for (int i = 0; message.size() < host::kMaxFrameBytes / 2; ++i) message += std::to_string(i);
  std::string received;
  ASSERT_TRUE(
      Interruption().Interrupt([&] { return connection.Send(message); },
                               [&] { EXPECT_TRUE(host::RecvFrame(daemon_end, received)); }));
  EXPECT_TRUE(received == message);
  close(daemon_end);
}

}  // namespace
