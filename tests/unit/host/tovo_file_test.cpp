#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>

#include "device/tovo_config.h"
#include "device/tovo_file.h"
#include "tests/unit/host/child.h"
#include "tests/unit/host/faults.h"
#include "tests/unit/host/temp_dir.h"

namespace {

int PermissionsOn(const std::string& path) {
  int perm = -1;
  EXPECT_GE(TOVOACLPermGet(path.c_str(), &perm), 0);
  return perm;
}

TEST(ACLPermGetTest, TellsReadWriteAndExecute) {
  const TempDir dir;
  const std::string file = dir.Write("file", "");
  RunInChild([&] {
    if (IsRoot()) {
      ASSERT_EQ(chown(dir.Path().c_str(), kOrdinaryId, kOrdinaryId), 0);
      ASSERT_EQ(chown(file.c_str(), kOrdinaryId, kOrdinaryId), 0);
    }
    BecomeOrdinaryUser();
    for (const mode_t perm : {0U, 1U, 2U, 3U, 4U, 5U, 6U, 7U}) {
      ASSERT_EQ(chmod(file.c_str(), perm << 6U), 0);
      EXPECT_EQ(PermissionsOn(file), static_cast<int>(perm));
    }
  });
}

TEST(ACLPermGetTest, RootMayExecuteOnlyWhatSomebodyMay) {
  if (!IsRoot()) GTEST_SKIP() << "needs root";
  const TempDir dir;
  const std::string file = dir.Write("file", "");
  ASSERT_EQ(chmod(file.c_str(), 0), 0);
  EXPECT_EQ(PermissionsOn(file), 6);
  ASSERT_EQ(chmod(file.c_str(), 0001), 0);
  EXPECT_EQ(PermissionsOn(file), 7);
}

TEST(ACLPermGetTest, TheEffectiveUserCounts) {
  if (!IsRoot()) GTEST_SKIP() << "needs root, to have two users";
  const TempDir dir;
  const std::string file = dir.Write("file", "");
  ASSERT_EQ(chmod(dir.Path().c_str(), 0755), 0);
  ASSERT_EQ(chmod(file.c_str(), 0644), 0);
  RunInChild([&] {
    ASSERT_EQ(setegid(kOrdinaryId), 0);
    ASSERT_EQ(seteuid(kOrdinaryId), 0);
    EXPECT_EQ(PermissionsOn(file), 4);
  });
}

TEST(ACLPermGetTest, ARefusedBitIsNoErrorToBeLoggedLater) {
  const TempDir dir;
  const std::string file = dir.Write("file", "");
  ASSERT_EQ(chmod(file.c_str(), 0400), 0);
  errno = 0;
  PermissionsOn(file);
  EXPECT_EQ(errno, 0);
}

TEST(ACLPermGetTest, APathThatIsNotThereIsAFailureAndChangesNothing) {
  const TempDir dir;
  int perm = 77;
  EXPECT_LT(TOVOACLPermGet((dir / "absent").c_str(), &perm), 0);
  EXPECT_EQ(errno, ENOENT);
  EXPECT_EQ(TLIBCErrGet(), ENOENT);
  EXPECT_EQ(perm, 77);
  EXPECT_LT(TOVOACLPermGet(nullptr, &perm), 0);
  EXPECT_LT(TOVOACLPermGet("/", nullptr), 0);
}

TEST(ACLPermGetTest, APathThatCannotBeReachedIsAFailure) {
  const TempDir dir;
  const std::string file = dir.Write("closed/file", "");
  ASSERT_EQ(chmod((dir / "closed").c_str(), 0), 0);
  RunInChild([&] {
    BecomeOrdinaryUser();
    int perm = 77;
    EXPECT_LT(TOVOACLPermGet(file.c_str(), &perm), 0);
    EXPECT_EQ(errno, EACCES);
    EXPECT_EQ(perm, 77);
  });
  ASSERT_EQ(chmod((dir / "closed").c_str(), 0700), 0);
}

// Both ways of telling: the kernel's word, and what an old kernel leaves to compare.
class DirIsMntPointTest : public testing::TestWithParam<bool> {
 protected:
  DirIsMntPointTest() { faults.statx_knows_mounts = GetParam(); }

 private:
  const FaultScope scope_;
};

INSTANTIATE_TEST_SUITE_P(Kernel, DirIsMntPointTest, testing::Bool(), [](const auto& instance) {
  return instance.param ? "ThatTells" : "ThatDoesNotTell";
});

TEST_P(DirIsMntPointTest, AMountedFileSystemIs) { EXPECT_GT(TOVOFSDirIsMntPoint("/proc"), 0); }

TEST_P(DirIsMntPointTest, ALinkToAMountPointIs) {
  const TempDir dir;
  ASSERT_EQ(symlink("/proc", (dir / "link").c_str()), 0);
  EXPECT_GT(TOVOFSDirIsMntPoint((dir / "link").c_str()), 0);
}

TEST_P(DirIsMntPointTest, AnOrdinaryDirectoryIsNot) {
  const TempDir dir;
  EXPECT_EQ(TOVOFSDirIsMntPoint(dir.Path().c_str()), 0);
  EXPECT_EQ(TOVOFSDirIsMntPoint((dir.Path() + "/").c_str()), 0);
  EXPECT_EQ(TOVOFSDirIsMntPoint("/proc/self"), 0);
}

TEST_P(DirIsMntPointTest, WhatIsNoDirectoryCannotBeTold) {
  const TempDir dir;
  EXPECT_LT(TOVOFSDirIsMntPoint(dir.Write("file", "").c_str()), 0);
  EXPECT_EQ(TLIBCErrGet(), ENOTDIR);
  EXPECT_LT(TOVOFSDirIsMntPoint((dir / "absent").c_str()), 0);
  EXPECT_EQ(TLIBCErrGet(), ENOENT);
  EXPECT_LT(TOVOFSDirIsMntPoint(nullptr), 0);
}

TEST(DirIsMntPointFallbackTest, TheRootDirectoryIsItsOwnParentAndCounts) {
  const FaultScope scope;
  faults.statx_knows_mounts = false;
  EXPECT_GT(TOVOFSDirIsMntPoint("/"), 0);
}

TEST(DirIsMntPointFallbackTest, ADirectoryThatCannotBeComparedIsAFailure) {
  const FaultScope scope;
  const TempDir dir;
  for (const int spared : {0, 1}) {  // itself, and what is above it
    faults.statx_knows_mounts = false;
    faults.stat.Arm(EACCES, spared);
    EXPECT_LT(TOVOFSDirIsMntPoint(dir.Path().c_str()), 0);
    EXPECT_EQ(TLIBCErrGet(), EACCES);
  }
}

}  // namespace
