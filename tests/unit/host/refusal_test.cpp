// Reading files and talking to the daemon where the system interrupts or refuses a call.
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <optional>
#include <string>

#include "device/tovodaemon.h"
#include "host/framing.h"
#include "host/sdk/regular_file.h"
#include "host/sdk/unique_fd.h"
#include "tests/unit/host/faults.h"
#include "tests/unit/host/temp_dir.h"

namespace {

using host::sdk::ReadRegularFile;

class RefusalTest : public testing::Test {
 protected:
  const TempDir dir_;
  const FaultScope no_faults_;
};

TEST_F(RefusalTest, AnInterruptedReadGoesOn) {
  const std::string file = dir_.Write("file", "content");
  faults.read.Arm(EINTR);
  EXPECT_EQ(ReadRegularFile(file, 100), "content");
}

TEST_F(RefusalTest, AReadThatFailsIsAFailure) {
  const std::string file = dir_.Write("file", "content");
  faults.read.Arm(EIO);
  EXPECT_EQ(ReadRegularFile(file, 100), std::nullopt);
  EXPECT_EQ(errno, EIO);
}

TEST_F(RefusalTest, AFileThatCannotBeOpenedIsAFailure) {
  const std::string file = dir_.Write("file", "content");
  faults.open.Arm(EMFILE);
  EXPECT_EQ(ReadRegularFile(file, 100), std::nullopt);
  EXPECT_EQ(errno, EMFILE);
}

// The system's own files tell no size before they are read.
TEST_F(RefusalTest, AFileThatHoldsMoreThanItsSizeIsHeldToTheLimitToo) {
  ASSERT_TRUE(ReadRegularFile("/proc/self/status", 100000).has_value());
  EXPECT_EQ(ReadRegularFile("/proc/self/status", 10), std::nullopt);
  EXPECT_EQ(errno, EFBIG);
}

TEST_F(RefusalTest, ANameThatHoldsNulIsNoFile) {
  const std::string file = dir_.Write("file", "content");
  EXPECT_EQ(ReadRegularFile(file + std::string("\0.conf", 6), 100), std::nullopt);
  EXPECT_EQ(errno, ENOENT);
}

class FrameRefusalTest : public RefusalTest {
 protected:
  FrameRefusalTest() { EXPECT_EQ(socketpair(AF_UNIX, SOCK_STREAM, 0, ends_.data()), 0); }
  ~FrameRefusalTest() override {
    for (const int fd : ends_) close(fd);
  }

  std::array<int, 2> ends_{};
};

TEST_F(FrameRefusalTest, InterruptedCallsGoOn) {
  faults.send.Arm(EINTR);
  EXPECT_TRUE(host::SendFrame(ends_[0], "message"));
  faults.recv.Arm(EINTR);
  std::string message;
  EXPECT_TRUE(host::RecvFrame(ends_[1], message));
  EXPECT_EQ(message, "message");
}

TEST_F(FrameRefusalTest, CallsThatFailAreFailures) {
  faults.send.Arm(ENOBUFS);
  EXPECT_FALSE(host::SendFrame(ends_[0], "message"));
  EXPECT_EQ(errno, ENOBUFS);
  // At first, in the header, and behind it.
  const std::string frame = host::FrameHeader(7) + "message";
  for (const std::size_t arrived : {0u, 3u, 4u}) {
    ASSERT_EQ(send(ends_[0], frame.data(), arrived, 0), static_cast<ssize_t>(arrived));
    faults.recv.Arm(ECONNRESET, arrived == 0 ? 0 : 1);
    std::string message = "before";
    EXPECT_FALSE(host::RecvFrame(ends_[1], message));
    EXPECT_EQ(errno, ECONNRESET);
    EXPECT_EQ(message, "");
  }
}

// A daemon's socket that takes connections and does nothing with them.
class ConnectRefusalTest : public RefusalTest {
 protected:
  ConnectRefusalTest() : listener_(socket(AF_UNIX, SOCK_STREAM, 0)) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    path_.copy(address.sun_path, sizeof(address.sun_path) - 1);
    EXPECT_EQ(bind(listener_.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof(address)),
              0);
    EXPECT_EQ(listen(listener_.Get(), 8), 0);
  }

  // Expects a failure that leaves nothing open and does not spoil the next attempt.
  void ExpectFailure(int error) {
    const std::size_t open_before = OpenDescriptors();
    tovodaemon::DomainSockConnection connection(path_);
    errno = 0;
    EXPECT_FALSE(connection.Connect(10));
    EXPECT_EQ(errno, error);
    EXPECT_EQ(OpenDescriptors(), open_before);
    faults = Faults();
    EXPECT_TRUE(connection.Connect(10));
  }

  const std::string path_ = dir_ / "socket";
  const host::sdk::UniqueFd listener_;
};

TEST_F(ConnectRefusalTest, NoSocketIsAFailure) {
  faults.socket.Arm(EMFILE);
  ExpectFailure(EMFILE);
}

TEST_F(ConnectRefusalTest, ADaemonThatMayNotBeReachedIsAFailure) {
  faults.connect.Arm(EACCES);
  ExpectFailure(EACCES);
}

TEST_F(ConnectRefusalTest, AWaitThatCannotBeBoundedIsAFailure) {
  faults.connect.Arm(EAGAIN);  // no room yet
  faults.setsockopt.Arm(ENOMEM);
  ExpectFailure(ENOMEM);
}

TEST_F(ConnectRefusalTest, AWaitThatEndsInAFailureIsOne) {
  faults.connect.Arm(EAGAIN, 0, 1);
  faults.setsockopt.Arm(ENOMEM, 1);  // when it has connected
  ExpectFailure(ENOMEM);
}

TEST_F(ConnectRefusalTest, ASocketThatCannotBeMadeToWaitIsAFailure) {
  faults.fcntl.Arm(EINVAL);  // with room at once
  ExpectFailure(EINVAL);
  faults.connect.Arm(EAGAIN);
  faults.fcntl.Arm(EINVAL);  // when there is none yet
  ExpectFailure(EINVAL);
}

TEST_F(ConnectRefusalTest, NoRoomWithinTheTimeIsATimeOut) {
  faults.connect.Arm(EAGAIN, 0, 2);
  ExpectFailure(ETIMEDOUT);
}

TEST_F(ConnectRefusalTest, ADaemonThatEndsWhileItIsWaitedForIsAFailure) {
  faults.connect.ArmEach({EAGAIN, ECONNREFUSED});
  ExpectFailure(ECONNREFUSED);
}

TEST_F(ConnectRefusalTest, AWaitThatIsInterruptedWhenItsTimeIsOverIsATimeOut) {
  faults.connect.ArmEach({EAGAIN, EINTR});
  tovodaemon::DomainSockConnection connection(path_);
  EXPECT_FALSE(connection.Connect(0));
  EXPECT_EQ(errno, ETIMEDOUT);
}

}  // namespace
