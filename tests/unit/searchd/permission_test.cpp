#include "host/searchd/permission.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <string>

#include "tests/support/device_root_test.h"

namespace searchd {
namespace {

constexpr char kUsers[] = "/etc/passwd";
constexpr uid_t kVelkor = 4712;
constexpr uid_t kStranger = 4711;

class PermissionTest : public test::DeviceRootTest {
 protected:
  // Writes the users of the device: the one who indexes, whose entry holds `comment`, and another.
  static void WriteUsers(const std::string& comment) {
    test::WriteFile(kUsers, "Velkor:x:4712:4712:" + comment +
                                ":/:/bin/false\n"
                                "stranger:x:4711:4711::/:/bin/false\n");
  }
};

TEST_F(PermissionTest, RootTheDaemonsUserAndTheIndexingUserMayChangeIndexes) {
  WriteUsers("");
  EXPECT_TRUE(MayChangeIndexes(0));
  EXPECT_TRUE(MayChangeIndexes(geteuid()));
  EXPECT_TRUE(MayChangeIndexes(kVelkor));
  EXPECT_FALSE(MayChangeIndexes(kStranger));
}

TEST_F(PermissionTest, ADaemonThatIsNotRootsTakesItsOwnUser) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: switches to another user";
  WriteUsers("");
  ASSERT_EQ(seteuid(kStranger), 0);
  EXPECT_TRUE(MayChangeIndexes(kStranger));
  EXPECT_TRUE(MayChangeIndexes(0));
  EXPECT_FALSE(MayChangeIndexes(kStranger + 10));
}

TEST_F(PermissionTest, AnEntryOfAnyLengthNamesTheIndexingUser) {
  WriteUsers(std::string(5000, 'x'));
  EXPECT_TRUE(MayChangeIndexes(kVelkor));
  EXPECT_FALSE(MayChangeIndexes(kStranger));
}

TEST_F(PermissionTest, WithoutAnIndexingUserNobodyElseMay) {
  test::WriteFile(kUsers, "stranger:x:4711:4711::/:/bin/false\n");
  EXPECT_FALSE(MayChangeIndexes(kVelkor));
}

// Whoever cannot be looked up is nobody: not even a user of the number that it would have.
TEST_F(PermissionTest, WithoutUsersOnlyRootAndTheDaemonsUserMay) {
  unlink(kUsers);
  EXPECT_FALSE(MayChangeIndexes(kVelkor));
  EXPECT_TRUE(MayChangeIndexes(0));
}

}  // namespace
}  // namespace searchd
