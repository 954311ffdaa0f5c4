// Acting as another user while each system call fails, once and for good. The process is afterwards
// who it was before, or wholly the other user where only the way back has failed and was said to
// have; it is never somebody between the two.
#include <grp.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <functional>
#include <vector>

#include "appindex/error.h"
#include "appindex/utilities/credentials.h"
#include "tests/crash/faults.h"
#include "tests/crash/process_state.h"
#include "tests/crash/stepper.h"
#include "tests/support/device_root_test.h"

namespace {

using test::Fault;
using test::ProcessState;
using test::Step;
using test::SystemCall;
using velkor::sdk::SDKCredentials;

struct User {
  uid_t uid;
  gid_t gid;
};
constexpr User kRoot{0, 0};
constexpr User kCaller{510, 510};  // Velkor
constexpr User kAnna{1001, 100};

// Like a service of the device: root's process, in which another user acts.
bool ActAs(const User& user) {
  return seteuid(0) == 0 && setgroups(1, &user.gid) == 0 && setegid(user.gid) == 0 &&
         seteuid(user.uid) == 0;
}

// How the work ended, and who the process is then; together the exit status of the process.
enum Way { kDone, kDidNotSwitch, kDidNotSwitchBack };
enum Who { kCallerStill, kOther, kSomebodyElse };

int StatusOf(Way way, Who who) { return 10 * (way + 1) + who; }

struct Work {
  User other;
  // Switches, calls its argument, and switches back.
  std::function<void(const std::function<void()>& switched)> act;
};

// In the process that is traced.
[[noreturn]] void RunAndExit(const Work& work) {
  if (!ActAs(work.other)) _exit(1);
  const ProcessState as_other = ProcessState::Now();
  if (!ActAs(kRoot) || !ActAs(kCaller)) _exit(1);
  const ProcessState before = ProcessState::Now();
  Way way = kDidNotSwitch;
  test::Stepper::Mark();
  try {
    work.act([&] { way = kDidNotSwitchBack; });
    way = kDone;
  } catch (const velkor::Error& error) {
    if (error.code != velkor::Error::kCredentialsError) _exit(1);
  }
  test::Stepper::Mark();
  const ProcessState after = ProcessState::Now();
  if (!before.Kept(after).empty()) _exit(1);
  if (before.Changes(after).empty()) _exit(StatusOf(way, kCallerStill));
  _exit(StatusOf(way, as_other.Changes(after).empty() ? kOther : kSomebodyElse));
}

class CredentialsStepwise : public test::DeviceRootTest {
 protected:
  void SetUp() override {
    if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: begins as another user";
    const std::string refusal = test::Stepper::Refusal();
    if (!refusal.empty()) GTEST_SKIP() << refusal;
  }

  // `undisturbed` is who the process is when nothing fails.
  void Run(const Work& work, Who undisturbed) {
    std::vector<SystemCall> calls;
    const test::End end = Trace(work, [&](const SystemCall& call) {
      calls.push_back(call);
      return Step{};
    });
    ASSERT_EQ(StatusOf(end), StatusOf(kDone, undisturbed));
    std::size_t injected = 0;
    for (std::size_t i = 0; i < calls.size(); ++i) {
      if (test::IsPassedOver(calls[i])) continue;
      for (const Fault& fault : test::FaultsOf(calls[i])) {
        SCOPED_TRACE("call " + std::to_string(i) + ": " + fault.Text(calls[i].number));
        ++injected;
        Fail(work, undisturbed, i, calls[i].number, fault);
      }
    }
    EXPECT_GT(injected, 0U);
  }

 private:
  test::End Trace(const Work& work, const test::Stepper::Decide& decide) {
    return stepper_.Run([&] { RunAndExit(work); }, decide);
  }

  static int StatusOf(const test::End& end) {
    return WIFEXITED(end.status) ? WEXITSTATUS(end.status) : -WTERMSIG(end.status);
  }
  static int StatusOf(Way way, Who who) { return ::StatusOf(way, who); }

  void Fail(const Work& work, Who undisturbed, std::size_t point, long number, const Fault& fault) {
    std::size_t next = 0;
    bool met = false;
    const test::End end = Trace(work, [&](const SystemCall& call) {
      const std::size_t at = next++;
      const bool in_turn = at == point || (fault.for_good && at > point);
      if (!in_turn || call.number != number || !MayFailSo(call, fault)) return Step{};
      met = true;
      return fault.Inject(call);
    });
    EXPECT_TRUE(met);
    const int status = StatusOf(end);
    const bool undone = status == StatusOf(kDidNotSwitch, kCallerStill);
    const bool done = status == StatusOf(kDone, undisturbed);
    const bool stays = status == StatusOf(kDidNotSwitchBack, kOther);
    // Who can be neither the one nor the other does not go on at all.
    const bool ended = status == -SIGABRT && fault.for_good;
    EXPECT_TRUE(undone || done || stays || ended) << status;
  }

  test::Stepper stepper_{OutsideRootFd()};
};

TEST_F(CredentialsStepwise, TheDefaultGuard) {
  const auto act = [](const std::function<void()>& switched) {
    SDKCredentials guard;
    guard.AsUser("anna");
    switched();
  };
  Run({kAnna, act}, kCallerStill);
}

// It leaves the process as the user of its name, as ever.
TEST_F(CredentialsStepwise, TheNamedGuard) {
  const auto act = [](const std::function<void()>& switched) {
    const SDKCredentials guard("root");
    switched();
  };
  Run({kRoot, act}, kOther);
}

}  // namespace
