// The queue from its writers to the searches.
#include <gmock/gmock.h>
#include <sys/wait.h>
#include <unistd.h>

#include "appindex/index_mgr.h"
#include "tests/integration/real_device.h"
#include "tests/support/controlled_time.h"

namespace velkor::appindex {
namespace {

using test::ConfOf;
using test::Enqueue;
using test::kBatch;
using test::kQueue;
using test::Request;

class LibraryQueue : public test::RealDeviceTest {
 protected:
  static void ExpectNothingQueued() {
    EXPECT_FALSE(test::Exists(kQueue));
    EXPECT_FALSE(test::Exists(kBatch));
  }
};

TEST_F(LibraryQueue, InstallationsQueuedByAnotherProcessAreFound) {
  const pid_t writer = fork();
  if (writer == 0) {
    Enqueue(R"({"op":3})");
    Enqueue(Request(1, ConfOf("Photos")));
    _exit(0);
  }
  ASSERT_EQ(waitpid(writer, nullptr, 0), writer);
  ProcessQueue();
  ExpectNothingQueued();
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Photos"}));
}

TEST_F(LibraryQueue, InstallsAndRemovesOverSeveralCalls) {
  Enqueue(R"({"op":3})");
  ProcessQueue();
  InstallPackage("Mail", {{"enu", "Mail Server"}});
  Enqueue(Request(1, ConfOf("Mail")));
  Enqueue(Request(2, ConfOf("Photos")));
  ProcessQueue();
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Mail"}));
  Enqueue(Request(2, ConfOf("Mail")));
  Enqueue(Request(1, ConfOf("Photos")));
  ProcessQueue();
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Photos"}));
  ExpectNothingQueued();
}

TEST_F(LibraryQueue, FirstInstallationOfADeviceRebuildsEverything) {
  Enqueue(Request(1, ConfOf("Photos")));
  ProcessQueue();
  ExpectNothingQueued();
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Photos"}));
}

TEST_F(LibraryQueue, RequestQueuedDuringTheWorkIsDoneInTheSameCall) {
  Reindex();
  test::Time().on_usleep = [](unsigned) {
    test::Time().on_usleep = nullptr;
    Enqueue(Request(2, ConfOf("Backup")));
  };
  Enqueue(Request(1, ConfOf("Photos")));
  ProcessQueue();
  EXPECT_EQ(Everything(), Exactly({"Files", "Files?tab=trash", "Photos"}));
  ExpectNothingQueued();
}

TEST_F(LibraryQueue, SecondProcessIsKeptOutWhileTheFirstWorks) {
  Reindex();
  int second_exit = -1;
  test::Time().on_usleep = [&second_exit](unsigned) {
    test::Time().on_usleep = nullptr;
    const pid_t second = fork();
    if (second == 0) _exit(test::ThrownBy([] { ProcessQueue(); }).code == 506 ? 0 : 1);
    int status = 0;
    waitpid(second, &status, 0);
    second_exit = WEXITSTATUS(status);
  };
  Enqueue(Request(2, test::kFilesConf));
  Enqueue(Request(1, ConfOf("Photos")));
  ProcessQueue();
  EXPECT_EQ(second_exit, 0);
  EXPECT_EQ(Everything(), Exactly({"Backup", "Photos"}));
}

}  // namespace
}  // namespace velkor::appindex
