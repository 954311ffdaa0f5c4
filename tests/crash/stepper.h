// A process whose every system call is looked at, and decided about, before it is made.
#pragma once

#include <sys/types.h>

#include <array>
#include <cstdint>
#include <functional>
#include <map>
#include <string>

namespace test {

struct SystemCall {
  long number = -1;  // one of SYS_...
  std::array<std::uint64_t, 6> arguments{};
  pid_t thread = -1;
};

// What becomes of a call.
struct Step {
  enum Kind {
    kGoOn,
    kKill,             // the process dies, as from SIGKILL, and the call is not made
    kFail,             // the call is not made and fails with `error`, or returns 0 if that is 0
    kFailAfterwards,   // it is made and fails with `error` all the same: what close does
    kReplaceArgument,  // it is made with `value` in place of one argument
  };
  Kind kind = kGoOn;
  int error = 0;
  unsigned argument = 0;
  std::uint64_t value = 0;
  bool last = false;  // nothing more is to be decided: the process runs on by itself
};

// How the process ended: as `waitpid` says, or killed because of Step::kKill.
struct End {
  bool killed = false;
  int status = 0;
};

// Traces one process at a time with ptrace, all its threads, but not the processes that it forks.
class Stepper {
 public:
  using Decide = std::function<Step(const SystemCall& call)>;

  // `outside_root` is a descriptor of the directory that holds the system's "proc".
  explicit Stepper(int outside_root) : outside_root_(outside_root) {}

  // Why processes cannot be traced here; empty when they can be.
  static std::string Refusal();

  // Runs `run` in a forked process, which ends with it, and returns when that has ended. `decide`
  // is asked about each system call between two calls of Mark in that process, or after the only
  // one.
  End Run(const std::function<void()>& run, const Decide& decide);

  // In the traced process, on its first thread: calls are looked at from now on, or no longer.
  static void Mark();

  // For `decide`: the file that the call it is asked about concerns, by path or by descriptor;
  // empty when it concerns none.
  std::string PathOf(const SystemCall& call) const;

 private:
  struct Thread {
    Step at_return;  // what is done when its call returns
    bool awaits_return = false;
  };

  void Attach();
  void OnStop(pid_t thread, int status);
  void OnCall(pid_t thread);
  void Enter(const SystemCall& call);
  void Leave(pid_t thread);
  void Resume(pid_t thread, int signal);
  static std::string TextAt(pid_t thread, std::uint64_t address);
  std::string FileOf(std::uint64_t descriptor) const;

  const int outside_root_;
  const Decide* decide_ = nullptr;
  pid_t process_ = -1;
  std::map<pid_t, Thread> threads_;
  int marks_ = 0;
  bool looks_ = false;  // between the two, until the last step
  bool killed_ = false;
};

}  // namespace test
