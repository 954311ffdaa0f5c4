#include "tests/crash/stepwise.h"

#include <gtest/gtest.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include <iostream>
#include <new>
#include <utility>

#include "appindex/error.h"
#include "tests/crash/process_state.h"

namespace test {
namespace {

// Calls that fail may make the work longer, by waiting for the daemon at each request, but not so
// many times as long.
constexpr std::size_t kMostRounds = 12;

// What the process of the work tells the one that traces it.
struct Report {
  enum Kind { kNothing, kDone, kError, kOther };
  Kind kind;
  int code;
  char text[4000];
  char changes[4000];
  char kept[4000];
};

void Put(char (&to)[4000], const std::string& text) { to[text.copy(to, sizeof(to) - 1)] = '\0'; }

Report& SharedReport() {
  static Report* const report = [] {
    void* const memory =
        mmap(nullptr, sizeof(Report), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    return new (memory) Report{};
  }();
  return *report;
}

void RunAndReport(const std::function<void()>& act) {
  Report& report = SharedReport();
  const ProcessState before = ProcessState::Now();
  Report::Kind kind = Report::kDone;
  int code = 0;
  std::string text;
  Stepper::Mark();
  try {
    act();
  } catch (const velkor::Error& error) {
    kind = Report::kError;
    code = error.code;
    text = error.what();
  } catch (const std::exception& error) {
    kind = Report::kOther;
    text = error.what();
  }
  Stepper::Mark();
  report.code = code;
  Put(report.text, text);
  const ProcessState after = ProcessState::Now();
  Put(report.changes, before.Changes(after));
  Put(report.kept, before.Kept(after));
  report.kind = kind;
}

// In a process of its own: what the C library remembers in this one must not change the calls that
// later runs make.
void RunApart(const std::function<void()>& work) {
  const pid_t child = fork();
  if (child == 0) {
    try {
      work();
    } catch (const std::exception& error) {
      std::cerr << error.what() << std::endl;
      _exit(1);
    }
    _exit(0);
  }
  int status = -1;
  EXPECT_EQ(waitpid(child, &status, 0), child);
  EXPECT_EQ(status, 0) << "undisturbed, it fails";
}

}  // namespace

struct Stepwise::Outcome {
  End end;
  Report report{};
};

Stepwise::Stepwise(Subject subject, int outside_root, Runs runs)
    : subject_(std::move(subject)), runs_(runs), stepper_(outside_root) {}

void Stepwise::Run() {
  tally_.subject = subject_.name;
  Record();
  const std::vector<std::size_t> picked = Picked();
  tally_.points = picked.size();
  for (const std::size_t i : runs_.Sample(picked.size(), runs_.kills)) {
    if (testing::Test::HasFailure()) return;
    Kill(picked[i]);
  }
  const std::vector<Injection> injections = Injections();
  tally_.possible = injections.size();
  for (const std::size_t i : runs_.Sample(injections.size(), runs_.faults)) {
    if (testing::Test::HasFailure()) return;
    Fail(injections[i]);
  }
  tally_.Print();
}

// The undisturbed run.
void Stepwise::Record() {
  subject_.prepare();
  subject_.again();  // and what a first run leaves in the process, once
  subject_.prepare();
  const Outcome outcome = Trace([this](const SystemCall& call) {
    if (!IsPassedOver(call)) points_.push_back({call, stepper_.PathOf(call)});
    return Step{};
  });
  ASSERT_EQ(outcome.report.kind, Report::kDone) << outcome.report.text;
  EXPECT_STREQ(outcome.report.changes, "");
  EXPECT_STREQ(outcome.report.kept, "");
  expected_ = subject_.result();
}

void Stepwise::Kill(std::size_t point) {
  SCOPED_TRACE("killed before call " + std::to_string(point) + ", " + points_[point].Text());
  subject_.prepare();
  std::size_t next = 0;
  const Outcome outcome = Trace([&](const SystemCall& call) {
    Step step;
    if (IsPassedOver(call) || next++ != point) return step;
    step.kind = Step::kKill;
    return step;
  });
  ++(outcome.end.killed ? tally_.killed : tally_.survived);
  // One thread does the work: it makes the same calls in every run.
  EXPECT_TRUE(outcome.end.killed) << "it made " << next << " calls";
  EXPECT_EQ(subject_.wrong(), "");
  RunApart(subject_.again);
  EXPECT_EQ(subject_.result(), expected_);
}

void Stepwise::Fail(const Injection& injection) {
  const Point& point = points_[injection.point];
  const Fault& fault = injection.fault;
  SCOPED_TRACE("call " + std::to_string(injection.point) + ", " + point.Text() + ": " +
               fault.Text(point.call.number));
  subject_.prepare();
  std::size_t next = 0;
  std::vector<std::string> paths;
  const std::size_t many = kMostRounds * points_.size();
  const Outcome outcome = Trace([&](const SystemCall& call) {
    Step step;
    if (IsPassedOver(call)) return step;
    const std::size_t at = next++;
    if (at > many) {
      step.kind = Step::kKill;
      return step;
    }
    const bool begins = at == injection.point;
    const bool goes_on = at > injection.point && fault.for_good;
    if (call.number != point.call.number || !(begins || goes_on) || !MayFailSo(call, fault)) {
      return step;
    }
    paths.push_back(stepper_.PathOf(call));
    return fault.Inject(call);
  });
  ++tally_.injected;
  EXPECT_FALSE(paths.empty()) << "the call was not met";
  Judge(injection, outcome, paths);
}

void Stepwise::Judge(const Injection& injection, const Outcome& outcome,
                     const std::vector<std::string>& paths) {
  const Excuse excuse =
      subject_.excuse(injection.fault, points_[injection.point].call.number, paths);
  if (outcome.end.killed) {
    EXPECT_TRUE(excuse.may_go_on) << "it goes on and on";
  } else {
    EXPECT_EQ(outcome.end.status, 0) << "it died";
    EXPECT_TRUE(outcome.report.kind == Report::kDone || outcome.report.kind == Report::kError)
        << outcome.report.text;
  }
  EXPECT_STREQ(outcome.report.changes, "");
  if (!excuse.may_keep_descriptor) {
    EXPECT_STREQ(outcome.report.kept, "") << "descriptors that it keeps";
  }
  EXPECT_EQ(subject_.wrong(), "");
  if (subject_.done_when_it_returns && outcome.report.kind == Report::kDone) {
    EXPECT_EQ(subject_.result(), expected_) << "before it is run again";
  }
  RunApart(excuse.may_pass_over ? subject_.ask_anew : subject_.again);
  EXPECT_EQ(subject_.result(), expected_);
}

Stepwise::Outcome Stepwise::Trace(const Stepper::Decide& decide) {
  SharedReport() = Report{};
  Outcome outcome;
  outcome.end = stepper_.Run([this] { RunAndReport(subject_.act); }, decide);
  outcome.report = SharedReport();
  return outcome;
}

std::vector<std::size_t> Stepwise::Picked() const {
  std::vector<std::size_t> picked;
  for (std::size_t i = 0; i < points_.size(); ++i) {
    if (points_[i].path.compare(0, subject_.files.size(), subject_.files) == 0) picked.push_back(i);
  }
  return picked;
}

std::vector<Stepwise::Injection> Stepwise::Injections() const {
  std::vector<Injection> injections;
  for (const std::size_t i : Picked()) {
    for (const Fault& fault : FaultsOf(points_[i].call)) injections.push_back({i, fault});
  }
  return injections;
}

}  // namespace test
