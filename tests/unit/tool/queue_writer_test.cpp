// Leaving requests in the queue.
#include "tool/queue_writer.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/file.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "common/unique_fd.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/unit/tool/recorded_calls.h"
#include "tool/failure.h"
#include "tool/lock_holders.h"

namespace tool {
namespace {

using test::FailingCall;
using test::kBatch;
using test::kQueue;
using test::ReadFile;
using test::RecordedCalls;
using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::StartsWith;

class QueueWriterTest : public test::DeviceRootTest {
 protected:
  static std::string Refusal() {
    try {
      AppendToQueue({QueueRequest(3, "")});
      return "written";
    } catch (const Failure& failure) {
      return failure.what();
    }
  }
};

constexpr char kRebuild[] = "{\"op\":3}\n";

TEST_F(QueueWriterTest, MakesTheQueueAndAppendsWholeLines) {
  umask(022);
  AppendToQueue({QueueRequest(1, "/a"), QueueRequest(2, "/b")});
  AppendToQueue({QueueRequest(3, "")});
  EXPECT_EQ(ReadFile(kQueue), R"({"op":1,"path":"/a"})"
                              "\n"
                              R"({"op":2,"path":"/b"})"
                              "\n" +
                                  std::string(kRebuild));
  EXPECT_EQ(test::ModeOf(kQueue), mode_t{0644});
}

TEST_F(QueueWriterTest, OddPathsStayOneLine) {
  AppendToQueue({QueueRequest(1, "/a\n\"b")});
  EXPECT_EQ(ReadFile(kQueue), "{\"op\":1,\"path\":\"/a\\n\\\"b\"}\n");
}

TEST_F(QueueWriterTest, EndsTheLineThatAnotherLeftUnfinished) {
  test::WriteFile(kQueue, "{\"op\":1,\"pa");
  AppendToQueue({QueueRequest(3, "")});
  EXPECT_EQ(ReadFile(kQueue), std::string("{\"op\":1,\"pa\n") + kRebuild);
}

TEST_F(QueueWriterTest, LetsTheLockGo) {
  AppendToQueue({QueueRequest(3, "")});
  const velkor::UniqueFd fd(open(kQueue, O_RDONLY | O_CLOEXEC));
  EXPECT_EQ(flock(fd.Get(), LOCK_EX | LOCK_NB), 0);
}

// The kernel's list of those who wait for a lock, as outside the root.
bool IsWaitedFor(int proc, pid_t waiter) {
  const velkor::UniqueFd fd(openat(proc, "locks", O_RDONLY | O_CLOEXEC));
  std::string locks(65536, '\0');
  const ssize_t size = read(fd.Get(), locks.data(), locks.size());
  locks.resize(size > 0 ? static_cast<std::size_t>(size) : 0);
  return locks.find("-> FLOCK  ADVISORY  WRITE " + std::to_string(waiter) + " ") !=
         std::string::npos;
}

class WaitingQueueWriter : public QueueWriterTest, public testing::WithParamInterface<bool> {};

TEST_P(WaitingQueueWriter, TakesTheQueueThatIsThereWhenItWakes) {
  const velkor::UniqueFd proc(openat(OutsideRootFd(), "proc", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  const int held = open(kQueue, O_RDWR | O_CREAT | O_CLOEXEC, 0644);
  ASSERT_EQ(flock(held, LOCK_EX), 0);
  const pid_t writer = fork();
  if (writer == 0) {
    close(held);  // the lock is the parent's alone
    AppendToQueue({QueueRequest(3, "")});
    _exit(0);
  }
  while (!IsWaitedFor(proc.Get(), writer)) std::this_thread::yield();
  // As the worker of the queue does, under the lock that the writer waits for.
  ASSERT_EQ(rename(kQueue, kBatch), 0);
  if (GetParam()) test::WriteFile(kQueue, kRebuild);  // a third process was faster
  close(held);
  int status = -1;
  ASSERT_EQ(waitpid(writer, &status, 0), writer);
  EXPECT_EQ(status, 0);
  EXPECT_EQ(ReadFile(kBatch), "");
  EXPECT_EQ(ReadFile(kQueue), std::string(GetParam() ? kRebuild : "") + kRebuild);
}

INSTANTIATE_TEST_SUITE_P(AfterTheQueueWasTaken, WaitingQueueWriter, testing::Bool(),
                         [](const auto& param_info) {
                           return param_info.param ? "AndMadeAnew" : "AndIsGone";
                         });

TEST_F(QueueWriterTest, FailuresNameTheFileTheCauseAndWhatToDo) {
  const std::string opening = std::string(kQueue) + ": the queue cannot be opened: ";
  test::MakeDirs(kQueue);
  EXPECT_EQ(Refusal(), opening + "Is a directory; put a regular file in its place");
  ASSERT_EQ(rmdir(kQueue), 0);
  ASSERT_EQ(symlink("/etc/passwd", kQueue), 0);
  EXPECT_THAT(Refusal(), AllOf(StartsWith(opening + "Too many levels"),
                               EndsWith("; put a regular file in its place")));
}

// One write of everything, and then the file and its directory made durable.

TEST_F(QueueWriterTest, EverythingIsOneWriteAndSynced) {
  test::WriteFile(kQueue, "{\"op\":1,\"pa");
  std::vector<std::string> calls;
  {
    const RecordedCalls recorded(calls);
    AppendToQueue({QueueRequest(1, "/a"), QueueRequest(3, "")});
  }
  const std::string lines = "\n{\"op\":1,\"path\":\"/a\"}\n" + std::string(kRebuild);
  EXPECT_THAT(calls, ElementsAre("write " + std::to_string(lines.size()) + " to a file",
                                 "fsync of a file", "fsync of a directory"));
  EXPECT_EQ(ReadFile(kQueue), "{\"op\":1,\"pa" + lines);
}

TEST_F(QueueWriterTest, WriteThatTakesAPartIsTakenBack) {
  test::WriteFile(kQueue, kRebuild);
  ASSERT_NE(std::signal(SIGXFSZ, SIG_IGN), SIG_ERR);
  const rlimit limit = {sizeof(kRebuild) + 5, RLIM_INFINITY};  // in the middle of the line
  ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &limit), 0);
  const std::string refusal = Refusal();
  const rlimit none = {RLIM_INFINITY, RLIM_INFINITY};
  ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &none), 0);
  EXPECT_EQ(refusal, std::string(kQueue) +
                         ": the queue cannot be written: No space left on device"
                         "; make room on its file system");
  EXPECT_EQ(ReadFile(kQueue), kRebuild);
}

TEST_F(QueueWriterTest, LineThatCannotBeSyncedIsTakenBack) {
  test::WriteFile(kQueue, kRebuild);
  std::vector<std::string> calls;
  const RecordedCalls recorded(calls, {"fsync of a file"});
  EXPECT_EQ(Refusal(), std::string(kQueue) +
                           ": the queue cannot be written: Input/output error; see to the disk");
  EXPECT_EQ(calls.back(), "ftruncate to " + std::to_string(std::strlen(kRebuild)));
  EXPECT_EQ(ReadFile(kQueue), kRebuild);
}

TEST_F(QueueWriterTest, DirectoryThatCannotBeSyncedLeavesTheLineAndIsToldOf) {
  std::vector<std::string> calls;
  const RecordedCalls recorded(calls, {"fsync of a directory"});
  EXPECT_THAT(Refusal(), AllOf(StartsWith(std::string(kQueue) + ": "),
                               HasSubstr("cannot be synced: Input/output error")));
  EXPECT_EQ(ReadFile(kQueue), kRebuild);
}

TEST_F(QueueWriterTest, PartOfALineThatStaysIsToldOf) {
  test::WriteFile(kQueue, kRebuild);
  std::vector<std::string> calls;
  const RecordedCalls recorded(calls, {"fsync of a file", "ftruncate"});
  EXPECT_THAT(Refusal(), HasSubstr("a part of a line could not be taken back"));
}

TEST_F(QueueWriterTest, InterruptionDoesNotEndTheWaitForTheLock) {
  const FailingCall lock("flock", EINTR);
  EXPECT_EQ(Refusal(), "written");
  EXPECT_TRUE(lock.HasFailed());
  EXPECT_EQ(ReadFile(kQueue), kRebuild);
}

TEST_F(QueueWriterTest, LockThatCannotBeTakenIsToldAndNothingIsWritten) {
  const FailingCall lock("flock", ENOLCK);
  EXPECT_EQ(Refusal(), std::string(kQueue) +
                           ": the queue cannot be locked: No locks available; try again later");
  EXPECT_EQ(ReadFile(kQueue), "");
}

// It might be another file by now, which the one that works the queue does not read.
TEST_F(QueueWriterTest, QueueThatCannotBeLookedAtIsNotWritten) {
  const std::string refusal =
      std::string(kQueue) + ": the queue cannot be looked at: Input/output error; see to the disk";
  for (const auto& [name, spared] :
       {std::pair("fstat", 0), std::pair("lstat", 0), std::pair("fstat", 1)}) {
    const FailingCall look(name, EIO, spared);
    EXPECT_EQ(Refusal(), refusal) << name << " after " << spared;
    EXPECT_EQ(ReadFile(kQueue), "");
  }
}

TEST_F(QueueWriterTest, EndThatCannotBeReadCountsAsAnUnfinishedLine) {
  test::WriteFile(kQueue, kRebuild);
  const FailingCall end("pread", EIO);
  AppendToQueue({QueueRequest(3, "")});
  EXPECT_TRUE(end.HasFailed());
  EXPECT_EQ(ReadFile(kQueue), std::string(kRebuild) + "\n" + kRebuild);
}

TEST_F(QueueWriterTest, DirectoryThatCannotBeOpenedToBeSyncedIsToldOf) {
  const FailingCall directory("open", EMFILE, 1);  // behind the queue itself
  EXPECT_EQ(Refusal(), std::string(kQueue) +
                           ": the queue's directory cannot be synced: Too many open files; try "
                           "again later");
  EXPECT_EQ(ReadFile(kQueue), kRebuild);
}

TEST_F(QueueWriterTest, WithoutItsDirectoryItCannotBeMade) {
  ASSERT_EQ(rmdir("/var/packages/Velkor/etc"), 0);
  EXPECT_EQ(Refusal(), std::string(kQueue) +
                           ": the queue cannot be opened: No such file or directory; make its "
                           "directory");
}

}  // namespace
}  // namespace tool
