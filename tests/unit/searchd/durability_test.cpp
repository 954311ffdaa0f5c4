// What is on disk when the daemon says so, and what is there after an end at any moment.
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <csignal>
#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "host/searchd/index.h"
#include "host/searchd/json_text.h"
#include "host/searchd/registry.h"
#include "host/searchd/request_error.h"
#include "tests/support/device_root_test.h"
#include "tests/unit/searchd/disk_calls.h"

namespace searchd {
namespace {

namespace fs = std::filesystem;

constexpr char kPath[] = "/var/packages/Velkor/etc/indexes/enu";
constexpr char kRegistryFile[] = "/var/lib/tovoelasticd/indexes.json";

IndexDefinition Definition(const std::string& id) {
  return {id, kPath, ParseJson(R"({"property_id":"id"})")};
}

class DurabilityTest : public test::DeviceRootTest {
 protected:
  std::unique_ptr<Index> MakeIndex() {
    PrepareIndexDirectory(kPath, true);
    return std::make_unique<Index>(Definition("a"), checks_, DatabaseCheck::Files::kMade, crowded_);
  }

  // As the daemon does at its start.
  std::unique_ptr<Index> FindIndex() {
    return std::make_unique<Index>(Definition("a"), checks_, DatabaseCheck::Files::kFound,
                                   crowded_);
  }

  static void Upsert(Index& index, int documents) {
    for (int i = 0; i < documents; ++i) {
      const std::string id = std::to_string(i);
      index.Upsert(id, ParseJson(R"({"id":")" + id + R"(","title":"File Station"})"), 100);
    }
  }

  static void ExpectSynced() {
    EXPECT_FALSE(disk_calls.IsUnsynced(kPath));
    for (const auto& entry : fs::directory_iterator(kPath)) {
      EXPECT_FALSE(disk_calls.IsUnsynced(entry.path())) << entry.path();
    }
  }

  // Runs `work` in processes that are killed at its first, second ... call that changes the disk,
  // and calls `look` with whether the work was done before, until a process comes to its end.
  static void KillAtEachStep(const std::function<void()>& work,
                             const std::function<void(bool done)>& look) {
    bool done = false;
    int steps = 0;
    while (!done && !HasFailure()) {
      ++steps;
      const pid_t child = fork();
      if (child == 0) {
        disk_calls.die_at = steps;
        work();
        _exit(0);
      }
      int status = 0;
      ASSERT_EQ(waitpid(child, &status, 0), child);
      done = WIFEXITED(status) && WEXITSTATUS(status) == 0;
      ASSERT_TRUE(done || (WIFSIGNALED(status) && WTERMSIG(status) == SIGKILL));
      look(done);
    }
    EXPECT_GT(steps, 3) << "there was nothing to kill";
  }

  CheckProcess checks_{STDERR_FILENO};
  std::atomic<int> crowded_ = 0;
};

TEST_F(DurabilityTest, CommittedChangesAreSynced) {
  const std::unique_ptr<Index> index = MakeIndex();
  for (int i = 1; i <= 3; ++i) {
    Upsert(*index, 40 * i);
    index->ApplyChanges();
    disk_calls = DiskCalls();
    index->Commit();
    EXPECT_TRUE(disk_calls.IsChanged(kPath));
    for (const char* name : {"iamglass", "postlist.glass", "docdata.glass", "termlist.glass"}) {
      EXPECT_TRUE(disk_calls.IsChanged(std::string(kPath) + "/" + name)) << name;
    }
    ExpectSynced();
  }
  EXPECT_EQ(index->DocumentCount(), 120U);
}

TEST_F(DurabilityTest, CommitFailsWhenTheDiskDoes) {
  const std::unique_ptr<Index> index = MakeIndex();
  Upsert(*index, 1);
  index->Commit();
  Upsert(*index, 40);
  disk_calls.sync_error = EIO;
  try {
    index->Commit();
    ADD_FAILURE() << "a commit that is not on disk succeeded";
  } catch (const RequestError& e) {
    EXPECT_EQ(e.GetCode(), Code::kStorage);
    EXPECT_NE(std::string(e.what()).find(kPath), std::string::npos) << e.what();
  }
  disk_calls.sync_error = 0;
  Upsert(*index, 2);
  index->Commit();
  ExpectSynced();
  EXPECT_GE(index->DocumentCount(), 2U);
}

TEST_F(DurabilityTest, CommitIsDoneAsAWholeOrNotAtAllWhereverItIsKilled) {
  {
    const std::unique_ptr<Index> index = MakeIndex();
    Upsert(*index, 5);
    index->Commit();
  }
  const auto commit_more = [&] {
    const std::unique_ptr<Index> index = FindIndex();
    Upsert(*index, 40);
    index->Commit();
  };
  KillAtEachStep(commit_more, [&](bool done) {
    const auto documents = FindIndex()->DocumentCount();
    EXPECT_TRUE(documents == 40 || (documents == 5 && !done)) << documents;
    if (documents == 5 || done) return;
    // Committed, but the process did not come to say so: again from the start.
    const std::unique_ptr<Index> index = MakeIndex();
    Upsert(*index, 5);
    index->Commit();
  });
}

TEST_F(DurabilityTest, RegistryIsSynced) {
  test::MakeDirs("/var/lib/tovoelasticd");
  Registry(kRegistryFile).Save({RegistryEntry(Definition("a"))});
  EXPECT_TRUE(disk_calls.IsChanged(kRegistryFile));
  EXPECT_TRUE(disk_calls.IsChanged("/var/lib/tovoelasticd"));
  EXPECT_FALSE(disk_calls.IsUnsynced(kRegistryFile));
  EXPECT_FALSE(disk_calls.IsUnsynced("/var/lib/tovoelasticd"));
}

TEST_F(DurabilityTest, RegistryStaysAsItWasWhenTheDiskFails) {
  test::MakeDirs("/var/lib/tovoelasticd");
  const Registry registry(kRegistryFile);
  registry.Save({RegistryEntry(Definition("a"))});
  disk_calls.sync_error = EIO;
  EXPECT_THROW(registry.Save({}), RequestError);
  disk_calls.sync_error = 0;
  std::string damage;
  EXPECT_EQ(registry.Load(damage).size(), 1U);
  EXPECT_EQ(damage, "");
}

TEST_F(DurabilityTest, RegistryIsTheOldOrTheNewOneWhereverItsWriterIsKilled) {
  test::MakeDirs("/var/lib/tovoelasticd");
  const Registry registry(kRegistryFile);
  const std::vector<std::string> before = {RegistryEntry(Definition("a"))};
  const std::vector<std::string> after = {RegistryEntry(Definition("a")),
                                          RegistryEntry(Definition("b"))};
  registry.Save(before);
  KillAtEachStep([&] { registry.Save(after); },
                 [&](bool done) {
                   std::string damage;
                   const std::size_t indexes = registry.Load(damage).size();
                   EXPECT_EQ(damage, "");
                   EXPECT_TRUE(indexes == 2 || (indexes == 1 && !done)) << indexes;
                   registry.Save(before);
                 });
}

}  // namespace
}  // namespace searchd
