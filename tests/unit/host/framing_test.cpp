#include "host/framing.h"

#include <gtest/gtest.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <future>
#include <string>
#include <thread>

namespace {

using namespace std::string_literals;

// Expects that a peer which sends these bytes and closes has sent no message.
void ExpectBroken(const std::string& bytes, int error) {
  int ends[2] = {-1, -1};
  ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends), 0);
  ASSERT_EQ(write(ends[1], bytes.data(), bytes.size()), static_cast<ssize_t>(bytes.size()));
  close(ends[1]);
  std::string received = "before";
  EXPECT_FALSE(host::RecvFrame(ends[0], received)) << bytes.size();
  EXPECT_EQ(errno, error);
  EXPECT_EQ(received, "");
  close(ends[0]);
}

class FramingTest : public testing::Test {
 protected:
  FramingTest() {
    int ends[2] = {-1, -1};
    EXPECT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends), 0);
    near_ = ends[0];
    far_ = ends[1];
  }
  ~FramingTest() override {
    close(near_);
    CloseFar();
  }

  void CloseFar() {
    if (far_ != -1) close(far_);
    far_ = -1;
  }
  void WriteRaw(const std::string& bytes) const {
    ASSERT_EQ(send(far_, bytes.data(), bytes.size(), MSG_NOSIGNAL),
              static_cast<ssize_t>(bytes.size()));
  }

  int near_ = -1;
  int far_ = -1;
};

TEST_F(FramingTest, AFrameIsTheLengthInFourBytesBigEndianAndTheBytes) {
  ASSERT_TRUE(host::SendFrame(near_, std::string(0x0102, 'x')));
  std::string bytes(2000, '\0');
  const ssize_t n = recv(far_, bytes.data(), bytes.size(), 0);
  ASSERT_EQ(n, 4 + 0x0102);
  bytes.resize(static_cast<std::size_t>(n));
  EXPECT_EQ(bytes, "\x00\x00\x01\x02"s + std::string(0x0102, 'x'));
}

TEST_F(FramingTest, AMessageArrivesAsItWasSent) {
  const std::string message = "{\"title\":\"\xC3\xA4\"}\0\n"s;
  ASSERT_TRUE(host::SendFrame(near_, message));
  std::string received = "what was there before";
  ASSERT_TRUE(host::RecvFrame(far_, received));
  EXPECT_EQ(received, message);
}

TEST_F(FramingTest, AnEmptyMessageIsAMessage) {
  ASSERT_TRUE(host::SendFrame(near_, ""));
  std::string received = "before";
  ASSERT_TRUE(host::RecvFrame(far_, received));
  EXPECT_EQ(received, "");
}

TEST_F(FramingTest, MessagesSentTogetherAreReceivedOneByOne) {
  WriteRaw("\0\0\0\3one\0\0\0\5three"s);
  std::string ahead;
  std::string received;
  ASSERT_TRUE(host::RecvFrame(near_, ahead, received));
  EXPECT_EQ(received, "one");
  ASSERT_TRUE(host::RecvFrame(near_, ahead, received));
  EXPECT_EQ(received, "three");
  EXPECT_EQ(ahead, "");
}

TEST_F(FramingTest, AFrameMayArriveByteByByte) {
  std::string received;
  auto receiving = std::async(std::launch::async, [&] { return host::RecvFrame(near_, received); });
  for (const char byte : "\0\0\0\6pieces"s) {
    WriteRaw(std::string(1, byte));
    std::this_thread::yield();
  }
  EXPECT_TRUE(receiving.get());
  EXPECT_EQ(received, "pieces");
}

TEST_F(FramingTest, TheLongestMessageGoesThrough) {
  const std::string message(host::kMaxFrameBytes, 'm');
  auto sending = std::async(std::launch::async, [&] { return host::SendFrame(far_, message); });
  std::string received;
  EXPECT_TRUE(host::RecvFrame(near_, received));
  EXPECT_TRUE(sending.get());
  EXPECT_TRUE(received == message);
}

TEST_F(FramingTest, ALongerMessageIsRefusedBeforeAByteIsSent) {
  EXPECT_FALSE(host::SendFrame(far_, std::string(host::kMaxFrameBytes + 1, 'm')));
  EXPECT_EQ(errno, EMSGSIZE);
  char byte = 0;
  EXPECT_EQ(recv(near_, &byte, 1, MSG_DONTWAIT), -1);
}

TEST_F(FramingTest, AnAnnouncedLengthOverTheLimitIsAnError) {
  for (const std::string& header : {"\x01\x00\x00\x01"s, "\xFF\xFF\xFF\xFF"s})
    ExpectBroken(header, EMSGSIZE);
}

TEST_F(FramingTest, APeerThatClosesBetweenMessagesIsNoErrorOfTheSystem) {
  CloseFar();
  errno = EIO;
  std::string received = "before";
  EXPECT_FALSE(host::RecvFrame(near_, received));
  EXPECT_EQ(errno, 0);
  EXPECT_EQ(received, "");
}

TEST_F(FramingTest, APeerThatClosesInsideAFrameIsAProtocolError) {
  for (const std::string& torn : {"\0"s, "\0\0\0"s, "\0\0\0\5"s, "\0\0\0\5four"s})
    ExpectBroken(torn, EPROTO);
}

// SIGPIPE is not caught or ignored here: if it were raised, the test program would end.
TEST_F(FramingTest, APeerThatIsGoneMakesSendFailWithoutASignal) {
  CloseFar();
  EXPECT_FALSE(host::SendFrame(near_, "anyone?"));
  EXPECT_EQ(errno, EPIPE);
}

TEST_F(FramingTest, AFailingSocketIsReported) {
  std::string received = "before";
  EXPECT_FALSE(host::RecvFrame(-1, received));
  EXPECT_EQ(errno, EBADF);
  EXPECT_EQ(received, "");
  EXPECT_FALSE(host::SendFrame(-1, "text"));
  EXPECT_EQ(errno, EBADF);
}

}  // namespace
