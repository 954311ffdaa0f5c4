// Queue files that cannot be moved or read, and locks that others hold.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "appindex/index_mgr.h"
#include "queue_test_fixture.h"

namespace {

bool g_open_of_batch_fails = false;
bool g_open_fails_once = false;  // and not again
int g_open_error = 0;            // 0: leaves errno as it is

}  // namespace

// Opening the batch fails when a test says so.
extern "C" int open(const char* path, int flags, ...) {
  if (g_open_of_batch_fails && std::string(path) == test::kBatch) {
    if (g_open_error != 0) errno = g_open_error;
    if (g_open_fails_once) g_open_of_batch_fails = false;
    return -1;
  }
  va_list arguments;
  va_start(arguments, flags);
  const mode_t mode = (flags & O_CREAT) != 0 ? va_arg(arguments, mode_t) : 0;
  va_end(arguments);
  return static_cast<int>(syscall(SYS_openat, AT_FDCWD, path, flags, mode));
}

namespace velkor::appindex {
namespace {

using test::AddCommands;
using test::ConfOf;
using test::Enqueue;
using test::FailureLine;
using test::Install;
using test::Joined;
using test::kBatch;
using test::kQueue;
using test::kSucceed;
using test::Request;
using test::ScriptedDaemon;
using test::ThrownBy;
using ::testing::ElementsAre;

class IndexQueueFailure : public test::QueueTest {};

// Failures of the files.

std::string RenameLine(const std::string& why, const std::string& ending) {
  return FailureLine("index_mgr", 330, "ProcessQueue",
                     "Failed [0 > rename(queue_path.c_str(), queue_path_tmp.c_str())], reason: "
                     "rename failed, reason=" +
                         why + ending);
}

TEST_F(IndexQueueFailure, FailedRenameIsLoggedThrown502AndLeavesTheQueue) {
  Enqueue(R"({"op":3})");
  test::MakeDirs(kBatch);
  ScriptedDaemon daemon(kSucceed);
  const Error error = ThrownBy([] { ProcessQueue(); });
  EXPECT_EQ(error.code, Error::kGeneralError);
  EXPECT_STREQ(error.what(), "rename failed, reason=Success");
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(RenameLine("Is a directory", " [err: Is a directory]")));
  EXPECT_EQ(test::ReadFile(kQueue), "{\"op\":3}\n");
  EXPECT_EQ(daemon.Connections(), 0);
  ExpectUnlocked(kQueue);
  ExpectUnlocked(test::kProcessLock);
}

TEST_F(IndexQueueFailure, FailedRenameThatLeavesErrnoClearIsLoggedPlain) {
  Enqueue(R"({"op":3})");
  test::WriteFile(test::kSocket, "");
  test::Calls().rename.fails_for = kBatch;
  auto writers_lock = std::make_unique<LockFile>(kQueue, true);
  test::Time().on_usleep = [&writers_lock](unsigned) {  // the last thing before the rename
    writers_lock.reset();
    errno = 0;
  };
  EXPECT_STREQ(ThrownBy([] { ProcessQueue(); }).what(), "rename failed, reason=Success");
  EXPECT_THAT(TakeLog(), ElementsAre(RenameLine("Success", "")));
}

std::string OpenLine(const std::string& why, const std::string& ending) {
  return FailureLine(
      "index_mgr", 340, "ProcessQueue",
      "Failed [!input_stream], reason: Failed to open appindex queue, reason=" + why + ending);
}

TEST_F(IndexQueueFailure, BatchThatCannotBeOpenedIsLoggedThrown502AndStays) {
  test::WriteFile(kBatch, "{\"op\":3}\n");
  test::WriteFile(test::kSocket, "");
  g_open_of_batch_fails = true;
  g_open_error = EMFILE;
  const Error error = ThrownBy([] { ProcessQueue(); });
  g_open_of_batch_fails = false;
  EXPECT_EQ(error.code, Error::kGeneralError);
  EXPECT_STREQ(error.what(), "Failed to open appindex queue, reason=Success");
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(),
              ElementsAre(OpenLine("Too many open files", " [err: Too many open files]")));
  EXPECT_EQ(test::ReadFile(kBatch), "{\"op\":3}\n");
  ExpectUnlocked(test::kProcessLock);
}

TEST_F(IndexQueueFailure, BatchThatCannotBeOpenedWithErrnoClearIsLoggedPlain) {
  test::WriteFile(kBatch, "{}\n");
  test::WriteFile(kQueue, "");  // both files there: nothing is missing, so nothing has set errno
  test::WriteFile(test::kSocket, "");
  g_open_of_batch_fails = true;
  errno = 0;
  EXPECT_STREQ(ThrownBy([] { ProcessQueue(); }).what(),
               "Failed to open appindex queue, reason=Success");
  EXPECT_THAT(TakeLog(), ElementsAre(OpenLine("Success", "")));
}

TEST_F(IndexQueueFailure, BatchThatMayNotBeReadIsThrown502) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: switches to another user";
  test::WriteFile(kBatch, "{\"op\":3}\n", 0);
  test::WriteFile(test::kSocket, "");
  ASSERT_EQ(seteuid(1001), 0);
  const Error error = ThrownBy([] { ProcessQueue(); });
  EXPECT_THAT(TakeLog(), ElementsAre(OpenLine("Permission denied", " [err: Permission denied]")));
  ASSERT_EQ(seteuid(0), 0);
  EXPECT_EQ(error.code, Error::kGeneralError);
  EXPECT_EQ(test::ReadFile(kBatch), "{\"op\":3}\n");
}

// What stands in the batch's place.

TEST_F(IndexQueueFailure, BatchThatCannotBeLookedAtIsNotReplacedByTheQueue) {
  test::WriteFile(kBatch, Request(1, ConfOf("A")) + "\n");
  Enqueue(R"({"op":3})");
  ScriptedDaemon daemon(kSucceed);
  test::Calls().lstat.fails_for = kBatch;
  test::Calls().lstat.error = EIO;
  ProcessQueue();
  test::Calls().lstat.fails_for.clear();
  EXPECT_EQ(test::ReadFile(kBatch), Request(1, ConfOf("A")) + "\n");
  EXPECT_EQ(test::ReadFile(kQueue), "{\"op\":3}\n");
  EXPECT_EQ(daemon.Connections(), 0);
  ExpectUnlocked(test::kProcessLock);
}

// What a second processor does that somebody let in by removing the file of the process lock.
class SecondProcessor : public IndexQueueFailure {
 protected:
  // Works a batch that adds A. `meanwhile` is done while its first document is written.
  std::vector<std::string> CommandsWith(const std::function<void()>& meanwhile) {
    Install("A");
    Install("B");
    test::WriteFile(kBatch, Request(1, ConfOf("A")) + "\n");
    ScriptedDaemon daemon(kSucceed);
    test::Time().on_usleep = [&](unsigned) {
      test::Time().on_usleep = nullptr;
      meanwhile();
    };
    ProcessQueue();
    return daemon.Commands();
  }
};

TEST_F(SecondProcessor, ThatHasBegunTheNextBatchDoesNotLoseIt) {
  const auto commands = CommandsWith([] {
    test::WriteFile("/tmp/next", Request(1, ConfOf("B")) + "\n");
    ASSERT_EQ(rename("/tmp/next", kBatch), 0);
  });
  EXPECT_EQ(commands, Joined({AddCommands("A"), AddCommands("B")}));
  EXPECT_FALSE(test::Exists(kBatch));
}

TEST_F(SecondProcessor, ThatHasFinishedTheBatchLeavesNothingToDo) {
  EXPECT_EQ(CommandsWith([] { ASSERT_EQ(unlink(kBatch), 0); }), AddCommands("A"));
  EXPECT_FALSE(test::Exists(kBatch));
}

TEST_F(IndexQueueFailure, BatchThatCannotBeToldFromAnotherIsWorkedOnceMore) {
  Install("A");
  test::WriteFile(kBatch, Request(1, ConfOf("A")) + "\n");
  ScriptedDaemon daemon(kSucceed);
  g_open_of_batch_fails = g_open_fails_once = true;
  g_open_error = EMFILE;
  ProcessQueue();
  EXPECT_EQ(daemon.Commands(), Joined({AddCommands("A"), AddCommands("A")}));
  EXPECT_FALSE(test::Exists(kBatch));
}

// Locks.

TEST_F(IndexQueueFailure, SecondProcessorGivesUpAfter64AttemptsAndLeavesTheWork) {
  Enqueue(R"({"op":3})");
  ScriptedDaemon daemon(kSucceed);
  const LockFile other(test::kProcessLock, true);
  const Error error = ThrownBy([] { ProcessQueue(); });
  EXPECT_EQ(error.code, Error::kLockFileError);
  EXPECT_EQ(error.reason, std::string("Exceed max retry, path=") + test::kProcessLock);
  EXPECT_EQ(test::Time().usleeps.size(), 64U);
  EXPECT_EQ(test::ReadFile(kQueue), "{\"op\":3}\n");
  EXPECT_EQ(daemon.Connections(), 0);
}

TEST_F(IndexQueueFailure, HoldsTheProcessLockDuringTheWork) {
  Install("A");
  bool was_free = true;
  test::Time().on_usleep = [&was_free](unsigned) {
    test::Time().on_usleep = nullptr;
    try {
      const LockFile second(test::kProcessLock, false);
    } catch (const Error&) {
      was_free = false;
    }
  };
  CommandsOf({Request(1, ConfOf("A"))});
  EXPECT_FALSE(was_free);
  ExpectUnlocked(test::kProcessLock);
}

TEST_F(IndexQueueFailure, ReleasesTheQueuesLockBeforeTheWork) {
  Install("A");
  test::Time().on_usleep = [](unsigned) {
    test::Time().on_usleep = nullptr;
    ExpectUnlocked(kBatch);  // the file that was locked as the queue
  };
  CommandsOf({Request(1, ConfOf("A"))});
}

TEST_F(IndexQueueFailure, WaitsForAWriterAndTakesItsLineAlong) {
  Install("A");
  ScriptedDaemon daemon(kSucceed);
  auto writers_lock = std::make_unique<LockFile>(kQueue, true);
  test::Time().on_usleep = [&writers_lock](unsigned) {
    if (test::Time().usleeps.size() != 3) return;
    EXPECT_FALSE(test::Exists(kBatch)) << "the queue was moved under a writer's lock";
    test::WriteFile(kQueue, Request(1, ConfOf("A")) + "\n");
    writers_lock.reset();
  };
  ProcessQueue();
  EXPECT_EQ(daemon.Commands(), AddCommands("A"));
  EXPECT_FALSE(test::Exists(kQueue));
}

TEST_F(IndexQueueFailure, WriterThatNeverEndsMakesItGiveUpWithTheQueueInPlace) {
  Enqueue(R"({"op":3})");
  ScriptedDaemon daemon(kSucceed);
  const LockFile writers_lock(kQueue, true);
  const Error error = ThrownBy([] { ProcessQueue(); });
  EXPECT_EQ(error.code, Error::kLockFileError);
  EXPECT_EQ(error.reason, std::string("Exceed max retry, path=") + kQueue);
  EXPECT_EQ(test::ReadFile(kQueue), "{\"op\":3}\n");
  EXPECT_FALSE(test::Exists(kBatch));
  ExpectUnlocked(test::kProcessLock);
}

TEST_F(IndexQueueFailure, LinksInPlaceOfTheQueueFilesAreNoQueue) {
  test::WriteFile("/tmp/elsewhere", "{\"op\":3}\n");
  ASSERT_EQ(symlink("/tmp/elsewhere", kQueue), 0);
  ScriptedDaemon daemon(kSucceed);
  ProcessQueue();
  EXPECT_EQ(daemon.Connections(), 0);
  EXPECT_TRUE(test::Exists(kQueue));
}

}  // namespace
}  // namespace velkor::appindex
