// 32 writers and 4 processors, killed at random: every request that was written is carried out.
#include <gtest/gtest.h>

#include <climits>
#include <cstdio>

#include "appindex/error.h"
#include "appindex/index_mgr.h"
#include "tests/reliability/crowd.h"
#include "tests/reliability/environment.h"
#include "tests/reliability/id_daemon.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"

namespace {

using test::Asked;
using test::Crowd;

constexpr int kWriters = 32;
constexpr int kProcessors = 4;

class ManyAtOnce : public test::DeviceRootTest {
 protected:
  // Applications of which the index of some language says something else than was asked for.
  int CountWrong(const std::map<std::string, Asked>& applications) {
    const auto committed = daemon_.Committed();
    int wrong = 0;
    for (const auto& [name, asked] : applications) {
      std::size_t languages = 0;
      for (const auto& [id, documents] : committed) languages += documents.count(name);
      const bool lost =
          asked.added && !asked.removal_begun && languages != test::LangsInOrder().size();
      const bool stayed = asked.removed && languages != 0;
      if (lost || stayed) ++wrong;
    }
    return wrong;
  }

  void RunAndCompare(const Crowd::Limits& limits) {
    const unsigned seed = test::Seed();
    Crowd crowd(limits, seed);
    crowd.Run();
    velkor::appindex::ProcessQueue();  // whoever was told of the last requests may be dead
    const Crowd::Figures& counted = crowd.Counted();
    const int wrong = CountWrong(crowd.Applications());
    std::printf(
        "many at once: seed %u, %d writers and %d processors, %d requests written, %d kills (%d of "
        "processors), %d batches of %d lines, %s, torn lines %d\n",
        seed, limits.writers, limits.processors, counted.requests,
        counted.killed_writers + counted.killed_processors, counted.killed_processors,
        counted.batches, counted.lines, wrong == 0 ? "union carried out" : "UNION NOT CARRIED OUT",
        counted.torn_lines);
    EXPECT_EQ(wrong, 0);
    EXPECT_EQ(counted.torn_lines, 0);
    EXPECT_EQ(counted.failures, 0) << "processes that failed by themselves";
    EXPECT_GT(counted.killed_writers, 0);
    EXPECT_GT(counted.killed_processors, 0);
    EXPECT_GE(counted.requests, limits.writers);
    EXPECT_FALSE(test::Exists(test::kQueue));
    EXPECT_FALSE(test::Exists(test::kBatch));
  }

  test::IdDaemon daemon_;
};

// A few requests of each writer and so many kills; or for as many seconds as the environment says.
TEST_F(ManyAtOnce, EveryRequestIsCarriedOutWhoeverIsKilled) {
  constexpr double kNoEnd = 1e6;
  const unsigned long seconds = test::NumberFrom("TEISEIGATRO_STRESS_SECONDS", 0);
  if (seconds == 0) {
    RunAndCompare({kWriters, kProcessors, 5, 40, kNoEnd});
  } else {
    RunAndCompare({kWriters, kProcessors, INT_MAX, INT_MAX, static_cast<double>(seconds)});
  }
}

}  // namespace
