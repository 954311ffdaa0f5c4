// Leaving requests in the queue.
#include "tool/queue_writer.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <thread>

#include "common/unique_fd.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tool/failure.h"
#include "tool/lock_holders.h"

namespace tool {
namespace {

using test::kBatch;
using test::kQueue;
using test::ReadFile;

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

TEST_F(QueueWriterTest, WaitingWriterTakesTheQueueThatIsThereWhenItWakes) {
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
  close(held);
  int status = -1;
  ASSERT_EQ(waitpid(writer, &status, 0), writer);
  EXPECT_EQ(status, 0);
  EXPECT_EQ(ReadFile(kBatch), "");
  EXPECT_EQ(ReadFile(kQueue), kRebuild);
}

TEST_F(QueueWriterTest, FailuresNameTheFileAndTheCause) {
  test::MakeDirs(kQueue);
  EXPECT_EQ(Refusal(), std::string(kQueue) + ": the queue cannot be opened: Is a directory");
  ASSERT_EQ(rmdir(kQueue), 0);
  ASSERT_EQ(symlink("/etc/passwd", kQueue), 0);
  EXPECT_THAT(Refusal(), testing::HasSubstr("the queue cannot be opened: Too many levels"));
  ASSERT_EQ(unlink(kQueue), 0);
  ASSERT_EQ(symlink("/dev/full", kQueue), 0);
}

TEST_F(QueueWriterTest, WithoutItsDirectoryItCannotBeMade) {
  ASSERT_EQ(rmdir("/var/packages/Velkor/etc"), 0);
  EXPECT_EQ(Refusal(),
            std::string(kQueue) + ": the queue cannot be opened: No such file or directory");
}

}  // namespace
}  // namespace tool
