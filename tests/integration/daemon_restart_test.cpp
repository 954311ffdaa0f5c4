// A search daemon that ends, is killed and comes back between and during the library's calls.
#include <gmock/gmock.h>

#include "appindex/index_mgr.h"
#include "tests/integration/real_device.h"
#include "tests/support/controlled_time.h"

namespace velkor::appindex {
namespace {

using test::ConfOf;
using test::Enqueue;
using test::Exists;
using test::kBatch;
using test::kQueue;
using test::Request;
using ::testing::SizeIs;
using ::testing::StartsWith;

class LibraryAndDaemon : public test::RealDeviceTest {
 protected:
  // The daemon is killed in the n-th pause from now on.
  void KillInPause(std::size_t n) {
    test::Time().usleeps.clear();
    test::Time().on_usleep = [this, n](unsigned) {
      if (test::Time().usleeps.size() == n) daemon_.Kill();
    };
  }

  void ComesBack() {
    test::Time().on_usleep = nullptr;
    daemon_.Start();
  }
};

TEST_F(LibraryAndDaemon, IndexIsThereAfterARestart) {
  Reindex();
  EXPECT_EQ(daemon_.Stop(), 0);
  daemon_.Start();
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Photos"}));
}

TEST_F(LibraryAndDaemon, IndexIsThereAfterAKill) {
  Reindex();
  daemon_.Kill();
  daemon_.Start();
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Photos"}));
}

TEST_F(LibraryAndDaemon, EachCommittedStepSurvivesAKill) {
  Reindex();
  daemon_.Kill();
  daemon_.Start();
  InstallPackage("Mail", {{"enu", "Mail Server"}});
  Add(ConfOf("Mail"), true);
  daemon_.Kill();
  daemon_.Start();
  Del(ConfOf("Photos"), true);
  daemon_.Kill();
  daemon_.Start();
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Mail"}));
}

TEST_F(LibraryAndDaemon, KilledDaemonRefusesConnectionsWhichIsError913) {
  daemon_.Kill();
  ASSERT_TRUE(Exists(test::kSocket));
  const Error error = test::ThrownBy([] { Add(ConfOf("Photos"), true); });
  EXPECT_EQ(error.code, Error::kElasticdRequestError);
  EXPECT_THAT(error.what(), StartsWith("Connect failed, req="));
}

TEST_F(LibraryAndDaemon, StoppedDaemonIsWaitedForFifteenSeconds) {
  EXPECT_EQ(daemon_.Stop(), 0);
  ASSERT_FALSE(Exists(test::kSocket));
  EXPECT_EQ(test::ThrownBy([] { Del(ConfOf("Photos"), true); }).code, Error::kElasticdRequestError);
  EXPECT_EQ(test::Time().sleeps, std::vector<unsigned>(15, 1));
}

TEST_F(LibraryAndDaemon, DaemonThatComesBackInTimeIsUsed) {
  Reindex();
  EXPECT_EQ(daemon_.Stop(), 0);
  test::Time().on_sleep = [this](unsigned) {
    if (test::Time().sleeps.size() == 3) daemon_.Start();
  };
  Del(ConfOf("Photos"), true);
  EXPECT_THAT(test::Time().sleeps, SizeIs(3));
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash"}));
}

TEST_F(LibraryAndDaemon, StoppedDaemonLeavesTheQueueForLater) {
  Reindex();
  EXPECT_EQ(daemon_.Stop(), 0);
  Enqueue(Request(2, ConfOf("Photos")));
  ProcessQueue();
  EXPECT_TRUE(Exists(kQueue));
  daemon_.Start();
  ProcessQueue();
  EXPECT_FALSE(Exists(kQueue));
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash"}));
}

TEST_F(LibraryAndDaemon, DaemonKilledDuringABatchIsError913AndTheBatchIsDoneLater) {
  Reindex();
  InstallPackage("Mail", {{"enu", "Mail Server"}});
  Enqueue(Request(1, ConfOf("Mail")));
  Enqueue(Request(2, ConfOf("Photos")));
  KillInPause(10);
  EXPECT_EQ(test::ThrownBy([] { ProcessQueue(); }).code, Error::kElasticdRequestError);
  EXPECT_TRUE(Exists(kBatch));
  ComesBack();
  ProcessQueue();
  EXPECT_FALSE(Exists(kBatch));
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Mail"}));
}

TEST_F(LibraryAndDaemon, DaemonKilledDuringARebuildIsRebuiltByTheNextCall) {
  Reindex();
  test::WriteFile(test::kRecord, R"({"indexed_version":"old"})");
  unlink(ConfOf("Photos").c_str());
  Enqueue(R"({"op":3})");
  KillInPause(30);
  EXPECT_EQ(test::ThrownBy([] { ProcessQueue(); }).code, Error::kElasticdRequestError);
  EXPECT_EQ(test::Parse(test::ReadFile(test::kRecord))["indexed_version"], "old");
  ComesBack();
  ProcessQueue();
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash"}));
  EXPECT_EQ(test::Parse(test::ReadFile(test::kRecord))["indexed_version"], test::kVersion);
}

}  // namespace
}  // namespace velkor::appindex
