// What the file utilities ask of the device, and what they make of its answers.
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <string>

#include "appindex/error.h"
#include "appindex/utilities/credentials.h"
#include "appindex/utilities/file_utils.h"
#include "device/tovo_file.h"
#include "tests/support/device_root_test.h"
#include "tests/support/fake_user_db.h"

namespace {

// The device's file functions: what they were given and what they answer.
struct FakeFiles {
  std::string path;
  std::string destination;
  std::array<uint32_t, 15> words{};
  int result = 0;
  int permissions = 0;
};

FakeFiles& Files() {
  static FakeFiles files;
  return files;
}

}  // namespace

extern "C" {

int TOVOFileCopy(const char* src, const char* dst, TOVOCOPYARGS* args) {
  Files().path = src;
  Files().destination = dst;
  std::copy(std::begin(args->words), std::end(args->words), Files().words.begin());
  return Files().result;
}

int TOVOACLPermGet(const char* path, int* perm) {
  Files().path = path;
  *perm = Files().permissions;
  return Files().result;
}

int TOVOFSDirIsMntPoint(const char* path) {
  Files().path = path;
  return Files().result;
}

}  // extern "C"

namespace {

using test::UserDb;
using testing::Each;
using testing::ElementsAre;
using testing::IsEmpty;
using velkor::Error;

class DeviceFilesTest : public testing::Test {
 protected:
  DeviceFilesTest() { Files() = FakeFiles(); }
};

using CheckACLPermTest = DeviceFilesTest;
using IsMountPointTest = DeviceFilesTest;
using CopyArgumentsTest = DeviceFilesTest;

TEST_F(CheckACLPermTest, IsTrueWhenAnyBitOfTheMaskIsGranted) {
  Files().permissions = 4;
  EXPECT_TRUE(velkor::CheckACLPerm("/a/b", 4 | 2));
  EXPECT_EQ(Files().path, "/a/b");
}

TEST_F(CheckACLPermTest, IsFalseWhenNoBitOfTheMaskIsGranted) {
  Files().permissions = 4;
  EXPECT_FALSE(velkor::CheckACLPerm("/a/b", 2 | 1));
  EXPECT_FALSE(velkor::CheckACLPerm("/a/b", 0));
}

TEST_F(CheckACLPermTest, IsFalseOnANegativeResultWhateverTheBits) {
  Files().permissions = 7;
  Files().result = -1;
  EXPECT_FALSE(velkor::CheckACLPerm("/a/b", 7));
}

TEST_F(CheckACLPermTest, AnyResultThatIsNotNegativeIsASuccess) {
  Files().permissions = 7;
  Files().result = 3;
  EXPECT_TRUE(velkor::CheckACLPerm("/a/b", 7));
}

TEST_F(IsMountPointTest, IsTrueOfAPositiveAnswerAlone) {
  for (const int answer : {1, 2}) {
    Files().result = answer;
    EXPECT_TRUE(velkor::IsMountPoint("/a/b")) << answer;
  }
  for (const int answer : {0, -1}) {
    Files().result = answer;
    EXPECT_FALSE(velkor::IsMountPoint("/a/b")) << answer;
  }
  EXPECT_EQ(Files().path, "/a/b");
}

TEST_F(CopyArgumentsTest, OfMVFileAreOneInTheFirstTwoWordsAndZeroBehind) {
  EXPECT_TRUE(velkor::MVFile("/a", "/b"));
  EXPECT_EQ(Files().path, "/a");
  EXPECT_EQ(Files().destination, "/b");
  EXPECT_THAT(Files().words, ElementsAre(1, 1, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0));
}

TEST_F(CopyArgumentsTest, OfCPFileAreOneInTheFirstWordAndZeroBehind) {
  EXPECT_TRUE(velkor::CPFile("/a", "/b"));
  EXPECT_EQ(Files().path, "/a");
  EXPECT_EQ(Files().destination, "/b");
  EXPECT_THAT(Files().words, ElementsAre(1, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0));
}

TEST_F(CopyArgumentsTest, OfMVFileImplAreTheCallersOwn) {
  TOVOCOPYARGS args{};
  std::fill(std::begin(args.words), std::end(args.words), 9U);
  EXPECT_TRUE(velkor::MVFileImpl("/a", "/b", &args));
  EXPECT_THAT(Files().words, Each(9U));
}

TEST_F(CopyArgumentsTest, AnyResultButZeroIsAFailure) {
  for (const int result : {-1, 1}) {
    Files().result = result;
    TOVOCOPYARGS args{};
    EXPECT_FALSE(velkor::MVFileImpl("/a", "/b", &args)) << result;
    EXPECT_FALSE(velkor::MVFile("/a", "/b")) << result;
    EXPECT_FALSE(velkor::CPFile("/a", "/b")) << result;
  }
}

// The package's own user has the tests' ids, so that anyone may run them.
class ChownVelkorTest : public test::DeviceRootTest {
 protected:
  ChownVelkorTest() {
    UserDb() = test::FakeUserDb();
    UserDb().users.push_back({"Velkor", geteuid(), getegid()});
    test::WriteFile("/data/file", "");
  }
};

TEST_F(ChownVelkorTest, LooksThePackagesUserUpAndFreesTheRecord) {
  EXPECT_TRUE(velkor::ChownVelkor("/data/file"));
  EXPECT_THAT(UserDb().calls,
              ElementsAre("TOVOUserGet Velkor", "TOVOServiceUserHomeIsEnabled Velkor",
                          "TOVOUserFree Velkor"));
  EXPECT_EQ(UserDb().records_held, 0);
}

TEST_F(ChownVelkorTest, HoldsTheSdkMutexWhileItAsksAndNotAfterwards) {
  UserDb().on_call = [] { EXPECT_FALSE(velkor::sdk::SDKMutex().TryLock()); };
  velkor::ChownVelkor("/data/file");
  EXPECT_TRUE(velkor::sdk::SDKMutex().TryLock());
  velkor::sdk::SDKMutex().Unlock();
}

TEST_F(ChownVelkorTest, WithoutThePackagesUserThrows801WithoutAReasonOrALine) {
  UserDb().users = {{"root", 0, 0}};
  try {
    velkor::ChownVelkor("/data/file");
    ADD_FAILURE() << "did not throw";
  } catch (const Error& error) {
    EXPECT_EQ(error.code, Error::kChownError);
    EXPECT_EQ(error.reason, "");
  }
  EXPECT_THAT(TakeLog(), IsEmpty());
  EXPECT_TRUE(velkor::sdk::SDKMutex().TryLock()) << "the mutex is free again";
  velkor::sdk::SDKMutex().Unlock();
}

TEST_F(ChownVelkorTest, AUserWithoutARecordThrows801Too) {
  UserDb().gives_null_records = true;
  try {
    velkor::ChownVelkor("/data/file");
    ADD_FAILURE() << "did not throw";
  } catch (const Error& error) {
    EXPECT_EQ(error.code, Error::kChownError);
  }
}

TEST_F(ChownVelkorTest, AChownThatFailsIsFalseAndNoException) {
  EXPECT_FALSE(velkor::ChownVelkor("/data/missing"));
  EXPECT_EQ(errno, ENOENT);
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(ChownVelkorTest, GivesTheFileTheUsersIds) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: gives a file away";
  UserDb().users = {{"Velkor", 510, 511}};
  EXPECT_TRUE(velkor::ChownVelkor("/data/file"));
  struct stat info {};
  stat("/data/file", &info);
  EXPECT_EQ(info.st_uid, 510U);
  EXPECT_EQ(info.st_gid, 511U);
}

TEST_F(ChownVelkorTest, FollowsALink) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: gives a file away";
  UserDb().users = {{"Velkor", 510, 511}};
  ASSERT_EQ(symlink("/data/file", "/data/link"), 0);
  EXPECT_TRUE(velkor::ChownVelkor("/data/link"));
  struct stat info {};
  stat("/data/file", &info);
  EXPECT_EQ(info.st_uid, 510U);
  lstat("/data/link", &info);
  EXPECT_EQ(info.st_uid, 0U);
}

}  // namespace
