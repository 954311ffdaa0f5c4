#include "appindex/utilities/credentials.h"

#include <gmock/gmock.h>
#include <unistd.h>

#include <cerrno>
#include <string>
#include <thread>
#include <type_traits>

#include "appindex/error.h"
#include "tests/support/device_root_test.h"
#include "tests/support/fake_user_db.h"

namespace {

using test::FailureLine;
using test::FakeIdentity;
using test::UserDb;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;
using velkor::Error;
using velkor::sdk::SDKCredentials;
using velkor::sdk::SDKMutex;

static_assert(!std::is_copy_constructible_v<SDKCredentials>);
static_assert(!std::is_copy_assignable_v<SDKCredentials>);
static_assert(!std::is_polymorphic_v<SDKCredentials>);
static_assert(!std::is_nothrow_destructible_v<SDKCredentials>, "its destructor may throw");

constexpr char kLookUpFailed[] = "TOVOUserGetByUID failed, err=";
constexpr char kLookUpCheck[] =
    "Failed [0 > TOVOUserGetByUID(euid_, &user_info) || !user_info], reason: "
    "TOVOUserGetByUID failed, err=";

class CredentialsTest : public test::DeviceRootTest {
 protected:
  CredentialsTest() {
    UserDb() = test::FakeUserDb();
    UserDb().users = {{"root", 0, 0},
                      {"anna", 1001, 100},
                      {"boss", 1002, 100, 1},
                      {"staff", 1003, 100, 2},
                      {"operator", 0, 37}};
    BecomeUser(0, 0);
    errno = 0;
  }
  ~CredentialsTest() override { UserDb() = test::FakeUserDb(); }

  static void BecomeUser(uid_t euid, gid_t egid) { UserDb().identity = FakeIdentity{euid, egid}; }

  // The error of a default guard's constructor.
  static Error LookUpError() {
    try {
      const SDKCredentials guard;
    } catch (const Error& error) {
      return error;
    }
    throw std::logic_error("the look-up did not fail");
  }

  static std::string ReasonForError(int number) {
    UserDb().users.clear();
    UserDb().last_error = number;
    return LookUpError().reason;
  }

  // The error of the destructor of a guard that cannot switch back.
  static Error DestructorError(int errno_before) {
    try {
      const SDKCredentials guard;
      BecomeUser(1001, 100);
      UserDb().refuses_to_switch = true;
      errno = errno_before;
    } catch (const Error& error) {
      return error;
    }
    throw std::logic_error("the destructor did not throw");
  }
};

TEST_F(CredentialsTest, TheDefaultGuardLooksItsUserUpAndDoesNotSwitch) {
  BecomeUser(1001, 100);
  {
    const SDKCredentials guard;
    EXPECT_THAT(UserDb().calls, ElementsAre("TOVOUserGetByUID 1001", "TOVOUserFree anna"));
    EXPECT_EQ(UserDb().records_held, 0);
  }
  EXPECT_THAT(UserDb().calls, Not(Contains("ResetCredentialsByName anna true")));
  EXPECT_EQ(geteuid(), 1001U);
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(CredentialsTest, TheDefaultGuardSwitchesBackToItsOwnUser) {
  BecomeUser(1001, 100);
  {
    SDKCredentials guard;
    guard.AsUser("root");
    EXPECT_EQ(geteuid(), 0U);
    UserDb().calls.clear();
  }
  EXPECT_THAT(UserDb().calls, ElementsAre("ResetCredentialsByName anna true"));
  EXPECT_EQ(geteuid(), 1001U);
  EXPECT_EQ(getegid(), 100U);
}

TEST_F(CredentialsTest, AChangedGroupAloneIsSwitchedBackToo) {
  {
    SDKCredentials guard;
    guard.AsUser("operator");
    EXPECT_EQ(geteuid(), 0U);
    EXPECT_EQ(getegid(), 37U);
  }
  EXPECT_EQ(getegid(), 0U);
}

TEST_F(CredentialsTest, ANameThatGivesTheSameIdsIsNotSwitchedBack) {
  UserDb().users.push_back({"toor", 0, 0});
  {
    SDKCredentials guard;
    guard.AsUser("toor");
    UserDb().calls.clear();
  }
  EXPECT_THAT(UserDb().calls, IsEmpty());
}

TEST_F(CredentialsTest, AsRootTheGuardOfRootSwitchesOnceAndItsDestructorCallsNothing) {
  {
    const SDKCredentials guard("root");
    EXPECT_THAT(UserDb().calls,
                ElementsAre("TLIBGroupIsAdminGroupMem root 0", "ResetCredentialsByName root true"));
    UserDb().calls.clear();
  }
  EXPECT_THAT(UserDb().calls, IsEmpty());
}

TEST_F(CredentialsTest, TheNamedGuardSwitchesToItsUser) {
  const SDKCredentials guard("anna");
  EXPECT_EQ(geteuid(), 1001U);
  EXPECT_EQ(getegid(), 100U);
}

TEST_F(CredentialsTest, TheNamedGuardSwitchesBackToItsOwnNameNotToTheCaller) {
  BecomeUser(1001, 100);
  {
    const SDKCredentials guard("root");
    UserDb().calls.clear();
  }
  EXPECT_THAT(UserDb().calls, ElementsAre("ResetCredentialsByName root true"));
  EXPECT_EQ(geteuid(), 0U);
}

TEST_F(CredentialsTest, TheNamedGuardOfAnAdministratorSwitchesBackToThatNameItself) {
  BecomeUser(1001, 100);
  {
    const SDKCredentials guard("boss");
    EXPECT_EQ(geteuid(), 0U);
  }
  EXPECT_EQ(geteuid(), 1002U);
}

TEST_F(CredentialsTest, AsUserWithAnAdministratorsNameSwitchesToRoot) {
  BecomeUser(1001, 100);
  SDKCredentials guard;
  UserDb().calls.clear();
  guard.AsUser("boss");
  EXPECT_THAT(UserDb().calls,
              ElementsAre("TLIBGroupIsAdminGroupMem boss 0", "ResetCredentialsByName root true"));
  EXPECT_EQ(geteuid(), 0U);
}

TEST_F(CredentialsTest, AsUserWithAnOrdinaryNameSwitchesToThatUser) {
  SDKCredentials guard;
  UserDb().calls.clear();
  guard.AsUser("anna");
  EXPECT_THAT(UserDb().calls,
              ElementsAre("TLIBGroupIsAdminGroupMem anna 0", "ResetCredentialsByName anna true"));
  EXPECT_EQ(geteuid(), 1001U);
}

TEST_F(CredentialsTest, OnlyTheAnswerOneMakesAnAdministrator) {
  SDKCredentials guard;
  guard.AsUser("staff");
  EXPECT_EQ(geteuid(), 1003U);
}

TEST_F(CredentialsTest, ALookUpThatFailsWithErrorZeroThrowsTheWholeLiteral) {
  BecomeUser(4711, 100);
  const Error error = LookUpError();
  EXPECT_EQ(error.code, Error::kCredentialsError);
  EXPECT_EQ(error.reason, kLookUpFailed);
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(),
              ElementsAre(FailureLine("credentials", 22, "SDKCredentials", kLookUpCheck)));
}

TEST_F(CredentialsTest, ALookUpThatFailsWithErrnoSetLogsItsTextAndClearsIt) {
  BecomeUser(4711, 100);
  errno = ENOENT;
  EXPECT_EQ(LookUpError().reason, kLookUpFailed);
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(FailureLine(
                             "credentials", 22, "SDKCredentials",
                             std::string(kLookUpCheck) + " [err: No such file or directory]")));
}

TEST_F(CredentialsTest, ALookUpThatGivesNoRecordFailsLikewise) {
  UserDb().gives_null_records = true;
  const Error error = LookUpError();
  EXPECT_EQ(error.code, Error::kCredentialsError);
  EXPECT_EQ(error.reason, kLookUpFailed);
  EXPECT_THAT(TakeLog(),
              ElementsAre(FailureLine("credentials", 22, "SDKCredentials", kLookUpCheck)));
}

TEST_F(CredentialsTest, TheReasonLosesAsManyLeadingCharactersAsTheErrorNumber) {
  EXPECT_EQ(ReasonForError(5), "serGetByUID failed, err=");
  EXPECT_EQ(ReasonForError(28), "=");
}

TEST_F(CredentialsTest, TheReasonIsEmptyFromTheLiteralsLengthOn) {
  EXPECT_EQ(ReasonForError(29), "");
  EXPECT_EQ(ReasonForError(30), "");
  EXPECT_EQ(ReasonForError(2147483647), "");
}

TEST_F(CredentialsTest, ANegativeErrorNumberDropsNothing) {
  EXPECT_EQ(ReasonForError(-1), kLookUpFailed);
  EXPECT_EQ(ReasonForError(-2147483647 - 1), kLookUpFailed);
}

TEST_F(CredentialsTest, TheLineOfAFailedLookUpHasTheShortenedReason) {
  ReasonForError(17);
  EXPECT_THAT(TakeLog(), ElementsAre(FailureLine(
                             "credentials", 22, "SDKCredentials",
                             "Failed [0 > TOVOUserGetByUID(euid_, &user_info) || !user_info], "
                             "reason: failed, err=")));
}

TEST_F(CredentialsTest, AsUserThatFailsLogsThrowsWithoutAReasonAndLeavesTheUser) {
  BecomeUser(1001, 100);
  SDKCredentials guard;
  UserDb().refuses_to_switch = true;
  errno = 0;
  try {
    guard.AsUser("root");
    ADD_FAILURE() << "did not throw";
  } catch (const Error& error) {
    EXPECT_EQ(error.code, Error::kCredentialsError);
    EXPECT_EQ(error.reason, "");
  }
  EXPECT_EQ(geteuid(), 1001U);
  EXPECT_THAT(TakeLog(), ElementsAre(FailureLine(
                             "credentials", 53, "AsUser",
                             "Failed [!ResetCredentialsByName(target_username)], reason: ")));
}

TEST_F(CredentialsTest, AsUserThatFailsWithErrnoSetLogsItsTextAndClearsIt) {
  SDKCredentials guard;
  errno = ENOENT;
  EXPECT_THROW(guard.AsUser("nobody"), Error);
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(FailureLine(
                             "credentials", 53, "AsUser",
                             "Failed [!ResetCredentialsByName(target_username)], reason:  [err: No "
                             "such file or directory]")));
}

TEST_F(CredentialsTest, AsUserDoesNotChangeWhomTheDestructorSwitchesTo) {
  BecomeUser(1001, 100);
  {
    SDKCredentials guard;
    guard.AsUser("staff");
    EXPECT_THROW(guard.AsUser("nobody"), Error);
    guard.AsUser("root");
  }
  EXPECT_EQ(geteuid(), 1001U);
}

TEST_F(CredentialsTest, TheNamedGuardThatCannotSwitchThrowsAndNothingIsSwitchedBack) {
  errno = 0;
  EXPECT_THROW(SDKCredentials("nobody"), Error);
  EXPECT_THAT(UserDb().calls, ElementsAre("TLIBGroupIsAdminGroupMem nobody 0",
                                          "ResetCredentialsByName nobody true"));
  EXPECT_THAT(TakeLog(), ElementsAre(FailureLine(
                             "credentials", 53, "AsUser",
                             "Failed [!ResetCredentialsByName(target_username)], reason: ")));
}

TEST_F(CredentialsTest, TheDestructorThatCannotSwitchBackLogsAndThrowsWithoutAReason) {
  const Error error = DestructorError(0);
  EXPECT_EQ(error.code, Error::kCredentialsError);
  EXPECT_EQ(error.reason, "");
  EXPECT_THAT(TakeLog(),
              ElementsAre(FailureLine("credentials", 39, "~SDKCredentials",
                                      "Failed [!ResetCredentialsByName(username_)], reason: ")));
}

TEST_F(CredentialsTest, TheDestructorThatCannotSwitchBackLogsTheTextOfErrnoAndClearsIt) {
  DestructorError(ENOENT);
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(FailureLine(
                             "credentials", 39, "~SDKCredentials",
                             "Failed [!ResetCredentialsByName(username_)], reason:  [err: No such "
                             "file or directory]")));
}

TEST_F(CredentialsTest, TheDestructorsLineNamesTheUserItCouldNotLeave) {
  DestructorError(0);
  EXPECT_THAT(TakeLog(), ElementsAre("credentials:39 (" + std::to_string(getpid()) +
                                     ", 1001) (~SDKCredentials) Failed "
                                     "[!ResetCredentialsByName(username_)], reason: "));
}

TEST_F(CredentialsTest, EveryCallToTheDeviceHoldsTheSdkMutex) {
  int calls = 0;
  UserDb().on_call = [&] {
    ++calls;
    EXPECT_FALSE(SDKMutex().TryLock()) << UserDb().calls.back();
  };
  {
    SDKCredentials guard;
    guard.AsUser("anna");
  }
  EXPECT_EQ(calls, 5);
  ReasonForError(0);
  EXPECT_GT(calls, 5);
}

TEST_F(CredentialsTest, TheSdkMutexIsFreeDuringTheLifeOfAGuardAndAfterAFailure) {
  const auto is_free = [] {
    const bool taken = SDKMutex().TryLock();
    if (taken) SDKMutex().Unlock();
    return taken;
  };
  SDKCredentials guard;
  EXPECT_TRUE(is_free());
  EXPECT_THROW(guard.AsUser("nobody"), Error);
  EXPECT_TRUE(is_free());
  ReasonForError(0);
  EXPECT_TRUE(is_free());
}

TEST_F(CredentialsTest, TheSdkMutexIsOneInTheWholeProcess) {
  velkor::Mutex* elsewhere = nullptr;
  std::thread([&] { elsewhere = &SDKMutex(); }).join();
  EXPECT_EQ(elsewhere, &SDKMutex());
}

}  // namespace
