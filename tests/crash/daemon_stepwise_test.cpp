// The search daemon, killed before each of its system calls that leave something behind: on the
// disk, or with a client. Then the same while calls that concern its files fail, once and for good.
// What it has answered is true afterwards, nothing is damaged, and the same requests lead to the
// same files again.
#include <fcntl.h>
#include <sys/syscall.h>
#include <sys/wait.h>

#include <algorithm>
#include <set>

#include "tests/crash/daemon_stepwise.h"
#include "tests/crash/faults.h"
#include "tests/crash/runs.h"

namespace test {
namespace {

bool Makes(const SystemCall& call) {
  return call.number == SYS_openat && (call.arguments[2] & (O_CREAT | O_TRUNC)) != 0;
}

// Whether a process that dies before the call leaves something else behind than one that dies after
// it: files, or what a client has been told. Of the files those of the root count.
bool Lasts(const SystemCall& call) {
  switch (call.number) {
    case SYS_write:
    case SYS_pwrite64:
    case SYS_fsync:
    case SYS_fdatasync:
    case SYS_ftruncate:
    case SYS_unlinkat:
    case SYS_mkdirat:
    case SYS_fchmod:
    case SYS_bind:
    case SYS_sendto:
    case SYS_sendmsg:
#if defined(__x86_64__)
    case SYS_rename:
    case SYS_unlink:
    case SYS_mkdir:
    case SYS_chmod:
#endif
      return true;
    default:
      return Makes(call);
  }
}

// Each takes a fraction of a second.
const Runs kFew{2, 2};

class DaemonKilled : public DaemonStepwise {
 protected:
  void KillAtEachPoint(const std::string& subject, const Course& course) {
    const Runs runs = Runs::FromEnvironment(kFew);
    Tally tally;
    tally.subject = subject;
    const Attempt undisturbed = RunTo(std::nullopt, course, tally.points);
    ASSERT_EQ(undisturbed.codes, std::vector<int>(Work().size(), 0));
    ASSERT_EQ(undisturbed.end.status, 0);
    ExpectFound(ModelOf(undisturbed, course));
    const std::vector<std::string> files = DoAgain();

    for (const std::size_t point : runs.Sample(tally.points, runs.kills)) {
      SCOPED_TRACE("killed before call " + std::to_string(point));
      std::size_t count = 0;
      const Attempt attempt = RunTo(point, course, count);
      ++(attempt.end.killed ? tally.killed : tally.survived);
      // Its threads do not work at the same time, for the requests come one after the other: it
      // makes the same calls in every run.
      EXPECT_TRUE(attempt.end.killed) << "it made " << count << " calls";
      for (const int code : attempt.codes) EXPECT_TRUE(code == 0 || code == DaemonModel::kNoReply);
      ExpectFound(ModelOf(attempt, course));
      EXPECT_EQ(DoAgain(), files);
      if (HasFailure()) return;
    }
    tally.Print();
  }

 private:
  // Kills it before the call `last`, and counts its calls.
  Attempt RunTo(std::optional<std::size_t> last, const Course& course, std::size_t& count) {
    const auto decide = [&](const SystemCall& call) {
      Step step;
      if (IsCounted(call, Lasts) && count++ == last) step.kind = Step::kKill;
      return step;
    };
    return Run(decide, course);
  }
};

TEST_F(DaemonKilled, LosesNothing) { KillAtEachPoint("daemon", {}); }

// Idle, it saves which indexes there are, removes the files of deleted ones and brings changes on
// their way, all outside of commits.
TEST_F(DaemonKilled, LosesNothingWithIdleTimes) {
  Course course;
  course.idles = true;
  KillAtEachPoint("daemon_idle", course);
}

// Calls that concern files: those that leave something behind, and those that look at it.
bool ConcernsFiles(const SystemCall& call) {
  switch (call.number) {
    case SYS_openat:
    case SYS_read:
    case SYS_pread64:
    case SYS_close:
    case SYS_newfstatat:
    case SYS_getdents64:
    case SYS_flock:
    case SYS_fcntl:
      return true;
    case SYS_bind:
    case SYS_sendto:
    case SYS_sendmsg:
      return false;
    default:
      return Lasts(call);
  }
}

class DaemonFailing : public DaemonStepwise {
 protected:
  struct Injection {
    std::size_t point;
    long number;
    Fault fault;
  };

  DaemonFailing() { course_.deletes = true; }

  // The undisturbed run, and all that may fail in it.
  std::vector<Injection> Record() {
    std::vector<Injection> injections;
    std::size_t points = 0;
    const Attempt undisturbed = Run(
        [&](const SystemCall& call) {
          if (!IsCounted(call, ConcernsFiles)) return Step{};
          for (const Fault& fault : FaultsOf(call))
            injections.push_back({points, call.number, fault});
          ++points;
          return Step{};
        },
        course_);
    EXPECT_EQ(undisturbed.codes, std::vector<int>(Work().size(), 0));
    EXPECT_EQ(undisturbed.codes_of_deletions, (std::vector<int>{601, 0, 0}));
    ExpectFound(ModelOfEnd(undisturbed, course_));
    return injections;
  }

  void Fail(const Injection& injection) {
    std::size_t next = 0;
    std::size_t hits = 0;
    std::set<std::size_t> unsynced;  // requests during which a sync failed
    const Attempt attempt = Run(
        [&](const SystemCall& call) {
          if (!IsCounted(call, ConcernsFiles)) return Step{};
          const std::size_t at = next++;
          const bool in_turn =
              at == injection.point || (injection.fault.for_good && at > injection.point);
          if (!in_turn || call.number != injection.number || !MayFailSo(call, injection.fault)) {
            return Step{};
          }
          ++hits;
          const bool syncs = call.number == SYS_fsync || call.number == SYS_fdatasync;
          if (syncs && Asked()) unsynced.insert(*Asked());
          Step step = injection.fault.Inject(call);
          step.last = false;  // idle times are to be kept from it to the end
          return step;
        },
        course_);
    // It makes the same calls in every run, up to the one that fails.
    EXPECT_GT(hits, 0U) << "the call was not met";
    ExpectUpright(attempt);
    ExpectSynced(attempt, unsynced);
    ExpectFound(ModelOfEnd(attempt, course_));
    TakeKeptFiles();
    ExpectFound(ModelOf(attempt, course_));
  }

 private:
  // A daemon that cannot begin says so and ends; one that has begun answers every request.
  void ExpectUpright(const Attempt& attempt) const {
    EXPECT_TRUE(WIFEXITED(attempt.end.status)) << attempt.end.status;
    if (!attempt.ready) {
      EXPECT_NE(WEXITSTATUS(attempt.end.status), 0);
      return;
    }
    EXPECT_EQ(attempt.codes.size(), Work().size());
    for (const auto& codes : {attempt.codes, attempt.codes_of_deletions}) {
      EXPECT_EQ(std::count(codes.begin(), codes.end(), DaemonModel::kNoReply), 0);
    }
    EXPECT_EQ(attempt.open_files, std::vector<std::string>{Outside("/var/lib/tovoelasticd/lock")});
  }

  // What a failed sync leaves on the disk can be seen after a power cut alone. But nobody may be
  // told that it is there.
  static void ExpectSynced(const Attempt& attempt, const std::set<std::size_t>& unsynced) {
    std::vector<int> codes = attempt.codes;
    codes.insert(codes.end(), attempt.codes_of_deletions.begin(), attempt.codes_of_deletions.end());
    for (const std::size_t request : unsynced) {
      ASSERT_LT(request, codes.size());
      EXPECT_NE(codes[request], 0) << "request " << request;
    }
  }

  Course course_;
};

TEST_F(DaemonFailing, LosesNothing) {
  const Runs runs = Runs::FromEnvironment(kFew);
  Tally tally;
  tally.subject = "daemon_faults";
  const std::vector<Injection> injections = Record();
  const std::vector<std::string> files = DoAgain();
  tally.possible = injections.size();
  for (const std::size_t i : runs.Sample(injections.size(), runs.faults)) {
    if (HasFailure()) return;
    const Injection& injection = injections[i];
    SCOPED_TRACE("call " + std::to_string(injection.point) + ": " +
                 injection.fault.Text(injection.number));
    Fail(injection);
    ++tally.injected;
    EXPECT_EQ(DoAgain(), files);
  }
  if (!HasFailure()) tally.Print();
}

}  // namespace
}  // namespace test
