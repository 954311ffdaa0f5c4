#include "appindex/utilities/lock_file.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <climits>
#include <csignal>
#include <memory>
#include <set>
#include <stdexcept>
#include <string>
#include <type_traits>
#include <vector>

#include "appindex/error.h"
#include "file_calls.h"
#include "tests/support/controlled_time.h"
#include "tests/support/device_root_test.h"

namespace {

using test::FailureLine;
using test::FileCall;
using test::FileCallHook;
using test::FileCallResult;
using test::Time;
using testing::Each;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;
using velkor::Error;
using velkor::LockFile;

static_assert(!std::is_copy_constructible_v<LockFile> && !std::is_copy_assignable_v<LockFile>);
static_assert(std::is_nothrow_destructible_v<LockFile>);

constexpr char kPath[] = "/tmp/work.lck";
constexpr unsigned kAttempts = 64;

std::set<int> OpenDescriptors() {
  constexpr int kEnough = 256;
  std::set<int> open;
  for (int fd = 0; fd < kEnough; ++fd) {
    if (fcntl(fd, F_GETFD) >= 0) open.insert(fd);
  }
  return open;
}

// The lock, held through an open file of the test's own.
class HeldElsewhere {
 public:
  explicit HeldElsewhere(int operation) : fd_(open(kPath, O_RDONLY | O_CREAT | O_CLOEXEC, 0644)) {
    if (flock(fd_, operation | LOCK_NB) != 0) throw std::runtime_error("the lock is taken");
  }
  ~HeldElsewhere() { Release(); }
  HeldElsewhere(const HeldElsewhere&) = delete;
  HeldElsewhere& operator=(const HeldElsewhere&) = delete;

  void Release() {
    if (fd_ >= 0) close(fd_);
    fd_ = -1;
  }

 private:
  int fd_;
};

// The lock, held by another process.
class HoldingProcess {
 public:
  HoldingProcess() {
    int ready[2];
    if (pipe2(ready, O_CLOEXEC) != 0) throw std::runtime_error("no pipe");
    pid_ = fork();
    if (pid_ == 0) {
      const int fd = open(kPath, O_RDONLY | O_CREAT, 0644);
      if (fd < 0 || flock(fd, LOCK_EX) != 0 || write(ready[1], "r", 1) != 1) _exit(1);
      for (;;) pause();
    }
    close(ready[1]);
    char told = 0;
    if (read(ready[0], &told, 1) != 1) throw std::runtime_error("the other process has no lock");
    close(ready[0]);
  }
  ~HoldingProcess() {
    kill(pid_, SIGKILL);
    waitpid(pid_, nullptr, 0);
  }
  HoldingProcess(const HoldingProcess&) = delete;
  HoldingProcess& operator=(const HoldingProcess&) = delete;

 private:
  pid_t pid_;
};

// Makes the first `times` calls of `name` fail with `error`.
FileCallHook::Hook FailFirst(std::string name, int times, int error) {
  return [=, left = times](const FileCall& call) mutable -> FileCallResult {
    if (call.name != name || left == 0) return {};
    --left;
    return error;
  };
}

class LockFileTest : public test::DeviceRootTest {
 protected:
  LockFileTest() { Time() = test::ControlledTime(); }

  static Error ErrorOf(const std::string& path, bool exclusive = true) {
    try {
      const LockFile lock(path, exclusive);
    } catch (const Error& error) {
      return error;
    }
    throw std::logic_error("the lock was granted");
  }

  static bool IsFree(int operation = LOCK_EX) {
    try {
      const HeldElsewhere probe(operation);
      return true;
    } catch (const std::runtime_error&) {
      return false;
    }
  }
};

TEST_F(LockFileTest, AMissingFileIsCreatedEmptyWithMode0644LessTheUmask) {
  for (const mode_t mask : {0022U, 0077U, 0U}) {
    const mode_t previous = umask(mask);
    const std::string path = "/tmp/mask" + std::to_string(mask);
    { const LockFile lock(path, true); }
    umask(previous);
    EXPECT_EQ(test::ModeOf(path), 0644U & ~mask);
    EXPECT_EQ(test::ReadFile(path), "");
  }
}

TEST_F(LockFileTest, AFileThatIsThereKeepsItsContentAndMode) {
  test::WriteFile(kPath, "content", 0600);
  { const LockFile lock(kPath, true); }
  EXPECT_EQ(test::ReadFile(kPath), "content");
  EXPECT_EQ(test::ModeOf(kPath), 0600U);
}

TEST_F(LockFileTest, AFreeLockIsTakenWithoutAPauseOrALine) {
  const LockFile lock(kPath, true);
  EXPECT_FALSE(IsFree(LOCK_EX));
  EXPECT_FALSE(IsFree(LOCK_SH));
  EXPECT_THAT(Time().usleeps, IsEmpty());
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(LockFileTest, ADirectoryThatDoesNotExistFailsAtOnceWithTheRealErrorInTheLineAlone) {
  errno = 0;
  const Error error = ErrorOf("/none/work.lck");
  EXPECT_EQ(errno, 0);
  EXPECT_EQ(error.code, Error::kLockFileError);
  EXPECT_EQ(error.reason, "open failed, path=/none/work.lck, reason=Success");
  EXPECT_THAT(
      TakeLog(),
      ElementsAre(FailureLine(
          "lock_file", 15, "LockFile",
          "Failed [0 > (fd_ = open(path_.c_str(), O_RDONLY | O_CREAT, 0644))], reason: open "
          "failed, path=/none/work.lck, reason=No such file or directory [err: No such file "
          "or directory]")));
  EXPECT_THAT(Time().usleeps, IsEmpty());
}

TEST_F(LockFileTest, TheLineOfAFailedOpenHasNoErrorTextWhenErrnoIsZero) {
  const FileCallHook hook(FailFirst("open", 1, 0));
  const Error error = ErrorOf(kPath);
  EXPECT_EQ(error.reason, "open failed, path=/tmp/work.lck, reason=Success");
  EXPECT_THAT(
      TakeLog(),
      ElementsAre(FailureLine(
          "lock_file", 15, "LockFile",
          "Failed [0 > (fd_ = open(path_.c_str(), O_RDONLY | O_CREAT, 0644))], reason: open "
          "failed, path=/tmp/work.lck, reason=Success")));
}

TEST_F(LockFileTest, AnOpenThatFailsWithinTheRetriesEndsThem) {
  test::MakeDirs("/tmp/gone");
  const std::string path = "/tmp/gone/work.lck";
  const FileCallHook hook(FailFirst("flock", 1, EWOULDBLOCK));
  Time().on_usleep = [&](unsigned) {
    unlink(path.c_str());
    rmdir("/tmp/gone");
  };
  EXPECT_EQ(ErrorOf(path).reason, "open failed, path=/tmp/gone/work.lck, reason=Success");
  EXPECT_THAT(Time().usleeps, SizeIs(1));
  EXPECT_THAT(TakeLog(), SizeIs(1));
}

TEST_F(LockFileTest, AnotherErrorOfFlockIsThrownWithItsTextAloneAndNotLogged) {
  const FileCallHook hook(FailFirst("flock", 1, ENOLCK));
  const Error error = ErrorOf(kPath);
  EXPECT_EQ(error.code, Error::kLockFileError);
  EXPECT_EQ(error.reason, "No locks available");
  EXPECT_THAT(Time().usleeps, IsEmpty());
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(LockFileTest, AnotherErrorOfFlockLeavesTheDescriptorOpen) {
  const std::set<int> before = OpenDescriptors();
  const FileCallHook hook(FailFirst("flock", 1, EIO));
  EXPECT_EQ(ErrorOf(kPath).reason, "Input/output error");
  EXPECT_THAT(OpenDescriptors(), SizeIs(before.size() + 1));
}

TEST_F(LockFileTest, AnotherErrorOfFlockWithinTheRetriesEndsThem) {
  const HeldElsewhere other(LOCK_EX);
  const FileCallHook hook([calls = 0](const FileCall& call) mutable -> FileCallResult {
    if (call.name != "flock" || ++calls < 3) return {};
    return EIO;
  });
  EXPECT_EQ(ErrorOf(kPath).reason, "Input/output error");
  EXPECT_THAT(Time().usleeps, SizeIs(2));
}

TEST_F(LockFileTest, AnotherProcessThatHoldsItLongerThanTheRetriesGivesExceedMaxRetry) {
  const HoldingProcess other;
  const Error error = ErrorOf(kPath);
  EXPECT_EQ(error.code, Error::kLockFileError);
  EXPECT_EQ(error.reason, "Exceed max retry, path=/tmp/work.lck");
  EXPECT_THAT(Time().usleeps, SizeIs(kAttempts));
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(LockFileTest, TheFileIsOpenedAndTheLockAskedFor64Times) {
  const HeldElsewhere other(LOCK_EX);
  std::vector<std::string> calls;
  const FileCallHook hook([&](const FileCall& call) -> FileCallResult {
    calls.push_back(call.name);
    return {};
  });
  ErrorOf(kPath);
  std::vector<std::string> expected;
  for (unsigned attempt = 0; attempt < kAttempts; ++attempt) {
    expected.insert(expected.end(), {"open", "flock", "close"});
  }
  EXPECT_EQ(calls, expected);
}

TEST_F(LockFileTest, EachPauseIsTheNextRandomNumberModuloTenInTenthsOfASecond) {
  const HeldElsewhere other(LOCK_EX);
  Time().rands = {0, 9, 10, 23, INT_MAX};
  ErrorOf(kPath);
  ASSERT_THAT(Time().usleeps, SizeIs(kAttempts));
  const std::vector<unsigned> first(Time().usleeps.begin(), Time().usleeps.begin() + 5);
  EXPECT_THAT(first, ElementsAre(0U, 900000U, 0U, 300000U, 700000U));
}

TEST_F(LockFileTest, TheLongestWaitIs64PausesOf900Milliseconds) {
  const HeldElsewhere other(LOCK_EX);
  Time().rands.assign(2 * kAttempts, 9);
  ErrorOf(kPath);
  EXPECT_THAT(Time().usleeps, SizeIs(kAttempts));
  EXPECT_THAT(Time().usleeps, Each(900000U));
  EXPECT_THAT(Time().rands, SizeIs(kAttempts));
}

TEST_F(LockFileTest, NoDescriptorIsOpenDuringAPauseNorAfterTheLastOne) {
  const HeldElsewhere other(LOCK_EX);
  const std::set<int> before = OpenDescriptors();
  Time().on_usleep = [&](unsigned) { EXPECT_EQ(OpenDescriptors(), before); };
  ErrorOf(kPath);
  EXPECT_EQ(OpenDescriptors(), before);
}

TEST_F(LockFileTest, ALockReleasedWithinTheRetriesIsTaken) {
  HeldElsewhere other(LOCK_EX);
  Time().on_usleep = [&](unsigned) {
    if (Time().usleeps.size() == 3) other.Release();
  };
  const LockFile lock(kPath, true);
  EXPECT_THAT(Time().usleeps, SizeIs(3));
  EXPECT_FALSE(IsFree());
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(LockFileTest, ALockReleasedDuringTheLastPauseIsTooLate) {
  HeldElsewhere other(LOCK_EX);
  Time().on_usleep = [&](unsigned) {
    if (Time().usleeps.size() == kAttempts) other.Release();
  };
  EXPECT_EQ(ErrorOf(kPath).reason, "Exceed max retry, path=/tmp/work.lck");
}

TEST_F(LockFileTest, AFileReplacedWithinTheRetriesIsTheOneLocked) {
  const HeldElsewhere other(LOCK_EX);
  Time().on_usleep = [](unsigned) { unlink(kPath); };
  const LockFile lock(kPath, true);
  EXPECT_THAT(Time().usleeps, SizeIs(1));
  EXPECT_FALSE(IsFree());
}

TEST_F(LockFileTest, AnInterruptedRequestIsAFailedAttempt) {
  const FileCallHook hook(FailFirst("flock", 1, EINTR));
  const LockFile lock(kPath, true);
  EXPECT_THAT(Time().usleeps, SizeIs(1));
}

TEST_F(LockFileTest, RequestsInterruptedEveryTimeGiveExceedMaxRetry) {
  const FileCallHook hook(FailFirst("flock", INT_MAX, EINTR));
  EXPECT_EQ(ErrorOf(kPath).reason, "Exceed max retry, path=/tmp/work.lck");
  EXPECT_THAT(Time().usleeps, SizeIs(kAttempts));
}

TEST_F(LockFileTest, TwoSharedLocksOnOnePathBothSucceedAndAnExclusiveOneThenWaits) {
  auto first = std::make_unique<LockFile>(kPath, false);
  auto second = std::make_unique<LockFile>(kPath, false);
  EXPECT_THAT(Time().usleeps, IsEmpty());
  Time().on_usleep = [&](unsigned) {
    if (Time().usleeps.size() == 2) first.reset();
    if (Time().usleeps.size() == 5) second.reset();
  };
  const LockFile exclusive(kPath, true);
  EXPECT_THAT(Time().usleeps, SizeIs(5));
}

TEST_F(LockFileTest, AnExclusiveLockKeepsASharedOneOut) {
  const LockFile exclusive(kPath, true);
  EXPECT_EQ(ErrorOf(kPath, false).reason, "Exceed max retry, path=/tmp/work.lck");
}

TEST_F(LockFileTest, ASecondExclusiveLockInTheSameProcessIsKeptOut) {
  const LockFile first(kPath, true);
  EXPECT_EQ(ErrorOf(kPath).reason, "Exceed max retry, path=/tmp/work.lck");
}

TEST_F(LockFileTest, DestroyingTheObjectReleasesTheLockAtOnceAndTheFileStays) {
  const std::set<int> before = OpenDescriptors();
  { const LockFile lock(kPath, true); }
  EXPECT_TRUE(IsFree());
  EXPECT_TRUE(test::Exists(kPath));
  EXPECT_EQ(OpenDescriptors(), before);
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(LockFileTest, DestroyingTheObjectUnlocksEvenWhereACopyOfTheDescriptorIsOpen) {
  auto lock = std::make_unique<LockFile>(kPath, true);
  std::vector<int> copies;
  for (const int fd : OpenDescriptors()) copies.push_back(fcntl(fd, F_DUPFD_CLOEXEC, 0));
  lock.reset();
  EXPECT_TRUE(IsFree());
  for (const int fd : copies) close(fd);
}

TEST_F(LockFileTest, TheReleaseIgnoresFailuresAndLogsNothing) {
  auto lock = std::make_unique<LockFile>(kPath, true);
  {
    const FileCallHook hook([](const FileCall&) -> FileCallResult { return EIO; });
    lock.reset();
  }
  EXPECT_TRUE(IsFree());
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(LockFileTest, TheDescriptorIsCloseOnExec) {
  const std::set<int> before = OpenDescriptors();
  const LockFile lock(kPath, true);
  int found = 0;
  for (const int fd : OpenDescriptors()) {
    if (before.count(fd) != 0) continue;
    ++found;
    EXPECT_EQ(fcntl(fd, F_GETFD), FD_CLOEXEC);
    EXPECT_EQ(fcntl(fd, F_GETFL) & O_ACCMODE, O_RDONLY);
  }
  EXPECT_EQ(found, 1);
}

}  // namespace
