// One piece of work, ended before each of its system calls in turn, and done again while each of
// them fails.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "tests/crash/faults.h"
#include "tests/crash/runs.h"
#include "tests/crash/stepper.h"

namespace test {

// What is fixed and looks like a mistake when a call fails.
struct Excuse {
  bool may_pass_over = false;  // what cannot be read is left out, so the work is asked for anew
  bool may_go_on = false;      // it begins again until the call succeeds
  bool may_keep_descriptor = false;
};

struct Subject {
  std::string name;
  std::function<void()> prepare;        // makes the device what it is before the work
  std::function<void()> act;            // the work, in a process of its own; throws velkor::Error
  std::function<void()> again;          // runs it again, undisturbed
  std::function<void()> ask_anew;       // asks for the work once more, and runs it
  std::function<std::string()> result;  // all that must be the same as when nothing disturbs it
  std::function<std::string()> wrong;   // what must never be, at any moment; empty when all is well
  bool done_when_it_returns = false;    // or only when it has been run again
  std::string files;                    // only calls about files whose paths begin so are counted
  // About a failing call of this number, and what files it concerned.
  std::function<Excuse(const Fault& fault, long number, const std::vector<std::string>& paths)>
      excuse;
};

// Fails the current test where something is not as it must be.
class Stepwise {
 public:
  // `outside_root` as for Stepper.
  Stepwise(Subject subject, int outside_root, Runs runs);

  void Run();

 private:
  struct Point {
    SystemCall call;
    std::string path;
    std::string Text() const { return NameOfCall(call.number) + " " + path; }
  };
  struct Injection {
    std::size_t point;  // from 0
    Fault fault;
  };
  struct Outcome;

  void Record();
  void Kill(std::size_t point);
  void Fail(const Injection& injection);
  void Judge(const Injection& injection, const Outcome& outcome,
             const std::vector<std::string>& paths);
  Outcome Trace(const Stepper::Decide& decide);
  std::vector<std::size_t> Picked() const;
  std::vector<Injection> Injections() const;

  const Subject subject_;
  const Runs runs_;
  Stepper stepper_;
  std::vector<Point> points_;
  std::string expected_;
  Tally tally_;
};

}  // namespace test
