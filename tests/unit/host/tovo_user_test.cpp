#include "device/tovo_user.h"

#include <grp.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <future>
#include <string>
#include <thread>
#include <vector>

#include "device/tovo_config.h"
#include "tests/unit/host/child.h"
#include "tests/unit/host/faults.h"
#include "tests/unit/host/temp_dir.h"

namespace {

constexpr uid_t kVelkorUid = 61000;
constexpr uid_t kAliceUid = 61001;

// Every test looks at the users of a device root of its own, in a child process that has entered
// it.
class UserTest : public testing::Test {
 protected:
  UserTest() {
    // Longer than the buffer that a query starts with.
    const std::string long_text(5000, 'x');
    root_.Write("etc/passwd",
                "root:x:0:0:root:/root:/bin/sh\n"
                "Velkor:x:61000:61100::/var/packages/Velkor:/bin/false\n"
                "alice:x:61001:61200::/home/alice:/bin/sh\n"
                "bob:x:61002:61101::/home/bob:/bin/sh\n"
                "long:x:61003:61200:" +
                    long_text + ":/:/bin/sh\n");
    std::string many = "many:x:61500:";
    for (int i = 0; i < 2000; ++i) many += "user" + std::to_string(i) + ",";
    root_.Write("etc/group",
                "root:x:0:\nvelkor:x:61100:\n" + many +
                    "alice\n"
                    "administrators:x:61101:alice,carol\nusers:x:61200:\nmusic:x:61300:Velkor\n");
    // The child of a test that runs as root may read the files as another user.
    EXPECT_EQ(chmod(root_.Path().c_str(), 0755), 0);
  }

  const TempDir root_;
};

struct Identity {
  uid_t uid = geteuid();
  gid_t gid = getegid();
  std::vector<gid_t> groups = Groups();

  static std::vector<gid_t> Groups() {
    std::vector<gid_t> groups(100);
    groups.resize(static_cast<std::size_t>(getgroups(100, groups.data())));
    return groups;
  }
  bool operator==(const Identity& other) const {
    return uid == other.uid && gid == other.gid && groups == other.groups;
  }
};

void ExpectUser(const TOVOUSER* user, const std::string& name, uid_t uid, gid_t gid) {
  ASSERT_NE(user, nullptr);
  EXPECT_EQ(user->name, name);
  EXPECT_EQ(user->uid, uid);
  EXPECT_EQ(user->gid, gid);
}

TEST_F(UserTest, IsFoundByNameAndById) {
  RunInRoot(root_, [] {
    TOVOUSER* user = nullptr;
    EXPECT_GE(TOVOUserGet("Velkor", &user), 0);
    ExpectUser(user, "Velkor", kVelkorUid, 61100);
    TOVOUserFree(user);
    user = nullptr;
    EXPECT_GE(TOVOUserGetByUID(kAliceUid, &user), 0);
    ExpectUser(user, "alice", kAliceUid, 61200);
    TOVOUserFree(user);
  });
}

TEST_F(UserTest, ALongEntryIsFoundToo) {
  RunInRoot(root_, [] {
    TOVOUSER* user = nullptr;
    EXPECT_GE(TOVOUserGet("long", &user), 0);
    ExpectUser(user, "long", 61003, 61200);
    TOVOUserFree(user);
  });
}

TEST_F(UserTest, AnUnknownUserIsAFailureWithANullRecord) {
  RunInRoot(root_, [] {
    TOVOUSER untouched{};
    TOVOUSER* user = &untouched;
    EXPECT_LT(TOVOUserGet("nobody-here", &user), 0);
    EXPECT_EQ(user, nullptr);
    EXPECT_EQ(TLIBCErrGet(), ENOENT);
    user = &untouched;
    EXPECT_LT(TOVOUserGetByUID(4711, &user), 0);
    EXPECT_EQ(user, nullptr);
    EXPECT_EQ(TLIBCErrGet(), ENOENT);
  });
}

TEST_F(UserTest, WithoutADatabaseThereAreNoUsers) {
  const TempDir empty;
  RunInRoot(empty, [] {
    TOVOUSER untouched{};
    TOVOUSER* user = &untouched;
    EXPECT_LT(TOVOUserGet("root", &user), 0);
    EXPECT_EQ(user, nullptr);
    EXPECT_NE(TLIBCErrGet(), 0);
    EXPECT_LT(TLIBGroupIsAdminGroupMem("root", 0), 0);
    EXPECT_FALSE(ResetCredentialsByName("root", true));
  });
}

TEST(UserArgumentsTest, NullIsRefused) {
  TOVOUSER untouched{};
  TOVOUSER* user = &untouched;
  EXPECT_LT(TOVOUserGet(nullptr, &user), 0);
  EXPECT_EQ(user, nullptr);
  EXPECT_EQ(TLIBCErrGet(), EINVAL);
  EXPECT_LT(TOVOUserGet("root", nullptr), 0);
  EXPECT_LT(TOVOUserGetByUID(0, nullptr), 0);
  EXPECT_LT(TOVOServiceUserHomeIsEnabled(nullptr), 0);
  EXPECT_LT(TLIBGroupIsAdminGroupMem(nullptr, 0), 0);
  EXPECT_LT(TLIBGroupIsAdminGroupMem("root", 1), 0);
}

TEST(UserArgumentsTest, FreeingNullIsAllowed) { TOVOUserFree(nullptr); }

TEST_F(UserTest, AdministratorsAreTheMembersOfTheirGroup) {
  RunInRoot(root_, [] {
    EXPECT_EQ(TLIBGroupIsAdminGroupMem("alice", 0), 1) << "listed in the group";
    EXPECT_EQ(TLIBGroupIsAdminGroupMem("bob", 0), 1) << "it is his primary group";
    EXPECT_EQ(TLIBGroupIsAdminGroupMem("Velkor", 0), 0);
    EXPECT_EQ(TLIBGroupIsAdminGroupMem("root", 0), 0);
    EXPECT_LT(TLIBGroupIsAdminGroupMem("carol", 0), 0) << "listed, but no user";
    EXPECT_EQ(TLIBCErrGet(), ENOENT);
  });
}

TEST_F(UserTest, WithoutTheGroupNobodyIsAnAdministrator) {
  root_.Write("etc/group", "users:x:61200:alice\n");
  RunInRoot(root_, [] { EXPECT_EQ(TLIBGroupIsAdminGroupMem("alice", 0), 0); });
}

// The device has neither settings nor a group of administrators.
TEST_F(UserTest, ASuccessLeavesNoErrorToBeLoggedLater) {
  root_.Write("etc/group", "users:x:61200:alice\n");
  RunInRoot(root_, [] {
    errno = 0;
    TOVOUSER* user = nullptr;
    EXPECT_GE(TOVOUserGet("long", &user), 0);
    TOVOUserFree(user);
    EXPECT_EQ(TLIBGroupIsAdminGroupMem("alice", 0), 0);
    EXPECT_EQ(TOVOServiceUserHomeIsEnabled("alice"), 0);
    EXPECT_TRUE(ResetCredentialsByName("root", true));
    EXPECT_EQ(errno, 0);
  });
}

TEST_F(UserTest, TheHomeServiceIsASettingOfTheDevice) {
  RunInRoot(root_,
            [&] { EXPECT_EQ(TOVOServiceUserHomeIsEnabled("alice"), 0) << "no settings at all"; });
  root_.Write("etc/tovoinfo.conf", "unique=\"marovant_x86_ABC\"\n");
  RunInRoot(root_, [] { EXPECT_EQ(TOVOServiceUserHomeIsEnabled("alice"), 0); });
  root_.Write("etc/tovoinfo.conf", "userhome=\"yes\"\n");
  RunInRoot(root_, [] {
    EXPECT_EQ(TOVOServiceUserHomeIsEnabled("alice"), 1);
    EXPECT_LT(TOVOServiceUserHomeIsEnabled("nobody-here"), 0);
  });
  root_.Write("etc/tovoinfo.conf", "userhome=\"no\"\n");
  RunInRoot(root_, [] { EXPECT_EQ(TOVOServiceUserHomeIsEnabled("alice"), 0); });
}

TEST_F(UserTest, SettingsThatCannotBeReadAreAFailure) {
  ASSERT_EQ(mkdir((root_ / "etc/tovoinfo.conf").c_str(), 0755), 0);
  RunInRoot(root_, [] { EXPECT_LT(TOVOServiceUserHomeIsEnabled("alice"), 0); });
}

TEST_F(UserTest, AMemberOfVeryManyGroupsIsAnAdministratorToo) {
  std::string groups;
  for (int i = 0; i < 100; ++i) {
    groups += "group" + std::to_string(i) + ":x:" + std::to_string(62000 + i) + ":alice\n";
  }
  root_.Write("etc/group", groups + "administrators:x:61101:alice\n");
  RunInRoot(root_, [] { EXPECT_EQ(TLIBGroupIsAdminGroupMem("alice", 0), 1); });
}

TEST_F(UserTest, AnInterruptedLookUpIsTakenUpAgain) {
  RunInRoot(root_, [] {
    faults.getpwnam_r.Arm(EINTR);
    TOVOUSER* user = nullptr;
    EXPECT_GE(TOVOUserGet("alice", &user), 0);
    ExpectUser(user, "alice", kAliceUid, 61200);
    TOVOUserFree(user);
  });
}

// ERANGE: as for an entry that no buffer can hold.
TEST_F(UserTest, ALookUpThatFailsIsNoUnknownUser) {
  RunInRoot(root_, [] {
    for (const int error : {EIO, EMFILE, ERANGE}) {
      faults.getpwnam_r.Arm(error, 0, 100);
      TOVOUSER* user = nullptr;
      EXPECT_LT(TOVOUserGet("alice", &user), 0);
      EXPECT_EQ(TLIBCErrGet(), error);
      EXPECT_EQ(user, nullptr);
      EXPECT_FALSE(ResetCredentialsByName("alice", true));
      EXPECT_EQ(TLIBCErrGet(), error);
    }
  });
}

TEST_F(UserTest, WhoIsAnAdministratorCannotBeToldWithoutTheGroups) {
  RunInRoot(root_, [] {
    faults.getgrnam_r.Arm(EIO);
    EXPECT_LT(TLIBGroupIsAdminGroupMem("Velkor", 0), 0);
    EXPECT_EQ(TLIBCErrGet(), EIO);
  });
}

// The switches between several users.
class CredentialsTest : public UserTest {
 protected:
  void SetUp() override {
    if (!IsRoot()) GTEST_SKIP() << "needs root, to become other users";
  }
};

TEST_F(CredentialsTest, SwitchFromRootToAUserAndBack) {
  RunInRoot(root_, [] {
    ASSERT_EQ(setgroups(0, nullptr), 0);
    ASSERT_TRUE(ResetCredentialsByName("Velkor", true));
    EXPECT_EQ(geteuid(), kVelkorUid);
    EXPECT_EQ(getegid(), 61100U);
    EXPECT_EQ(Identity::Groups(), (std::vector<gid_t>{61100, 61300}));
    ASSERT_TRUE(ResetCredentialsByName("root", true));
    EXPECT_EQ(geteuid(), 0U);
    EXPECT_EQ(getegid(), 0U);
    EXPECT_EQ(Identity::Groups(), (std::vector<gid_t>{0}));
  });
}

TEST_F(CredentialsTest, SwitchFromOneUserToAnother) {
  RunInRoot(root_, [] {
    ASSERT_TRUE(ResetCredentialsByName("Velkor", true));
    ASSERT_TRUE(ResetCredentialsByName("alice", true));
    EXPECT_EQ(geteuid(), kAliceUid);
    EXPECT_EQ(getegid(), 61200U);
    EXPECT_EQ(Identity::Groups(), (std::vector<gid_t>{61101, 61200, 61500}));
  });
}

TEST_F(CredentialsTest, GroupsStayUnlessTheyAreToBeReset) {
  RunInRoot(root_, [] {
    const std::vector<gid_t> groups = {61777};
    ASSERT_EQ(setgroups(groups.size(), groups.data()), 0);
    ASSERT_TRUE(ResetCredentialsByName("Velkor", false));
    EXPECT_EQ(geteuid(), kVelkorUid);
    EXPECT_EQ(Identity::Groups(), groups);
  });
}

TEST_F(CredentialsTest, SwitchForAllThreads) {
  RunInRoot(root_, [] {
    std::promise<void> switched;
    uid_t seen = 0;
    std::thread thread([&] {
      switched.get_future().wait();
      seen = geteuid();
    });
    EXPECT_TRUE(ResetCredentialsByName("Velkor", true));
    switched.set_value();
    thread.join();
    EXPECT_EQ(seen, kVelkorUid);
  });
}

TEST_F(CredentialsTest, AnUnknownUserChangesNothing) {
  RunInRoot(root_, [] {
    ASSERT_TRUE(ResetCredentialsByName("Velkor", true));
    const Identity before;
    EXPECT_FALSE(ResetCredentialsByName("nobody-here", true));
    EXPECT_EQ(TLIBCErrGet(), ENOENT);
    EXPECT_TRUE(Identity() == before);
  });
}

// Every step that makes Velkor alice, by way of root.
TEST_F(CredentialsTest, ASwitchThatFailsHalfWayIsUndone) {
  RunInRoot(root_, [] {
    ASSERT_TRUE(ResetCredentialsByName("Velkor", true));
    const Identity before;
    const auto expect_undone = [&](Fault& step, int spared) {
      step.Arm(EAGAIN, spared);
      EXPECT_FALSE(ResetCredentialsByName("alice", true));
      EXPECT_EQ(TLIBCErrGet(), EAGAIN);
      EXPECT_TRUE(Identity() == before);
    };
    expect_undone(faults.setgroups, 0);
    expect_undone(faults.setegid, 0);
    expect_undone(faults.seteuid, 1);  // the first call regains root
  });
}

TEST_F(CredentialsTest, ASwitchThatCannotBeUndoneEitherEndsTheProcess) {
  RunInRoot(root_, [] {
    ASSERT_TRUE(ResetCredentialsByName("Velkor", true));
    const auto expect_end = [&](Fault& step, int spared) {
      const pid_t child = fork();
      if (child == 0) {
        faults.seteuid.Arm(EAGAIN, 1);  // does not become alice
        step.Arm(EAGAIN, spared, 2);
        ResetCredentialsByName("alice", true);
        _exit(0);
      }
      int status = 0;
      ASSERT_EQ(waitpid(child, &status, 0), child);
      EXPECT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGABRT) << status;
    };
    // Nor gets back Velkor's groups, group or user.
    expect_end(faults.setgroups, 1);
    expect_end(faults.setegid, 1);
    expect_end(faults.seteuid, 1);
  });
}

TEST_F(CredentialsTest, TheSavedUserIsAWayToRoot) {
  RunInRoot(root_, [] {
    ASSERT_EQ(setresuid(kAliceUid, kAliceUid, 0), 0);
    EXPECT_TRUE(ResetCredentialsByName("Velkor", true));
    EXPECT_EQ(geteuid(), kVelkorUid);
  });
}

// Without a way back to root.
void BecomeAliceForGood(gid_t group) {
  ASSERT_EQ(setgroups(0, nullptr), 0);
  ASSERT_EQ(setresgid(group, group, group), 0);
  ASSERT_EQ(setresuid(kAliceUid, kAliceUid, kAliceUid), 0);
}

TEST_F(CredentialsTest, TheUserWithAnothersGroupIsNotTheUserYet) {
  RunInRoot(root_, [] {
    BecomeAliceForGood(61101);
    const Identity before;
    EXPECT_FALSE(ResetCredentialsByName("alice", true));
    EXPECT_EQ(TLIBCErrGet(), EPERM);
    EXPECT_TRUE(Identity() == before);
  });
}

TEST_F(CredentialsTest, WithoutAWayToRootNoOtherUserCanBeHad) {
  RunInRoot(root_, [] {
    BecomeAliceForGood(61200);
    const Identity before;
    for (const char* name : {"root", "Velkor"}) {
      EXPECT_FALSE(ResetCredentialsByName(name, true)) << name;
      EXPECT_EQ(TLIBCErrGet(), EPERM);
      EXPECT_TRUE(Identity() == before);
    }
    EXPECT_TRUE(ResetCredentialsByName("alice", true)) << "who it is already";
    EXPECT_TRUE(Identity() == before);
  });
}

TEST_F(UserTest, AnOrdinaryUserInARootOfItsOwnIsRootAndNobodyElse) {
  RunInRootAsOrdinaryUser(root_, [] {
    const Identity before;
    EXPECT_TRUE(ResetCredentialsByName("root", true));
    EXPECT_TRUE(Identity() == before);
    for (const bool reset_groups : {true, false}) {
      EXPECT_FALSE(ResetCredentialsByName("Velkor", reset_groups));
      EXPECT_NE(TLIBCErrGet(), 0);
      EXPECT_TRUE(Identity() == before);
    }
  });
}

}  // namespace
