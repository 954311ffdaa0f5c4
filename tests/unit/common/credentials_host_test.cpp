// The guard on the host's user database, switching for real.
#include <gtest/gtest.h>
#include <unistd.h>

#include "appindex/utilities/credentials.h"
#include "appindex/utilities/file_utils.h"
#include "tests/support/device_root_test.h"

namespace {

using velkor::sdk::SDKCredentials;

class HostCredentialsTest : public test::DeviceRootTest {
 protected:
  void SetUp() override {
    if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: switches to another user";
  }
};

TEST_F(HostCredentialsTest, TheDefaultGuardReturnsFromAnotherUser) {
  {
    SDKCredentials guard;
    guard.AsUser("anna");
    EXPECT_EQ(geteuid(), 1001U);
    EXPECT_EQ(getegid(), 100U);
  }
  EXPECT_EQ(geteuid(), 0U);
  EXPECT_EQ(getegid(), 0U);
}

TEST_F(HostCredentialsTest, TheNamedGuardLeavesTheProcessAsItsUser) {
  { const SDKCredentials guard("anna"); }
  EXPECT_EQ(geteuid(), 1001U);
  { const SDKCredentials guard("root"); }
  EXPECT_EQ(geteuid(), 0U);
}

TEST_F(HostCredentialsTest, AnAdministratorActsAsRoot) {
  SDKCredentials guard;
  guard.AsUser("anna");
  guard.AsUser("boss");
  EXPECT_EQ(geteuid(), 0U);
}

TEST_F(HostCredentialsTest, RightsAreThoseOfTheUserSwitchedTo) {
  test::WriteFile("/data/secret", "", 0600);
  SDKCredentials guard;
  guard.AsUser("anna");
  EXPECT_FALSE(velkor::CheckACLPerm("/data/secret", 4));
  guard.AsUser("root");
  EXPECT_TRUE(velkor::CheckACLPerm("/data/secret", 4));
}

}  // namespace
