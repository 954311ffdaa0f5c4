// Memory that runs out at any moment of any exported function: the call is done, or throws what
// says so, and the next one finds everything as it should be.
#include <gmock/gmock.h>
#include <json/value.h>
#include <json/writer.h>  // prints values in failure messages
#include <sys/stat.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <climits>
#include <cstdio>
#include <filesystem>
#include <map>
#include <memory>
#include <new>
#include <set>
#include <stdexcept>

#include "appindex/error.h"
#include "appindex/index_mgr.h"
#include "appindex/observer.h"
#include "tests/crash/index_model.h"
#include "tests/reliability/allocations.h"
#include "tests/reliability/environment.h"
#include "tests/reliability/exported_calls.h"
#include "tests/reliability/surroundings.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"

namespace {

using test::ExportedCall;
using test::Shortage;

enum Outcome : int { kDone, kNoMemory, kError, kWrong, kOther, kDied };
constexpr const char* kOutcomes[] = {"done",         "bad_alloc",       "Error",
                                     "wrong result", "other exception", "died"};

// What a process that made a call with too little memory tells.
struct Result {
  Outcome outcome = kDied;
  Outcome next = kDied;  // of the calls after it, with enough memory
  long allocations = 0;  // of the call
  long held = 0;         // blocks, after all of them
  bool surroundings_kept = false;
  bool locks_free = false;
  bool record_whole = false;  // right after the call, that of a rebuild is the old or the new one
};

// A file's mode and content; empty when there is none.
std::string Described(const std::string& path) {
  struct stat status {};
  if (stat(path.c_str(), &status) != 0) return "";
  const std::string mode = std::to_string(status.st_mode);
  return S_ISREG(status.st_mode) ? mode + " " + test::ReadFile(path) : mode;
}

const std::string kNewRecord =
    std::to_string(S_IFREG | 0600) + R"( {"indexed_version":")" + test::kVersion + "\"}\n";

Outcome OutcomeOf(const ExportedCall& call) {
  try {
    call.call();
    return kDone;
  } catch (const std::bad_alloc&) {
    return kNoMemory;
  } catch (const velkor::Error&) {
    return kError;
  } catch (const test::WrongResult&) {
    return kWrong;
  } catch (...) {
    return kOther;
  }
}

Result Attempt(const ExportedCall& call, long n, Shortage shortage) {
  Result result;
  if (call.prepare) call.prepare();
  const std::string before = test::Surroundings();
  const std::string record = Described(test::kRecord);
  const long held = test::BlocksHeld();
  test::BeginShortage(n, shortage);
  result.outcome = OutcomeOf(call);
  result.allocations = test::EndShortage();
  result.surroundings_kept = test::Surroundings() == before;
  result.locks_free = test::HeldLock().empty();
  const std::string record_now = Described(test::kRecord);
  result.record_whole = record_now == record || record_now == kNewRecord;
  result.next = std::max(OutcomeOf(call), OutcomeOf(call));
  result.held = test::BlocksHeld() - held;
  return result;
}

class AllocationFailure : public test::DeviceRootTest {
 protected:
  AllocationFailure() {
    openlog(nullptr, LOG_NDELAY, LOG_USER);  // the log's own descriptor, which stays
    test::PrepareDevice();
  }

  // The same in a process of its own, which knows nothing of the library's work before.
  static Result AttemptInProcess(const ExportedCall& call, long n, Shortage shortage) {
    int ends[2];
    if (pipe(ends) != 0) throw std::runtime_error("no pipe");
    const pid_t child = fork();
    if (child == 0) {
      close(ends[0]);
      const Result result = Attempt(call, n, shortage);
      _exit(write(ends[1], &result, sizeof(result)) == sizeof(result) ? 0 : 1);
    }
    close(ends[1]);
    Result result;
    const bool told = read(ends[0], &result, sizeof(result)) == sizeof(result);
    close(ends[0]);
    waitpid(child, nullptr, 0);
    return told ? result : Result();
  }

  void Reset() {
    for (const char* directory : {"/tmp", "/var/packages/Velkor/etc"}) {
      for (const auto& entry : std::filesystem::directory_iterator(directory)) {
        std::filesystem::remove_all(entry);
      }
    }
    test::WriteFile(test::kRecord, R"({"indexed_version":"the version before"})", 0600);
    model_.Set(initial_);
    daemon_.reset();  // with all the requests that it has kept
    daemon_ = std::make_unique<test::ScriptedDaemon>(
        [this](const Json::Value& request) { return model_.React(request); });
    TakeLog();
  }

  // What there is on disk, described, and in the index when all is done.
  using Outside = std::pair<std::map<std::string, std::string>, test::IndexModel::Indexes>;
  Outside WhatIsOutside() {
    std::map<std::string, std::string> files;
    for (const char* directory : {"/tmp", "/var/packages/Velkor/etc"}) {
      for (const auto& entry : std::filesystem::directory_iterator(directory)) {
        files[entry.path()] = Described(entry.path());
      }
    }
    return {files, model_.Committed()};
  }

  // The lines of the queue that could not be read and were passed over, as the log has them.
  std::vector<std::string> SkippedLines() {
    std::vector<std::string> lines = TakeLog();
    const auto is_other = [](const std::string& line) {
      return line.find("index_mgr:353 ") == std::string::npos;
    };
    lines.erase(std::remove_if(lines.begin(), lines.end(), is_other), lines.end());
    return lines;
  }

  // Everything is as after the undisturbed call, but for what a line that was passed over asked
  // for.
  bool JudgeOutside(Outside expected, const std::string& where) {
    const std::vector<std::string> skipped = SkippedLines();
    EXPECT_TRUE(may_skip_ || skipped.empty()) << where << " made it pass over " << skipped[0];
    for (const std::string& line : skipped) {
      if (line.find(test::ConfOf("App")) != std::string::npos) expected.second = initial_;
    }
    const Outside outside = WhatIsOutside();
    EXPECT_EQ(outside.first, expected.first) << where;
    EXPECT_TRUE(outside.second == expected.second) << where << ": the index";
    return skipped.empty();
  }

  static std::vector<long> Points(long allocations, long at_most) {
    std::vector<long> points;
    const long count = std::min(allocations, at_most);
    for (long i = 0; i < count; ++i) {
      points.push_back(count == 1 ? 1 : 1 + i * (allocations - 1) / (count - 1));
    }
    return points;
  }

  void Judge(const Result& result, const Result& undisturbed, const std::string& where) {
    EXPECT_THAT(result.outcome, testing::AnyOf(kDone, kNoMemory, kError))
        << where << ": " << kOutcomes[result.outcome];
    EXPECT_EQ(result.next, kDone) << where << ", the next call: " << kOutcomes[result.next];
    EXPECT_TRUE(result.surroundings_kept) << where;
    EXPECT_TRUE(result.locks_free) << where;
    EXPECT_TRUE(result.record_whole) << where << ": the record of the rebuild";
    EXPECT_LE(result.held, undisturbed.held + may_keep_) << where << ": blocks of memory";
  }

  // Makes each call with too little memory at so many moments of it at most, of its first `until`
  // allocations.
  void FailEach(const std::vector<ExportedCall>& calls, long at_most, long until = LONG_MAX) {
    at_most = static_cast<long>(
        test::NumberFrom("TEISEIGATRO_ALLOCATIONS", static_cast<unsigned long>(at_most)));
    for (const ExportedCall& call : calls) {
      Reset();
      const Result undisturbed = AttemptInProcess(call, 0, Shortage::kOnce);
      ASSERT_EQ(undisturbed.outcome, kDone) << call.names[0];
      const Outside expected = WhatIsOutside();
      std::map<Outcome, int> outcomes;
      int skipped = 0;
      for (const long n : Points(std::min(undisturbed.allocations, until), at_most)) {
        for (const Shortage shortage : {Shortage::kOnce, Shortage::kForGood}) {
          Reset();
          const Result result = AttemptInProcess(call, n, shortage);
          ++outcomes[result.outcome];
          const std::string where = call.names[0] + ", allocation " + std::to_string(n) +
                                    (shortage == Shortage::kOnce ? " once" : " for good");
          Judge(result, undisturbed, where);
          if (!JudgeOutside(expected, where)) ++skipped;
        }
      }
      Print(call, undisturbed.allocations, outcomes, skipped);
    }
  }

  static void Print(const ExportedCall& call, long allocations,
                    const std::map<Outcome, int>& outcomes, int skipped) {
    std::printf("%s: %ld allocations", call.names[0].c_str(), allocations);
    for (const auto& [outcome, times] : outcomes) {
      std::printf(", %d %s", times, kOutcomes[outcome]);
    }
    if (skipped > 0) std::printf(", %d lines logged and passed over", skipped);
    std::printf("\n");
  }

  // Making a regular expression, as the library does once in a process, Boost puts an entry of
  // three blocks into a cache of its own, where it does not find it again if memory runs out in
  // between.
  static constexpr long kBoostCacheEntry = 3;

  long may_keep_ = 0;      // blocks
  bool may_skip_ = false;  // a line of the queue whose members cannot be copied, which is logged
  test::IndexModel model_;
  test::IndexModel::Indexes initial_ = EmptyIndexes();
  std::unique_ptr<test::ScriptedDaemon> daemon_;

 private:
  static test::IndexModel::Indexes EmptyIndexes() {
    test::IndexModel::Indexes indexes;
    for (const std::string& lang : test::LangsInOrder()) indexes["appindex_" + lang];
    return indexes;
  }
};

TEST_F(AllocationFailure, OfUtilitiesLosesNothing) { FailEach(test::UtilityCalls(), 6); }

TEST_F(AllocationFailure, OfIdentityRecordAndTextsLosesNothing) {
  may_keep_ = kBoostCacheEntry;
  FailEach(test::DeviceCalls(), 6);
}

TEST_F(AllocationFailure, OfTheIndexManagerLosesNothing) {
  may_keep_ = kBoostCacheEntry;
  may_skip_ = true;
  FailEach(test::DaemonCalls(), 5);
}

// Ends the work of the queue when the batch has been read.
class EndsBehindReading : public velkor::appindex::Observer {
 public:
  struct BatchIsRead {};

  EndsBehindReading() { velkor::appindex::SetObserver(this); }
  ~EndsBehindReading() override { velkor::appindex::SetObserver(nullptr); }
  void OnRequest(std::size_t, std::size_t) override { throw BatchIsRead(); }
  void OnWork(std::size_t) override {}
  void OnDocument(const std::string&, const std::string&) override {}
  void OnWait(Wait, std::chrono::milliseconds) override {}
};

// A path so short that it is copied without memory.
TEST_F(AllocationFailure, OfReadingTheQueueForgetsNoRequest) {
  constexpr char kConf[] = "/x/index.conf";
  test::WriteFile(kConf, R"({"app":"X","title":"X"})");
  ExportedCall call{{"a queue with a short path"},
                    [&] { test::Enqueue(test::Request(1, kConf)); },
                    [] {
                      const EndsBehindReading observer;
                      velkor::appindex::ProcessQueue();
                    }};
  Reset();
  const Result reading = AttemptInProcess(call, 0, Shortage::kOnce);
  ASSERT_EQ(reading.outcome, kOther) << "not ended when the batch was read";
  call.call = [] { velkor::appindex::ProcessQueue(); };
  may_keep_ = kBoostCacheEntry;
  FailEach({call}, 30, reading.allocations);
}

TEST(ExportedFunctions, AreAllAmongTheCalls) {
  std::set<std::string> called;
  for (const ExportedCall& call : test::AllCalls()) {
    called.insert(call.names.begin(), call.names.end());
  }
  const std::vector<std::string> exported = test::ExportedNames();
  EXPECT_GT(exported.size(), 60U);
  for (const std::string& name : exported) EXPECT_EQ(called.count(name), 1U) << name;
}

}  // namespace
