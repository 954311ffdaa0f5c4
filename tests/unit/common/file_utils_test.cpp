#include "appindex/utilities/file_utils.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>
#include <string>

#include "file_calls.h"
#include "tests/support/device_root_test.h"

namespace {

using test::Exists;
using test::MakeDirs;
using test::WriteFile;

void MakeLink(const std::string& content, const std::string& path) {
  if (symlink(content.c_str(), path.c_str()) != 0) throw std::runtime_error("cannot link " + path);
}

class FileUtilsTest : public test::DeviceRootTest {
 protected:
  FileUtilsTest() {
    MakeDirs("/data/dir");
    WriteFile("/data/file", "content");
  }
};

using IsFileExistTest = FileUtilsTest;
using IsDirExistTest = FileUtilsTest;
using UnlinkTest = FileUtilsTest;
using RealPathTest = FileUtilsTest;
using CopyTest = FileUtilsTest;
using DeviceQueriesTest = FileUtilsTest;

TEST_F(IsFileExistTest, IsTrueOfARegularFile) { EXPECT_TRUE(velkor::IsFileExist("/data/file")); }

TEST_F(IsFileExistTest, IsFalseOfALinkToARegularFile) {
  MakeLink("/data/file", "/data/link");
  EXPECT_FALSE(velkor::IsFileExist("/data/link"));
}

TEST_F(IsFileExistTest, IsFalseOfWhatIsMissingADirectoryOrAnotherKind) {
  mkfifo("/data/fifo", 0644);
  EXPECT_FALSE(velkor::IsFileExist("/data/missing"));
  EXPECT_FALSE(velkor::IsFileExist("/data/dir"));
  EXPECT_FALSE(velkor::IsFileExist("/data/fifo"));
  EXPECT_FALSE(velkor::IsFileExist("/dev/log"));
  EXPECT_FALSE(velkor::IsFileExist(""));
}

TEST_F(IsDirExistTest, IsTrueOfADirectoryEitherWay) {
  EXPECT_TRUE(velkor::IsDirExist("/data/dir", false));
  EXPECT_TRUE(velkor::IsDirExist("/data/dir", true));
}

TEST_F(IsDirExistTest, IsFalseOfWhatIsMissingAFileOrAnotherKind) {
  mkfifo("/data/fifo", 0644);
  for (const bool follow : {false, true}) {
    EXPECT_FALSE(velkor::IsDirExist("/data/missing", follow));
    EXPECT_FALSE(velkor::IsDirExist("/data/file", follow));
    EXPECT_FALSE(velkor::IsDirExist("/data/fifo", follow));
    EXPECT_FALSE(velkor::IsDirExist("", follow));
  }
}

TEST_F(IsDirExistTest, OfALinkToADirectoryIsTrueOnlyWhenLinksAreFollowed) {
  MakeLink("/data/dir", "/data/link");
  EXPECT_FALSE(velkor::IsDirExist("/data/link", false));
  EXPECT_TRUE(velkor::IsDirExist("/data/link", true));
}

TEST_F(IsDirExistTest, TakesARelativeLinkFromTheCurrentDirectoryNotFromTheLinks) {
  MakeLink("dir", "/data/link");
  EXPECT_FALSE(velkor::IsDirExist("/data/link", true)) << "the current directory is /";
  ASSERT_EQ(chdir("/data"), 0);
  EXPECT_TRUE(velkor::IsDirExist("/data/link", true));
  MakeDirs("/other/dir");
  MakeLink("../data/missing", "/other/link");
  EXPECT_FALSE(velkor::IsDirExist("/other/link", true));
}

TEST_F(IsDirExistTest, FollowsAChainOfLinks) {
  std::string last = "/data/dir";
  for (int i = 0; i < 100; ++i) {  // more than the kernel itself would follow
    const std::string link = "/data/link" + std::to_string(i);
    MakeLink(last, link);
    last = link;
  }
  EXPECT_TRUE(velkor::IsDirExist(last, true));
  EXPECT_FALSE(velkor::IsDirExist(last, false));
}

TEST_F(IsDirExistTest, IsFalseOfALinkToAFileOrToNothing) {
  MakeLink("/data/file", "/data/to_file");
  MakeLink("/data/missing", "/data/to_nothing");
  EXPECT_FALSE(velkor::IsDirExist("/data/to_file", true));
  EXPECT_FALSE(velkor::IsDirExist("/data/to_nothing", true));
}

TEST_F(IsDirExistTest, IsFalseOfALinkThatIsGoneBeforeItIsRead) {
  MakeLink("/data/dir", "/data/link");
  const test::FileCallHook hook([](const test::FileCall& call) -> test::FileCallResult {
    if (call.name == "readlink") unlink(call.path.c_str());
    return {};
  });
  EXPECT_FALSE(velkor::IsDirExist("/data/link", true));
  EXPECT_FALSE(Exists("/data/link"));
}

TEST_F(IsDirExistTest, IsFalseOfLinksThatLeadToThemselves) {
  MakeLink("/data/self", "/data/self");
  MakeLink("/data/pong", "/data/ping");
  MakeLink("/data/ping", "/data/pong");
  EXPECT_FALSE(velkor::IsDirExist("/data/self", true));
  EXPECT_FALSE(velkor::IsDirExist("/data/ping", true));
}

TEST_F(IsDirExistTest, ATrailingSlashMakesTheKernelFollowTheLink) {
  MakeLink("dir", "/data/link");  // relative to the link, as the kernel takes it
  EXPECT_TRUE(velkor::IsDirExist("/data/link/", false));
  EXPECT_TRUE(velkor::IsDirExist("/data/link/", true));
  EXPECT_FALSE(velkor::IsDirExist("/data/file/", true));
}

TEST_F(IsDirExistTest, ReadsALinkOf4095BytesWhole) {
  const std::string content = std::string(4095 - std::strlen("data/dir"), '/') + "data/dir";
  MakeLink(content, "/data/link");
  EXPECT_TRUE(velkor::IsDirExist("/data/link", true));
}

TEST(IsDirentDirTest, GoesByTheTypeOfTheEntryAlone) {
  dirent entry{};
  entry.d_type = DT_DIR;
  EXPECT_TRUE(velkor::IsDirentDir(entry, "/"));
  EXPECT_TRUE(velkor::IsDirentDir(entry, "/missing"));
  for (const unsigned char type : {DT_REG, DT_LNK, DT_FIFO, DT_SOCK, DT_CHR, DT_BLK}) {
    entry.d_type = type;
    EXPECT_FALSE(velkor::IsDirentDir(entry, "/")) << static_cast<int>(type);
  }
}

TEST(IsDirentDirTest, AnEntryOfUnknownTypeIsNoDirectoryWhetherItsPathExistsOrNot) {
  dirent entry{};
  entry.d_type = DT_UNKNOWN;
  EXPECT_FALSE(velkor::IsDirentDir(entry, "/"));
  EXPECT_FALSE(velkor::IsDirentDir(entry, "/missing"));
}

TEST(StringStartWithTest, IsTrueWhenThePrefixStandsAtTheBeginning) {
  EXPECT_TRUE(velkor::StringStartWith("/var/packages/A", "/var/packages/"));
  EXPECT_TRUE(velkor::StringStartWith("abab", "ab"));
  EXPECT_TRUE(velkor::StringStartWith("ab", "ab"));
}

TEST(StringStartWithTest, IsFalseWhenItStandsElsewhereOrNowhere) {
  EXPECT_FALSE(velkor::StringStartWith("xab", "ab"));
  EXPECT_FALSE(velkor::StringStartWith("a", "ab"));
  EXPECT_FALSE(velkor::StringStartWith("", "a"));
}

TEST(StringStartWithTest, AnEmptyPrefixBeginsEveryText) {
  EXPECT_TRUE(velkor::StringStartWith("a", ""));
  EXPECT_TRUE(velkor::StringStartWith("", ""));
}

TEST(BasenameTest, IsWhatFollowsTheLastSlash) {
  EXPECT_EQ(velkor::Basename("/a/b.c"), "b.c");
  EXPECT_EQ(velkor::Basename("a//b"), "b");
  EXPECT_EQ(velkor::Basename("/a/.."), "..");
}

TEST(BasenameTest, IsTheWholePathWithoutASlash) {
  EXPECT_EQ(velkor::Basename("name"), "name");
  EXPECT_EQ(velkor::Basename(""), "");
}

TEST(BasenameTest, IsEmptyOfAPathThatEndsInASlash) { EXPECT_EQ(velkor::Basename("/a/b/"), ""); }

TEST(BasenameTest, OfALoneSlashIsEmpty) { EXPECT_EQ(velkor::Basename("/"), ""); }

TEST(DirnameTest, IsWhatPrecedesTheLastSlash) {
  EXPECT_EQ(velkor::Dirname("/a/b.c"), "/a");
  EXPECT_EQ(velkor::Dirname("/a/b/"), "/a/b");
  EXPECT_EQ(velkor::Dirname("a//b"), "a/");
}

TEST(DirnameTest, OfABareNameIsTheName) {
  EXPECT_EQ(velkor::Dirname("name"), "name");
  EXPECT_EQ(velkor::Dirname(""), "");
}

TEST(DirnameTest, OfANameInTheRootIsEmpty) { EXPECT_EQ(velkor::Dirname("/a"), ""); }

TEST(DirnameTest, OfALoneSlashIsEmpty) { EXPECT_EQ(velkor::Dirname("/"), ""); }

TEST(GetFileExtensionTest, IsWhatFollowsTheLastDot) {
  EXPECT_EQ(velkor::GetFileExtension("/a/b.tar.gz", false), "gz");
}

TEST(GetFileExtensionTest, ADotInADirectoryNameIsNotSeen) {
  EXPECT_EQ(velkor::GetFileExtension("/x.d/Readme", false), "");
  EXPECT_EQ(velkor::GetFileExtension("/x.d/", false), "");
}

TEST(GetFileExtensionTest, IsLowerCasedOnlyWhenAsked) {
  EXPECT_EQ(velkor::GetFileExtension("A.TXT", true), "txt");
  EXPECT_EQ(velkor::GetFileExtension("A.TXT", false), "TXT");
}

TEST(GetFileExtensionTest, BytesBeyondAsciiAreKept) {
  EXPECT_EQ(velkor::GetFileExtension("a.\xC3\x84Z\xFF", true), "\xC3\x84z\xFF");
}

TEST(GetFileExtensionTest, ALeadingDotCounts) {
  EXPECT_EQ(velkor::GetFileExtension(".profile", false), "profile");
}

TEST(GetFileExtensionTest, IsEmptyAfterATrailingDotAndWithoutADot) {
  EXPECT_EQ(velkor::GetFileExtension("name.", false), "");
  EXPECT_EQ(velkor::GetFileExtension("name", true), "");
  EXPECT_EQ(velkor::GetFileExtension("", true), "");
}

TEST_F(RealPathTest, ResolvesLinksDotsAndRepeatedSlashes) {
  MakeLink("dir", "/data/link");
  EXPECT_EQ(velkor::RealPath("/data//./link/../file"), "/data/file");
  EXPECT_EQ(velkor::RealPath("/data/link/"), "/data/dir");
}

TEST_F(RealPathTest, TakesARelativePathFromTheCurrentDirectory) {
  ASSERT_EQ(chdir("/data"), 0);
  EXPECT_EQ(velkor::RealPath("dir"), "/data/dir");
}

TEST_F(RealPathTest, OfAMissingPathIsEmpty) {
  EXPECT_EQ(velkor::RealPath("/data/missing"), "");
  EXPECT_EQ(velkor::RealPath(""), "");
}

TEST_F(RealPathTest, OfALoopOrATooLongPathIsEmpty) {
  MakeLink("/data/self", "/data/self");
  EXPECT_EQ(velkor::RealPath("/data/self"), "");
  EXPECT_EQ(velkor::RealPath("/data/" + std::string(5000, 'x')), "");
}

TEST_F(UnlinkTest, RemovesAFile) {
  EXPECT_TRUE(velkor::Unlink("/data/file"));
  EXPECT_FALSE(Exists("/data/file"));
}

TEST_F(UnlinkTest, OfAMissingFileIsTrue) { EXPECT_TRUE(velkor::Unlink("/data/missing")); }

TEST_F(UnlinkTest, OfADirectoryIsFalseAndLeavesIt) {
  EXPECT_FALSE(velkor::Unlink("/data/dir"));
  EXPECT_TRUE(Exists("/data/dir"));
}

TEST_F(UnlinkTest, OfAPathThroughAFileIsFalse) {
  EXPECT_FALSE(velkor::Unlink("/data/file/x"));
  EXPECT_EQ(errno, ENOTDIR);
}

TEST_F(UnlinkTest, RemovesALinkAndNotWhatItLeadsTo) {
  MakeLink("/data/file", "/data/link");
  EXPECT_TRUE(velkor::Unlink("/data/link"));
  EXPECT_FALSE(Exists("/data/link"));
  EXPECT_TRUE(Exists("/data/file"));
}

TEST_F(CopyTest, CPFileCopiesAndKeepsTheSource) {
  EXPECT_TRUE(velkor::CPFile("/data/file", "/data/copy"));
  EXPECT_EQ(test::ReadFile("/data/copy"), "content");
  EXPECT_EQ(test::ReadFile("/data/file"), "content");
}

TEST_F(CopyTest, MVFileMovesAndRemovesTheSource) {
  EXPECT_TRUE(velkor::MVFile("/data/file", "/data/moved"));
  EXPECT_EQ(test::ReadFile("/data/moved"), "content");
  EXPECT_FALSE(Exists("/data/file"));
}

TEST_F(CopyTest, BothAreFalseOfAMissingSource) {
  EXPECT_FALSE(velkor::CPFile("/data/missing", "/data/copy"));
  EXPECT_FALSE(velkor::MVFile("/data/missing", "/data/copy"));
  EXPECT_FALSE(Exists("/data/copy"));
}

TEST_F(DeviceQueriesTest, ADirectoryOfTheRootIsNoMountPointNorIsWhatIsMissing) {
  EXPECT_FALSE(velkor::IsMountPoint("/data/dir"));
  EXPECT_FALSE(velkor::IsMountPoint("/data/missing"));
}

TEST_F(DeviceQueriesTest, CheckACLPermTellsTheRightsOfTheCaller) {
  EXPECT_TRUE(velkor::CheckACLPerm("/data/file", 4));
  EXPECT_FALSE(velkor::CheckACLPerm("/data/file", 1)) << "nobody may execute it";
  EXPECT_FALSE(velkor::CheckACLPerm("/data/missing", 7));
}

}  // namespace
