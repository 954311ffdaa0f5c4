#include "tests/unit/host/child.h"

#include <grp.h>
#include <gtest/gtest.h>
#include <sched.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <exception>
#include <iostream>
#include <string>

#include "host/device_root.h"

namespace {

enum Outcome { kPassed = 0, kFailed = 1, kSkipped = 2 };

Outcome RunBody(const std::function<void()>& body) {
  try {
    body();
  } catch (const std::exception& error) {
    ADD_FAILURE() << "exception: " << error.what();
  }
  if (testing::Test::HasFailure()) return kFailed;
  return testing::Test::IsSkipped() ? kSkipped : kPassed;
}

// Why the system lets this process enter no other root; empty when it does. A process of its own
// tries it.
std::string ReasonAgainstEntering() {
  const pid_t child = fork();
  if (child == 0) {
    const bool allowed = (IsRoot() || unshare(CLONE_NEWUSER) == 0) && chroot("/") == 0;
    _exit(allowed ? 0 : errno);
  }
  int status = 0;
  EXPECT_EQ(waitpid(child, &status, 0), child);
  EXPECT_TRUE(WIFEXITED(status));
  return WEXITSTATUS(status) == 0 ? "" : std::strerror(WEXITSTATUS(status));
}

}  // namespace

bool IsRoot() { return geteuid() == 0; }

void RunInChild(const std::function<void()>& body) {
  std::fflush(nullptr);
  const pid_t child = fork();
  ASSERT_NE(child, -1);
  if (child == 0) {
    const Outcome outcome = RunBody(body);
    std::fflush(nullptr);
    _exit(outcome);
  }
  int status = 0;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  ASSERT_TRUE(WIFEXITED(status)) << "the child was ended by signal " << WTERMSIG(status);
  if (WEXITSTATUS(status) == kSkipped) GTEST_SKIP() << "for the reason printed above";
  EXPECT_EQ(WEXITSTATUS(status), kPassed);
}

void SkipChildUnlessARootMayBeEntered() {
  const std::string reason = ReasonAgainstEntering();
  if (reason.empty()) return;
  std::cout << "The system lets the test enter no other root: " << reason << std::endl;
  _exit(kSkipped);
}

void RunInRoot(const TempDir& root, const std::function<void()>& body) {
  RunInChild([&] {
    SkipChildUnlessARootMayBeEntered();
    host::EnterDeviceRoot(root.Path());
    body();
  });
}

void RunInRootAsOrdinaryUser(const TempDir& root, const std::function<void()>& body) {
  if (IsRoot()) {
    ASSERT_EQ(chown(root.Path().c_str(), kOrdinaryId, kOrdinaryId), 0);
  }
  RunInChild([&] {
    BecomeOrdinaryUser();
    SkipChildUnlessARootMayBeEntered();
    host::EnterDeviceRoot(root.Path());
    body();
  });
}

void BecomeOrdinaryUser() {
  if (!IsRoot()) return;
  ASSERT_EQ(setgroups(0, nullptr), 0);
  ASSERT_EQ(setresgid(kOrdinaryId, kOrdinaryId, kOrdinaryId), 0);
  ASSERT_EQ(setresuid(kOrdinaryId, kOrdinaryId, kOrdinaryId), 0);
  // A change of user takes /proc/self away from the process; a program started by the user has it.
  ASSERT_EQ(prctl(PR_SET_DUMPABLE, 1), 0);
}
