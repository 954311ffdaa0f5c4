// A queue processor that is killed at any step loses no request: the next one makes the index what
// it would have been.
#include <gmock/gmock.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>

#include "appindex/index_mgr.h"
#include "tests/crash/index_model.h"
#include "tests/crash/steps.h"
#include "tests/support/controlled_time.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/support/real_daemon.h"
#include "tests/support/scripted_daemon.h"

namespace velkor::appindex {
namespace {

using test::ConfOf;
using test::Enqueue;
using test::Install;
using test::Request;

// Works the queue in a process of its own that is killed at its n-th step. False when it came to
// its end before that.
bool IsKilledAtStep(int n) {
  const pid_t processor = fork();
  if (processor == 0) {
    test::DieAtStep(n);
    ProcessQueue();
    _exit(0);
  }
  int status = 0;
  EXPECT_EQ(waitpid(processor, &status, 0), processor);
  if (WIFSIGNALED(status) && WTERMSIG(status) == SIGKILL) return true;
  EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0) << "step " << n << ": " << status;
  return false;
}

void EnqueueAll(const std::vector<std::string>& lines) {
  for (const std::string& line : lines) Enqueue(line);
}

class QueueCrash : public test::DeviceRootTest {
 protected:
  // A device on which A and B are indexed, and New is installed and not indexed yet.
  QueueCrash() {
    Install("A");
    Install("B");
    Reindex();
    indexed_ = model_.Committed();
    Install("New");
  }

  // The index that `lines` lead to, and `meanwhile` after them, without any disturbance.
  test::IndexModel::Indexes Undisturbed(const std::vector<std::string>& lines,
                                        const std::vector<std::string>& meanwhile) {
    model_.Set(indexed_);
    EnqueueAll(lines);
    ProcessQueue();
    EnqueueAll(meanwhile);
    ProcessQueue();
    return model_.Committed();
  }

  void ExpectEverythingDone(const test::IndexModel::Indexes& expected, int step) {
    ProcessQueue();
    EXPECT_EQ(model_.Committed(), expected) << "killed at step " << step;
    EXPECT_FALSE(test::Exists(test::kQueue)) << "killed at step " << step;
    EXPECT_FALSE(test::Exists(test::kBatch)) << "killed at step " << step;
  }

  // Kills a processor of `lines` at each of its steps in turn, up to the `last`; `meanwhile` is
  // queued after its end. Returns at how many steps it was killed.
  int KillAtEveryStep(const std::vector<std::string>& lines,
                      const std::vector<std::string>& meanwhile, int last) {
    const test::IndexModel::Indexes expected = Undisturbed(lines, meanwhile);
    for (int step = 1; step <= last; ++step) {
      model_.Set(indexed_);
      EnqueueAll(lines);
      const bool killed = IsKilledAtStep(step);
      EnqueueAll(meanwhile);
      ExpectEverythingDone(expected, step);
      if (!killed || HasFailure()) return step - 1;
    }
    return last;
  }

  test::IndexModel model_;
  test::ScriptedDaemon daemon_{
      [this](const Json::Value& request) { return model_.React(request); }};
  test::IndexModel::Indexes indexed_;
};

constexpr int kToTheEnd = 100000;

TEST_F(QueueCrash, KilledAtAnyStepOfABatchLosesNothing) {
  const int steps = KillAtEveryStep({Request(1, ConfOf("New")), Request(2, ConfOf("A"))},
                                    {Request(2, ConfOf("B"))}, kToTheEnd);
  EXPECT_GE(steps, 21 * 3 + 21 * 2 + 5) << "pauses, exchanges, locks, rename and removal";
}

TEST_F(QueueCrash, KilledAtAnyStepOfARebuildLosesNothing) {
  // Applications that are gone, but for one: their documents must go with the rebuild.
  unlink(ConfOf("A").c_str());
  unlink(ConfOf("B").c_str());
  const int steps = KillAtEveryStep({R"({"op":3})"}, {}, kToTheEnd);
  EXPECT_GE(steps, 21 * 2 + 21 * 2 + 21 + 6);
}

TEST_F(QueueCrash, RequestQueuedAfterTheKillIsCarriedOutAfterTheBatch) {
  EXPECT_EQ(KillAtEveryStep({Request(1, ConfOf("New"))}, {Request(2, ConfOf("New"))}, 10), 10);
  for (const auto& [id, index] : model_.Committed()) EXPECT_EQ(index.count("New"), 0U) << id;
}

TEST_F(QueueCrash, KilledAgainAndAgainALittleLaterGetsThroughInTheEnd) {
  const std::vector<std::string> lines = {Request(1, ConfOf("New")), Request(2, ConfOf("A"))};
  const auto expected = Undisturbed(lines, {});
  model_.Set(indexed_);
  EnqueueAll(lines);
  int kills = 0;
  while (IsKilledAtStep(kills + 1)) ++kills;
  EXPECT_GE(kills, 21 * 3 + 21 * 2);
  ExpectEverythingDone(expected, kills);
}

TEST_F(QueueCrash, KilledProcessorLeavesNoLockBehind) {
  for (int step = 1; step <= 10; ++step) {
    Enqueue(Request(1, ConfOf("A")));
    EXPECT_TRUE(IsKilledAtStep(step));
    test::Time().usleeps.clear();
    { const LockFile process_lock(test::kProcessLock, true); }
    { const LockFile queue_lock(test::kQueue, true); }
    EXPECT_THAT(test::Time().usleeps, ::testing::IsEmpty()) << "killed at step " << step;
  }
}

// The same with the real daemon, at some steps.
class QueueCrashRealDaemon : public test::DeviceRootTest {
 protected:
  static std::vector<std::string> Titles(const std::string& lang) {
    Json::Value data;
    data["id"] = "appindex_" + lang;
    data["query"] = "everything";
    const Json::Value reply = test::RealDaemon::Ask("search", data);
    std::vector<std::string> hits;
    for (const Json::Value& hit : reply["hits"]) {
      hits.push_back(hit["id"].asString() + " " + hit["title"].asString());
    }
    std::sort(hits.begin(), hits.end());
    return hits;
  }

  static void InstallTitled(const std::string& name, const std::string& title) {
    test::WriteFile(ConfOf(name), R"({"app":")" + name + R"(","title":")" + title +
                                      R"(","keywords":["everything"]})");
  }

  test::RealDaemon daemon_{OutsideRootFd(), OutsidePath()};
};

class QueueCrashRealDaemonAt : public QueueCrashRealDaemon,
                               public ::testing::WithParamInterface<int> {};

TEST_P(QueueCrashRealDaemonAt, LosesNothing) {
  InstallTitled("A", "Old");
  InstallTitled("B", "Second");
  Reindex();
  InstallTitled("A", "New");
  EnqueueAll({Request(1, ConfOf("A")), Request(2, ConfOf("B"))});
  EXPECT_TRUE(IsKilledAtStep(GetParam()));
  InstallTitled("C", "Third");
  Enqueue(Request(1, ConfOf("C")));
  ProcessQueue();
  for (const std::string& lang : test::LangsInOrder()) {
    EXPECT_THAT(Titles(lang), ::testing::ElementsAre("A New", "C Third")) << lang;
  }
  EXPECT_FALSE(test::Exists(test::kQueue));
  EXPECT_FALSE(test::Exists(test::kBatch));
}

// Before the rename, in the middle of the additions, before the last commit.
INSTANTIATE_TEST_SUITE_P(Steps, QueueCrashRealDaemonAt, ::testing::Values(3, 36, 109));

}  // namespace
}  // namespace velkor::appindex
