// What is told of the queue's locks where something is in their way, and that the library then does
// what is told.
#include "tool/queue_locks.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/inotify.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <string>

#include "appindex/index_mgr.h"
#include "common/unique_fd.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"
#include "tests/unit/tool/status_test_device.h"

namespace tool {
namespace {

using test::kProcessLock;
using test::kQueue;
using ::testing::AllOf;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::Not;
using ::testing::StartsWith;
using velkor::appindex::ProcessQueue;

constexpr uid_t kAnna = 1001;

class QueueLocks : public StatusTestDevice {
 protected:
  static Json::Value ProcessLock(int proc = -1) { return Data(proc)["locks"][0]; }
  static Json::Value QueueLock() { return Data()["locks"][1]; }
};

TEST_F(QueueLocks, HaveNoProblemWhereThereIsNothingOrAFile) {
  EXPECT_FALSE(ProcessLock().isMember("problem"));
  EXPECT_FALSE(QueueLock().isMember("problem"));
  EXPECT_FALSE(test::Exists(kProcessLock));
  EXPECT_FALSE(test::Exists(kQueue));
  test::WriteFile(kProcessLock, "");
  test::Enqueue(R"({"op":3})");
  EXPECT_FALSE(ProcessLock().isMember("problem"));
  EXPECT_FALSE(QueueLock().isMember("problem"));
  EXPECT_THAT(Text(), Not(HasSubstr("No lock")));
}

TEST_F(QueueLocks, DirectoryInPlaceOfTheProcessLockIsToldWithItsCode) {
  test::MakeDirs(kProcessLock);
  const Json::Value lock = ProcessLock();
  EXPECT_EQ(lock["problem"].asString(),
            "Is a directory: nobody can work the queue, all requests wait; remove it: it is made "
            "anew");
  EXPECT_TRUE(lock["fails"].asBool());
  EXPECT_EQ(lock["code"].asInt(), test::ThrownBy(ProcessQueue).code);
  EXPECT_THAT(Text(),
              HasSubstr("No lock         /tmp/velkor_appindex_process.lck\n"
                        "                ! Is a directory: nobody can work the queue, all "
                        "requests wait;\n                  remove it: it is made anew (code "
                        "506)\n"));
}

TEST_F(QueueLocks, FifoInPlaceOfTheProcessLockIsSaidToBeWaitedForAndIsLeftAlone) {
  ASSERT_EQ(mkfifo(kProcessLock, 0600), 0);
  const velkor::UniqueFd watch(inotify_init1(IN_NONBLOCK | IN_CLOEXEC));
  ASSERT_GE(inotify_add_watch(watch.Get(), kProcessLock, IN_OPEN), 0);
  const Json::Value lock = ProcessLock();
  inotify_event opened{};
  EXPECT_EQ(read(watch.Get(), &opened, sizeof(opened)), -1);
  EXPECT_EQ(errno, EAGAIN);
  EXPECT_THAT(lock["problem"].asString(),
              AllOf(StartsWith("it is a FIFO: whoever works the queue waits, without limit, "),
                    EndsWith("; remove it, then start again whoever waits")));
  EXPECT_FALSE(lock["fails"].asBool());
  EXPECT_FALSE(lock.isMember("code"));
  EXPECT_THAT(Text(), AllOf(HasSubstr("! it is a FIFO"), Not(HasSubstr("(code"))));
}

// The kernel's setting is that of a /proc of the test's own.
TEST_F(QueueLocks, FileThatTheKernelProtectsIsToldWithItsOwner) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: gives a file away";
  test::WriteFile("/proc/sys/fs/protected_regular", "1\n");
  const velkor::UniqueFd proc(open("/proc", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  test::WriteFile(kProcessLock, "");
  ASSERT_EQ(chown(kProcessLock, kAnna, 100), 0);
  const Json::Value lock = ProcessLock(proc.Get());
  EXPECT_THAT(
      lock["problem"].asString(),
      AllOf(StartsWith("it belongs to user 1001, and the kernel keeps others from opening it so "),
            EndsWith("; remove it: it is made anew")));
  EXPECT_TRUE(lock["fails"].asBool());
  EXPECT_EQ(lock["code"].asInt(), 506);
}

TEST_F(QueueLocks, OthersAreToldToBecomeRootWhereTheFileIsNotTheirs) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: becomes another user";
  test::WriteFile(kProcessLock, "", 0600);
  test::WriteFile(kQueue, "{\"op\":3}\n", 0600);
  ASSERT_EQ(seteuid(kAnna), 0);
  const Json::Value locks = Data()["locks"];
  ASSERT_EQ(seteuid(0), 0);
  EXPECT_EQ(locks[0]["problem"].asString(),
            "Permission denied: nobody can work the queue, all requests wait; run appindex as "
            "root");
  EXPECT_EQ(locks[1]["problem"].asString(),
            "Permission denied: the queue cannot be taken, its requests wait; run appindex as "
            "root");
  EXPECT_EQ(locks[1]["code"].asInt(), 506);
}

TEST_F(QueueLocks, WhatIsNoRegularFileIsNoQueue) {
  test::ScriptedDaemon daemon;
  const std::string problem =
      "not a regular file: whoever works the queue takes it for none, and does nothing; remove it: "
      "it is made anew";
  test::WriteFile("/file", "{\"op\":3}\n");
  for (void (*make)() :
       {+[] { test::MakeDirs(kQueue); }, +[] { ASSERT_EQ(mkfifo(kQueue, 0600), 0); },
        +[] { ASSERT_EQ(symlink("/file", kQueue), 0); }}) {
    make();
    const Json::Value lock = QueueLock();
    EXPECT_EQ(lock["problem"].asString(), problem);
    EXPECT_FALSE(lock["fails"].asBool());
    EXPECT_THAT(Text(), HasSubstr(std::string("No lock         ") + kQueue + "\n"));
    const int connections = daemon.Connections();
    ProcessQueue();
    EXPECT_EQ(daemon.Connections(), connections);
    EXPECT_TRUE(test::Exists(kQueue));
    remove(kQueue);
  }
}

TEST_F(QueueLocks, WhatCannotBeALockIsToldWithWhatToDo) {
  const std::string effect = ": nobody can work the queue, all requests wait; ";
  ASSERT_EQ(symlink(kProcessLock, kProcessLock), 0);
  EXPECT_EQ(ProcessLock()["problem"].asString(),
            "Too many levels of symbolic links" + effect + "remove it: it is made anew");
  EXPECT_EQ(test::ThrownBy(ProcessQueue).code, 506);

  ASSERT_EQ(unlink(kProcessLock), 0);
  ASSERT_EQ(mknod(kProcessLock, S_IFSOCK | 0600U, 0), 0);
  EXPECT_EQ(ProcessLock()["problem"].asString(),
            "No such device or address" + effect + "remove it: it is made anew");
  EXPECT_EQ(test::ThrownBy(ProcessQueue).code, 506);

  ASSERT_EQ(rename("/tmp", "/away"), 0);
  EXPECT_EQ(ProcessLock()["problem"].asString(),
            "No such file or directory" + effect + "make its directory");
  EXPECT_EQ(test::ThrownBy(ProcessQueue).code, 506);

  test::WriteFile("/tmp", "");
  EXPECT_EQ(ProcessLock()["problem"].asString(),
            "Not a directory" + effect + "see whether the path is right");
  EXPECT_EQ(test::ThrownBy(ProcessQueue).code, 506);
}

TEST_F(QueueLocks, QueueThatCannotBeLookedAtCountsAsNone) {
  const std::string dir = std::filesystem::path(kQueue).parent_path();
  std::filesystem::remove_all(dir);
  test::WriteFile(dir, "");
  EXPECT_EQ(QueueLock()["problem"].asString(),
            "Not a directory: whoever works the queue takes it for none, and does nothing; see "
            "whether the path is right");
  EXPECT_NO_THROW(ProcessQueue());
}

TEST_F(QueueLocks, BatchThatCannotBeBegunIsNotSaidToBeLeftForAnUnknownReason) {
  test::WriteFile(test::kBatch, test::Request(1, test::Install("Good")) + "\n");
  test::MakeDirs(kProcessLock);
  const test::ScriptedDaemon daemon({test::Reply(R"({"success":true,"indexes":[]})")});
  EXPECT_THAT(Text(), AllOf(HasSubstr("Batch left      1 request"), HasSubstr("No lock"),
                            Not(HasSubstr("Left because"))));
}

}  // namespace
}  // namespace tool
