// The daemon as a process, where the system refuses what it asks for.
#include "host/searchd/process.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/file.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstring>
#include <functional>
#include <ostream>
#include <string>

#include "host/sdk/unique_fd.h"
#include "host/searchd/check_process.h"
#include "host/searchd/durable_file.h"
#include "host/searchd/handler.h"
#include "host/searchd/request_error.h"
#include "host/searchd/server.h"
#include "tests/unit/host/temp_dir.h"
#include "tests/unit/searchd/failing_calls.h"

namespace searchd {
namespace {

using host::sdk::UniqueFd;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

// What the call throws; empty when it throws nothing.
std::string MessageOf(const std::function<void()>& call) {
  try {
    call();
  } catch (const std::exception& e) {
    return e.what();
  }
  return "";
}

class ProcessTest : public ::testing::Test {
 protected:
  ~ProcessTest() override { failing_call = {}; }

  const TempDir dir_;
  const std::string file_ = dir_ / "it";
};

// A function of the system that refuses, and why.
struct Refusal {
  const char* call;
  int error;
  int spared = 0;
};

void PrintTo(const Refusal& refusal, std::ostream* out) {
  *out << refusal.call << ": " << std::strerror(refusal.error);
}

std::string NameOf(const ::testing::TestParamInfo<Refusal>& refusal) {
  return std::string(refusal.param.call) + "_" + std::to_string(refusal.param.spared);
}

class RefusedTest : public ProcessTest, public ::testing::WithParamInterface<Refusal> {
 protected:
  // Makes the system refuse, and expects that the call says so and leaves nothing open.
  void ExpectFailure(const std::function<void()>& call) {
    const std::size_t open_before = OpenDescriptors();
    failing_call = {GetParam().call, GetParam().error, GetParam().spared};
    EXPECT_THAT(MessageOf(call), HasSubstr(std::strerror(GetParam().error)));
    EXPECT_EQ(failing_call.name, "") << "it was not called";
    EXPECT_EQ(OpenDescriptors(), open_before);
  }
};

TEST_F(ProcessTest, ALockIsHeldAsLongAsItsObjectLives) {
  {
    const ProcessLock lock(file_);
    EXPECT_EQ(ReadFile(file_), std::to_string(getpid()));
    try {
      const ProcessLock second(file_);
      ADD_FAILURE() << "the lock is held twice";
    } catch (const AlreadyRunning& e) {
      EXPECT_THAT(e.what(), HasSubstr("process " + std::to_string(getpid())));
    }
  }
  EXPECT_EQ(MessageOf([&] { const ProcessLock lock(file_); }), "");
}

TEST_F(ProcessTest, AHolderThatHasNotWrittenItsNumberIsUnknown) {
  const UniqueFd holder(open(file_.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600));
  ASSERT_EQ(flock(holder.Get(), LOCK_EX), 0);
  EXPECT_THAT(MessageOf([&] { const ProcessLock lock(file_); }), HasSubstr("process unknown"));
}

TEST_F(ProcessTest, ALockFileThatIsALinkOrADirectoryIsRefused) {
  dir_.Write("other", "kept");
  ASSERT_EQ(symlink((dir_ / "other").c_str(), file_.c_str()), 0);
  EXPECT_THAT(MessageOf([&] { const ProcessLock lock(file_); }), HasSubstr(file_));
  EXPECT_EQ(ReadFile(dir_ / "other"), "kept");
  EXPECT_THAT(MessageOf([&] { const ProcessLock lock(dir_.Path()); }), HasSubstr(dir_.Path()));
}

class RefusedLockTest : public RefusedTest {};

TEST_P(RefusedLockTest, IsAFailureAndNoOtherDaemon) {
  ExpectFailure([&] {
    try {
      const ProcessLock lock(file_);
    } catch (const AlreadyRunning&) {
      ADD_FAILURE() << "another daemon is blamed";
    }
  });
}

INSTANTIATE_TEST_SUITE_P(, RefusedLockTest,
                         ::testing::Values(Refusal{"flock", ENOLCK}, Refusal{"ftruncate", EIO},
                                           Refusal{"pwrite", ENOSPC}),
                         NameOf);

sockaddr_un AddressOf(const std::string& path) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  path.copy(address.sun_path, sizeof(address.sun_path) - 1);
  return address;
}

// Makes a socket file on which nobody listens as soon as the returned descriptor is closed.
int MakeSocketFile(const std::string& path) {
  const int fd = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  const sockaddr_un address = AddressOf(path);
  EXPECT_EQ(bind(fd, reinterpret_cast<const sockaddr*>(&address), sizeof(address)), 0);
  EXPECT_EQ(listen(fd, 1), 0);
  return fd;
}

TEST_F(ProcessTest, ASocketFileGoesWithItsObject) {
  {
    const SocketFile socket_file(file_);
    EXPECT_THAT(dir_.Names(), ElementsAre("it"));
  }
  EXPECT_THAT(dir_.Names(), IsEmpty());
}

TEST_F(ProcessTest, ASocketFileThatHasTakenItsPlaceStays) {
  {
    const SocketFile socket_file(file_);
    ASSERT_EQ(unlink(file_.c_str()), 0);
    dir_.Write("it", "another");
  }
  EXPECT_EQ(ReadFile(file_), "another");
  {
    ASSERT_EQ(unlink(file_.c_str()), 0);
    const SocketFile socket_file(file_);
    ASSERT_EQ(unlink(file_.c_str()), 0);
  }
  EXPECT_THAT(dir_.Names(), IsEmpty());
}

TEST_F(ProcessTest, ASocketThatSomebodyListensOnIsLeftAlone) {
  const UniqueFd listener(MakeSocketFile(file_));
  EXPECT_THAT(MessageOf([&] { const SocketFile socket_file(file_); }), HasSubstr("in use"));
  EXPECT_THAT(dir_.Names(), ElementsAre("it"));
}

TEST_F(ProcessTest, ASocketThatMayNotBeConnectedToCountsAsInUse) {
  close(MakeSocketFile(file_));
  failing_call = {"connect", EACCES, 0};
  EXPECT_THAT(MessageOf([&] { const SocketFile socket_file(file_); }), HasSubstr("in use"));
  EXPECT_THAT(dir_.Names(), ElementsAre("it"));
}

TEST_F(ProcessTest, WhatIsNoSocketIsLeftAlone) {
  dir_.Write("it", "kept");
  EXPECT_THAT(MessageOf([&] { const SocketFile socket_file(file_); }), HasSubstr("not a socket"));
  EXPECT_EQ(ReadFile(file_), "kept");
  EXPECT_THAT(MessageOf([&] { const SocketFile socket_file(file_ + "/below"); }),
              HasSubstr(std::strerror(ENOTDIR)));
}

TEST_F(ProcessTest, APathThatIsTooLongForASocketIsRefused) {
  const std::string path = dir_ / std::string(200, 'x');
  EXPECT_THAT(MessageOf([&] { const SocketFile socket_file(path); }), HasSubstr("too long"));
}

class RefusedSocketTest : public RefusedTest {};

TEST_P(RefusedSocketTest, IsAFailureThatLeavesTheMask) {
  const mode_t mask = umask(027);
  ExpectFailure([&] { const SocketFile socket_file(file_); });
  EXPECT_EQ(umask(mask), 027U);
  failing_call = {};
  EXPECT_EQ(MessageOf([&] { const SocketFile socket_file(file_); }), "")
      << "what is left is in the way";
}

INSTANTIATE_TEST_SUITE_P(, RefusedSocketTest,
                         ::testing::Values(Refusal{"socket", EMFILE}, Refusal{"bind", EACCES},
                                           Refusal{"listen", EADDRINUSE}, Refusal{"rename", EIO},
                                           Refusal{"lstat", EIO}, Refusal{"lstat", EIO, 2}),
                         NameOf);

class RefusedReplacementTest : public RefusedTest {};

TEST_P(RefusedReplacementTest, LeavesTheStaleSocket) {
  close(MakeSocketFile(file_));
  ExpectFailure([&] { const SocketFile socket_file(file_); });
  EXPECT_THAT(dir_.Names(), ElementsAre("it"));
}

INSTANTIATE_TEST_SUITE_P(, RefusedReplacementTest,
                         ::testing::Values(Refusal{"unlink", EROFS}, Refusal{"socket", ENFILE, 1}),
                         NameOf);

class RefusedSignalsTest : public RefusedTest {};

TEST_P(RefusedSignalsTest, IsAFailure) {
  ExpectFailure([] { CatchSignals(); });
}

INSTANTIATE_TEST_SUITE_P(, RefusedSignalsTest,
                         ::testing::Values(Refusal{"sigprocmask", EINVAL},
                                           Refusal{"signalfd", EMFILE}),
                         NameOf);

class RefusedBackgroundTest : public RefusedTest {};

TEST_P(RefusedBackgroundTest, IsAFailure) {
  failing_call = {GetParam().call, GetParam().error, 0};
  EXPECT_THAT(MessageOf([] { GoToBackground(); }), HasSubstr(std::strerror(GetParam().error)));
}

INSTANTIATE_TEST_SUITE_P(, RefusedBackgroundTest,
                         ::testing::Values(Refusal{"pipe2", EMFILE}, Refusal{"fork", EAGAIN}),
                         NameOf);

// The exit status of a command that goes to the background and does this there, with `call`
// failing.
int StatusOfCommand(const std::function<void(int ready)>& in_background,
                    const FailingCall& call = {}) {
  const pid_t command = fork();
  if (command == 0) {
    failing_call = call;
    in_background(GoToBackground());
    _exit(0);
  }
  int status = 0;
  EXPECT_EQ(waitpid(command, &status, 0), command);
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

TEST_F(ProcessTest, ACommandEndsAsWhatItLeavesInTheBackground) {
  EXPECT_EQ(StatusOfCommand([](int ready) { ReportReady(ready); }), 0);
  EXPECT_EQ(StatusOfCommand([](int) { _exit(5); }), 5);
  EXPECT_EQ(StatusOfCommand([](int) { raise(SIGKILL); }), 1);
}

TEST_F(ProcessTest, ACommandThatIsInterruptedGoesOnWaiting) {
  for (const char* call : {"read", "waitpid"}) {
    EXPECT_EQ(StatusOfCommand([](int) { _exit(5); }, {call, EINTR, 0}), 5);
  }
}

TEST_F(ProcessTest, ToldNobodyThatItIsReadyItGoesOnWithoutAnError) {
  std::array<int, 2> ends{};
  ASSERT_EQ(pipe2(ends.data(), O_CLOEXEC), 0);
  const UniqueFd nobody_reads(ends[0]);
  failing_call = {"write", EPIPE, 0};
  ReportReady(ends[1]);
  EXPECT_EQ(errno, 0) << "to be logged later";
  EXPECT_EQ(fcntl(ends[1], F_GETFD), -1) << "closed";
}

class RefusedCheckerTest : public RefusedTest {};

TEST_P(RefusedCheckerTest, IsAFailure) {
  ExpectFailure([] { const CheckProcess process(STDERR_FILENO); });
}

INSTANTIATE_TEST_SUITE_P(, RefusedCheckerTest,
                         ::testing::Values(Refusal{"socketpair", EMFILE}, Refusal{"fork", EAGAIN}),
                         NameOf);

class RefusedCheckTest : public RefusedTest {
 protected:
  CheckProcess process_{STDERR_FILENO};
};

TEST_P(RefusedCheckTest, IsAFailureOfStorage) {
  ExpectFailure([&] {
    try {
      process_.Begin(dir_.Path());
    } catch (const RequestError& e) {
      EXPECT_EQ(e.GetCode(), Code::kStorage);
      throw;
    }
  });
}

INSTANTIATE_TEST_SUITE_P(, RefusedCheckTest,
                         ::testing::Values(Refusal{"pipe2", EMFILE}, Refusal{"sendmsg", ENOBUFS}),
                         NameOf);

class NoHandler : public Handler {
 public:
  bool IsQuick(const std::string&) override { return true; }
  Answer Handle(const std::string&, uid_t) override { return {}; }
  std::string TooLong() override { return ""; }
  void Reopen() override {}
  bool HasIdleWork() override { return false; }
  void DoIdleWork() override {}
};

class RefusedServerTest : public RefusedTest {};

TEST_P(RefusedServerTest, IsAFailure) {
  ExpectFailure([] {
    NoHandler handler;
    const Server server(handler, open("/dev/null", O_RDWR | O_CLOEXEC),
                        open("/dev/null", O_RDWR | O_CLOEXEC), std::chrono::seconds(1));
  });
}

INSTANTIATE_TEST_SUITE_P(, RefusedServerTest,
                         ::testing::Values(Refusal{"epoll_create1", EMFILE},
                                           Refusal{"eventfd", EMFILE}, Refusal{"epoll_ctl", ENOMEM},
                                           Refusal{"epoll_ctl", ENOSPC, 1}),
                         NameOf);

TEST_F(ProcessTest, ADirectoryThatCannotBeMadeIsNamed) {
  const auto there = std::count(dir_.Path().begin(), dir_.Path().end(), '/');
  failing_call = {"mkdir", EROFS, static_cast<int>(there)};
  EXPECT_THAT(MessageOf([&] { MakeDirectories(dir_ / "a/b", 0700); }),
              HasSubstr((dir_ / "a") + ": " + std::strerror(EROFS)));
  failing_call = {"chmod", EPERM, 1};
  EXPECT_THAT(MessageOf([&] { MakeDirectories(dir_ / "a/b", 0700); }),
              HasSubstr((dir_ / "a/b") + ": " + std::strerror(EPERM)));
  failing_call = {"fsync", EIO, 0};  // of the directory above it
  EXPECT_THAT(MessageOf([&] { MakeDirectories(dir_ / "a/b/c", 0700); }),
              HasSubstr((dir_ / "a/b/c") + ": " + std::strerror(EIO)));
}

}  // namespace
}  // namespace searchd
