// What a lock file meets: the holder dies or never lets go, and something else is at its path. The
// same for LockFile and for the lock that keeps processors of the queue apart.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <numeric>
#include <ostream>
#include <stdexcept>
#include <thread>

#include "appindex/index_mgr.h"
#include "tests/reliability/id_daemon.h"
#include "tests/support/controlled_time.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"

namespace velkor::appindex {
namespace {

using test::ConfOf;
using test::Request;
using test::ThrownBy;
using test::Time;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;
using testing::StartsWith;

constexpr uid_t kAnna = 1001;

struct Lock {
  const char* name;
  const char* path;
  void (*take)();  // takes the lock and lets it go
};

void PrintTo(const Lock& lock, std::ostream* out) { *out << lock.name; }

constexpr Lock kLockFile{"LockFile", "/tmp/work.lck",
                         [] { const LockFile lock("/tmp/work.lck", true); }};
constexpr Lock kProcessLock{"ProcessLock", test::kProcessLock, [] { ProcessQueue(); }};

// A process that holds the lock until it is killed.
class Holder {
 public:
  explicit Holder(const char* path) {
    int ready[2];
    if (pipe2(ready, O_CLOEXEC) != 0) throw std::runtime_error("no pipe");
    pid_ = fork();
    if (pid_ == 0) {
      const int fd = open(path, O_RDONLY | O_CREAT | O_CLOEXEC, 0644);
      if (fd < 0 || flock(fd, LOCK_EX) != 0 || write(ready[1], "r", 1) != 1) _exit(1);
      for (;;) pause();
    }
    close(ready[1]);
    char told = 0;
    const bool holds = read(ready[0], &told, 1) == 1;
    close(ready[0]);
    if (!holds) throw std::runtime_error("the lock is not held");
  }
  ~Holder() { Kill(); }
  Holder(const Holder&) = delete;
  Holder& operator=(const Holder&) = delete;

  void Kill() {
    if (pid_ < 0) return;
    kill(pid_, SIGKILL);
    waitpid(pid_, nullptr, 0);
    pid_ = -1;
  }

 private:
  pid_t pid_;
};

class LockTable : public test::DeviceRootTest, public testing::WithParamInterface<Lock> {
 protected:
  LockTable() { Time() = test::ControlledTime(); }

  static const char* Path() { return GetParam().path; }
  static void Take() { GetParam().take(); }

  // Taking the lock fails at once, and the log says why.
  void ExpectRefused(const std::string& why) {
    const Error error = ThrownBy(Take);
    EXPECT_EQ(error.code, Error::kLockFileError);
    EXPECT_THAT(error.reason, StartsWith(std::string("open failed, path=") + Path()));
    EXPECT_THAT(TakeLog(), testing::ElementsAre(HasSubstr(why)));
    EXPECT_THAT(Time().usleeps, IsEmpty());
  }

  // Whether the kernel keeps even root from opening, as a lock does, what another user has put into
  // a directory such as /tmp.
  bool AreOthersFilesProtected() const {
    const int fd = openat(OutsideRootFd(), "proc/sys/fs/protected_regular", O_RDONLY | O_CLOEXEC);
    char value = '0';
    if (fd < 0 || read(fd, &value, 1) != 1) value = '0';
    close(fd);
    return value != '0';
  }
};

TEST_P(LockTable, HolderThatWasKilledHasLetGo) {
  Holder holder(Path());
  holder.Kill();
  Take();
  EXPECT_THAT(Time().usleeps, IsEmpty());
}

TEST_P(LockTable, HolderThatIsKilledMeanwhileLetsGo) {
  Holder holder(Path());
  Time().on_usleep = [&](unsigned) {
    if (Time().usleeps.size() == 3) holder.Kill();
  };
  Take();
  EXPECT_THAT(Time().usleeps, SizeIs(3));
}

TEST_P(LockTable, HolderForEverIsGivenUpAfterTheLongestWait) {
  const Holder holder(Path());
  Time().rands.assign(64, 9);
  const Error error = ThrownBy(Take);
  EXPECT_EQ(error.code, Error::kLockFileError);
  EXPECT_EQ(error.reason, std::string("Exceed max retry, path=") + Path());
  EXPECT_EQ(std::accumulate(Time().usleeps.begin(), Time().usleeps.end(), 0U), 57600000U);
}

TEST_P(LockTable, FileThatIsReplacedWhileItIsWaitedForIsTheOneThatCounts) {
  const Holder holder(Path());
  Time().on_usleep = [](unsigned) { unlink(Path()); };
  Take();
  EXPECT_THAT(Time().usleeps, SizeIs(1));
}

TEST_P(LockTable, DirectoryAtItsPathIsRefused) {
  test::MakeDirs(Path());
  ExpectRefused("Is a directory");
}

TEST_P(LockTable, FifoAtItsPathIsWaitedForUntilSomebodyOpensItForWriting) {
  ASSERT_EQ(mkfifo(Path(), 0600), 0);
  const pid_t taker = fork();
  if (taker == 0) {
    Take();
    _exit(0);
  }
  // Opens once somebody waits for it to be opened, and not before.
  int writer = -1;
  while ((writer = open(Path(), O_WRONLY | O_NONBLOCK | O_CLOEXEC)) < 0) {
    ASSERT_EQ(errno, ENXIO);
    ASSERT_EQ(waitpid(taker, nullptr, WNOHANG), 0) << "did not wait";
    std::this_thread::yield();
  }
  int status = -1;
  waitpid(taker, &status, 0);
  close(writer);
  EXPECT_EQ(status, 0) << "a lock is a lock on a FIFO too";
}

TEST_P(LockTable, UmaskOf077LeavesTheFileToItsOwner) {
  const mode_t before = umask(077);
  Take();
  umask(before);
  EXPECT_EQ(test::ModeOf(Path()), mode_t{0600});
  Take();
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: switches to another user";
  TakeLog();
  ASSERT_EQ(seteuid(kAnna), 0);
  ExpectRefused("Permission denied");
}

TEST_P(LockTable, AnotherUsersFileServesRootUnlessTheKernelProtectsIt) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: gives a file away";
  test::WriteFile(Path(), "", 0600);
  ASSERT_EQ(chown(Path(), kAnna, 100), 0);
  if (AreOthersFilesProtected()) {
    ExpectRefused("Permission denied");
  } else {
    Take();
    EXPECT_THAT(Time().usleeps, IsEmpty());
  }
}

INSTANTIATE_TEST_SUITE_P(Locks, LockTable, testing::Values(kLockFile, kProcessLock),
                         [](const auto& lock) { return std::string(lock.param.name); });

// Someone has removed the process lock's file, so that two processors work at the same time.
class RemovedProcessLock : public test::DeviceRootTest {
 protected:
  // What the second one does, in the middle of the first one's batch: it finishes that one, begins
  // the next and is killed.
  static void FinishTheBatchBeginTheNextAndDie() {
    unlink(test::kProcessLock);
    const pid_t second = fork();
    if (second == 0) {
      Time() = test::ControlledTime();
      Time().on_usleep = [](unsigned) {
        if (Time().usleeps.size() > test::LangsInOrder().size()) raise(SIGKILL);
      };
      ProcessQueue();
      _exit(1);
    }
    int status = 0;
    waitpid(second, &status, 0);
    EXPECT_TRUE(WIFSIGNALED(status)) << status;
  }

  test::IdDaemon daemon_;
};

TEST_F(RemovedProcessLock, DoesNotMakeOneProcessorRemoveTheBatchOfAnother) {
  test::Enqueue(Request(1, test::Install("First")));
  const std::string second = Request(1, test::Install("Second"));
  bool begun = false;
  Time().on_usleep = [&](unsigned) {
    if (begun) return;
    begun = true;
    test::Enqueue(second);
    FinishTheBatchBeginTheNextAndDie();
  };
  ProcessQueue();
  Time().on_usleep = nullptr;
  const auto committed = daemon_.Committed();
  EXPECT_THAT(committed, SizeIs(test::LangsInOrder().size()));
  for (const auto& [id, documents] : committed) {
    EXPECT_THAT(documents, testing::ElementsAre("First", "Second")) << id;
  }
  EXPECT_FALSE(test::Exists(test::kBatch));
}

}  // namespace
}  // namespace velkor::appindex
