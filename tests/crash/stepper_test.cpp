// What the other tests here rely on: a call is looked at before it is made, and goes as was
// decided.
#include "tests/crash/stepper.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sched.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <csignal>
#include <thread>
#include <vector>

#include "tests/support/device_root_test.h"

namespace test {
namespace {

constexpr char kFile[] = "/tmp/file";
constexpr char kText[] = "0123456789";

class StepperTest : public DeviceRootTest {
 protected:
  void SetUp() override {
    const std::string refusal = Stepper::Refusal();
    if (!refusal.empty()) GTEST_SKIP() << refusal;
    WriteFile(kFile, "content");
  }

  // Runs `run` and does `step` to its calls of that number.
  End Run(const std::function<void()>& run, long number, const Step& step) {
    const auto marked = [&] {
      Stepper::Mark();
      run();
    };
    return stepper_.Run(marked, [&](const SystemCall& call) {
      paths_.push_back(stepper_.PathOf(call));
      threads_.push_back(call.thread);
      return call.number == number ? step : Step{};
    });
  }

  static Step Failing(Step::Kind kind, int error) {
    Step step;
    step.kind = kind;
    step.error = error;
    return step;
  }

  std::vector<std::string> paths_;
  std::vector<pid_t> threads_;
  Stepper stepper_{OutsideRootFd()};
};

// Exits with what the call says of itself.
void Unlink() { _exit(syscall(SYS_unlinkat, AT_FDCWD, kFile, 0) == 0 ? 0 : errno); }

TEST_F(StepperTest, WhatIsLetThroughIsMade) {
  const End end = Run(Unlink, SYS_unlinkat, Step{});
  EXPECT_FALSE(end.killed);
  EXPECT_EQ(end.status, 0);
  EXPECT_FALSE(Exists(kFile));
}

TEST_F(StepperTest, KilledProcessHasNotMadeTheCall) {
  const End end = Run(Unlink, SYS_unlinkat, Failing(Step::kKill, 0));
  EXPECT_TRUE(end.killed);
  EXPECT_TRUE(WIFSIGNALED(end.status) && WTERMSIG(end.status) == SIGKILL);
  EXPECT_TRUE(Exists(kFile));
}

TEST_F(StepperTest, FailingCallIsNotMade) {
  const End end = Run(Unlink, SYS_unlinkat, Failing(Step::kFail, EROFS));
  EXPECT_EQ(WEXITSTATUS(end.status), EROFS);
  EXPECT_TRUE(Exists(kFile));
}

TEST_F(StepperTest, CallThatFailsAfterwardsIsMade) {
  const End end = Run(Unlink, SYS_unlinkat, Failing(Step::kFailAfterwards, EINTR));
  EXPECT_EQ(WEXITSTATUS(end.status), EINTR);
  EXPECT_FALSE(Exists(kFile));
}

TEST_F(StepperTest, CallIsMadeWithAnotherArgument) {
  Step step;
  step.kind = Step::kReplaceArgument;
  step.argument = 2;
  step.value = 4;
  const auto write_text = [] {
    const int fd = open(kFile, O_WRONLY | O_TRUNC);
    _exit(static_cast<int>(write(fd, kText, sizeof(kText) - 1)));
  };
  const End end = Run(write_text, SYS_write, step);
  EXPECT_EQ(WEXITSTATUS(end.status), 4);
  EXPECT_EQ(ReadFile(kFile), "0123");
}

TEST_F(StepperTest, NamesTheFileOfACall) {
  const auto write_text = [] {
    const int fd = open(kFile, O_WRONLY | O_TRUNC);
    _exit(write(fd, kText, 1) == 1 ? 0 : 1);
  };
  EXPECT_EQ(Run(write_text, -1, Step{}).status, 0);
  EXPECT_EQ(paths_, (std::vector<std::string>{kFile, kFile, ""})) << "open, write, exit";
}

// While the first thread runs.
TEST_F(StepperTest, NamesTheFileOfAThreadsCall) {
  constexpr int kTimes = 100;
  const auto look = [] {
    std::atomic<bool> done = false;
    std::thread thread([&] {
      for (int i = 0; i < kTimes; ++i) syscall(SYS_faccessat, AT_FDCWD, kFile, F_OK);
      done = true;
    });
    while (!done) sched_yield();
    thread.join();
  };
  EXPECT_EQ(Run(look, -1, Step{}).status, 0);
  EXPECT_EQ(std::count(paths_.begin(), paths_.end(), kFile), kTimes);
}

TEST_F(StepperTest, LooksAtThreadsToo) {
  const auto unlink_on_a_thread = [] { std::thread(Unlink).join(); };
  const End end = Run(unlink_on_a_thread, SYS_unlinkat, Failing(Step::kFail, EIO));
  EXPECT_EQ(WEXITSTATUS(end.status), EIO);
  EXPECT_NE(threads_.front(), threads_.back());
}

TEST_F(StepperTest, LooksBetweenTheMarksAlone) {
  const auto run = [] {
    Stepper::Mark();
    Unlink();
  };
  EXPECT_EQ(Run(run, SYS_unlinkat, Failing(Step::kKill, 0)).status, 0);
  EXPECT_FALSE(Exists(kFile));
}

}  // namespace
}  // namespace test
