#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <string>

#include "device/tovo_config.h"
#include "device/tovo_file.h"
#include "tests/unit/host/child.h"
#include "tests/unit/host/faults.h"
#include "tests/unit/host/temp_dir.h"

namespace fs = std::filesystem;

namespace {

using testing::ElementsAre;

enum class Request { kCopy, kMove };

int Ask(Request request, const std::string& src, const std::string& dst) {
  TOVOCOPYARGS args{};
  args.words[0] = 1;
  args.words[1] = request == Request::kMove ? 1 : 0;
  return TOVOFileCopy(src.c_str(), dst.c_str(), &args);
}

struct stat StatOf(const std::string& path) {
  struct stat info {};
  EXPECT_EQ(lstat(path.c_str(), &info), 0) << path;
  return info;
}

void ExpectSameAttributes(const struct stat& a, const struct stat& b) {
  EXPECT_EQ(a.st_mode, b.st_mode);
  EXPECT_EQ(a.st_uid, b.st_uid);
  EXPECT_EQ(a.st_gid, b.st_gid);
  EXPECT_EQ(a.st_atim.tv_sec, b.st_atim.tv_sec);
  EXPECT_EQ(a.st_atim.tv_nsec, b.st_atim.tv_nsec);
  EXPECT_EQ(a.st_mtim.tv_sec, b.st_mtim.tv_sec);
  EXPECT_EQ(a.st_mtim.tv_nsec, b.st_mtim.tv_nsec);
}

class FileCopyTest : public testing::TestWithParam<Request> {
 protected:
  // A file with attributes that no new file has.
  std::string WriteSource(const std::string& content = "content") const {
    std::string path = dir_.Write("source", content);
    EXPECT_EQ(chmod(path.c_str(), 0640), 0);
    const timespec times[] = {{1000000000, 111}, {1100000000, 222}};
    EXPECT_EQ(utimensat(AT_FDCWD, path.c_str(), times, 0), 0);
    return path;
  }

  void ExpectRefused(const std::string& src, const std::string& dst, int error) const {
    errno = 0;
    EXPECT_LT(Ask(GetParam(), src, dst), 0);
    EXPECT_EQ(errno, error);
    EXPECT_EQ(TLIBCErrGet(), error);
  }

  const TempDir dir_;
  const FaultScope scope_;
};

// What holds for a copy and for a move alike.
INSTANTIATE_TEST_SUITE_P(Request, FileCopyTest, testing::Values(Request::kCopy, Request::kMove),
                         [](const auto& instance) {
                           return instance.param == Request::kCopy ? "Copy" : "Move";
                         });

TEST_P(FileCopyTest, BringsContentModeOwnerAndTimes) {
  const std::string source = WriteSource();
  const struct stat before = StatOf(source);
  ASSERT_EQ(Ask(GetParam(), source, dir_ / "target"), 0);
  EXPECT_EQ(fs::exists(source), GetParam() == Request::kCopy);
  ExpectSameAttributes(StatOf(dir_ / "target"), before);
  EXPECT_EQ(ReadFile(dir_ / "target"), "content");
}

TEST_P(FileCopyTest, ReplacesTheFileThatIsThere) {
  const std::string target = dir_.Write("target", "something longer that was there before");
  ASSERT_EQ(Ask(GetParam(), WriteSource(), target), 0);
  EXPECT_EQ(ReadFile(target), "content");
}

TEST_P(FileCopyTest, ReplacesALinkInsteadOfFollowingIt) {
  const std::string other = dir_.Write("other", "other");
  ASSERT_EQ(symlink(other.c_str(), (dir_ / "target").c_str()), 0);
  ASSERT_EQ(Ask(GetParam(), WriteSource(), dir_ / "target"), 0);
  EXPECT_TRUE(fs::is_regular_file(fs::symlink_status(dir_ / "target")));
  EXPECT_EQ(ReadFile(other), "other");
}

TEST_P(FileCopyTest, TakesNamesInTheCurrentDirectory) {
  const std::string source = WriteSource();
  RunInChild([&] {
    fs::current_path(dir_.Path());
    EXPECT_EQ(Ask(GetParam(), "source", "target"), 0);
  });
  EXPECT_EQ(ReadFile(dir_ / "target"), "content");
}

TEST_P(FileCopyTest, AMissingSourceIsRefused) {
  ExpectRefused(dir_ / "absent", dir_ / "target", ENOENT);
  EXPECT_THAT(dir_.Names(), ElementsAre());
}

TEST_P(FileCopyTest, ALinkIsRefusedAsSource) {
  ASSERT_EQ(symlink(WriteSource().c_str(), (dir_ / "link").c_str()), 0);
  ExpectRefused(dir_ / "link", dir_ / "target", ELOOP);
  EXPECT_THAT(dir_.Names(), ElementsAre("link", "source"));
}

TEST_P(FileCopyTest, ADirectoryIsRefusedAsSource) {
  fs::create_directory(dir_ / "dir");
  ExpectRefused(dir_ / "dir", dir_ / "target", EISDIR);
}

TEST_P(FileCopyTest, AFifoIsRefusedAsSourceAndNotWaitedFor) {
  ASSERT_EQ(mkfifo((dir_ / "fifo").c_str(), 0600), 0);
  ExpectRefused(dir_ / "fifo", dir_ / "target", EINVAL);
}

TEST_P(FileCopyTest, ADirectoryIsNotReplaced) {
  const std::string source = WriteSource();
  fs::create_directory(dir_ / "target");
  ExpectRefused(source, dir_ / "target", EISDIR);
  EXPECT_THAT(dir_.Names(), ElementsAre("source", "target"));
}

TEST_P(FileCopyTest, AMissingTargetDirectoryIsRefused) {
  ExpectRefused(WriteSource(), dir_ / "absent/target", ENOENT);
  EXPECT_THAT(dir_.Names(), ElementsAre("source"));
}

TEST_P(FileCopyTest, AFileIsNotPutInItsOwnPlace) {
  const std::string source = WriteSource();
  ASSERT_EQ(link(source.c_str(), (dir_ / "second").c_str()), 0);
  ExpectRefused(source, source, EINVAL);
  ExpectRefused(source, dir_ / "./source", EINVAL);
  ExpectRefused(source, dir_ / "second", EINVAL);
  EXPECT_EQ(ReadFile(source), "content");
}

TEST_P(FileCopyTest, ATargetDirectoryThatMayNotBeWrittenIsRefused) {
  const std::string source = WriteSource();
  fs::create_directory(dir_ / "closed");
  ASSERT_EQ(chmod(dir_.Path().c_str(), 0755), 0);
  ASSERT_EQ(chmod(source.c_str(), 0644), 0);
  ASSERT_EQ(chmod((dir_ / "closed").c_str(), 0555), 0);
  RunInChild([&] {
    BecomeOrdinaryUser();
    ExpectRefused(source, dir_ / "closed/target", EACCES);
  });
  EXPECT_EQ(ReadFile(source), "content");
  EXPECT_TRUE(fs::is_empty(dir_ / "closed"));
}

TEST_P(FileCopyTest, LeavesNoDescriptorOpen) {
  const std::string source = WriteSource();
  const std::size_t before = OpenDescriptors();
  EXPECT_EQ(Ask(GetParam(), source, dir_ / "target"), 0);
  EXPECT_LT(Ask(GetParam(), dir_ / "target", dir_ / "absent/target"), 0);
  EXPECT_EQ(OpenDescriptors(), before);
}

TEST(FileCopyRequestTest, OneThatIsNotUnderstoodIsRefused) {
  const TempDir dir;
  const std::string source = dir.Write("source", "content");
  const std::string target = dir / "target";
  const auto refused = [&](const char* src, const char* dst, TOVOCOPYARGS* args) {
    return TOVOFileCopy(src, dst, args) < 0 && errno == EINVAL;
  };
  TOVOCOPYARGS good{};
  good.words[0] = 1;
  EXPECT_TRUE(refused(nullptr, target.c_str(), &good));
  EXPECT_TRUE(refused(source.c_str(), nullptr, &good));
  EXPECT_TRUE(refused(source.c_str(), target.c_str(), nullptr));
  for (const auto& [word, value] : {std::pair{0, 0U}, {0, 2U}, {1, 2U}, {2, 1U}, {14, 1U}}) {
    TOVOCOPYARGS args = good;
    args.words[word] = value;
    EXPECT_TRUE(refused(source.c_str(), target.c_str(), &args)) << word << "=" << value;
  }
  EXPECT_THAT(dir.Names(), ElementsAre("source"));
}

// Copying the bytes, which is what a move across file systems does too. There rename is made to say
// that the target is on another file system.
class FileTransferTest : public FileCopyTest {
 protected:
  // Makes the rename that a move tries first fail.
  void CrossFileSystems() const {
    if (GetParam() == Request::kMove) faults.rename.Arm(EXDEV);
  }

  // Expects the request to fail and to have changed nothing.
  void ExpectFailureWithoutTrace(const std::string& source, int error) const {
    ExpectRefused(source, dir_ / "target", error);
    EXPECT_THAT(dir_.Names(), ElementsAre("source", "target"));
    EXPECT_EQ(ReadFile(source), "content");
    EXPECT_EQ(ReadFile(dir_ / "target"), "before");
  }
};

INSTANTIATE_TEST_SUITE_P(Request, FileTransferTest, testing::Values(Request::kCopy, Request::kMove),
                         [](const auto& instance) {
                           return instance.param == Request::kCopy ? "Copy" : "MoveAcross";
                         });

TEST_P(FileTransferTest, BringsContentOfAnySize) {
  for (const std::size_t size : {0U, 1U, 65535U, 65536U, 65537U, 1000000U}) {
    std::string content(size, '\0');
    for (std::size_t i = 0; i < size; ++i) content[i] = static_cast<char>(i * 7 + i / 256);
    const std::string source = WriteSource(content);
    CrossFileSystems();
    ASSERT_EQ(Ask(GetParam(), source, dir_ / "target"), 0) << size;
    EXPECT_TRUE(ReadFile(dir_ / "target") == content) << size;
  }
}

TEST_P(FileTransferTest, LeavesNoErrorToBeLoggedLater) {
  const std::string source = WriteSource();
  CrossFileSystems();
  errno = 0;
  ASSERT_EQ(Ask(GetParam(), source, dir_ / "target"), 0);
  EXPECT_EQ(errno, 0);
}

TEST_P(FileTransferTest, KeepsAttributesAndRemovesTheSourceOfAMove) {
  const std::string source = WriteSource();
  const struct stat before = StatOf(source);
  CrossFileSystems();
  ASSERT_EQ(Ask(GetParam(), source, dir_ / "target"), 0);
  const struct stat after = StatOf(dir_ / "target");
  ExpectSameAttributes(after, before);
  EXPECT_NE(after.st_ino, before.st_ino);
  EXPECT_EQ(fs::exists(source), GetParam() == Request::kCopy);
}

TEST_P(FileTransferTest, KeepsOwnerAndSetIdBitsForRoot) {
  if (!IsRoot()) GTEST_SKIP() << "needs root, to give files away";
  const std::string source = WriteSource();
  ASSERT_EQ(chown(source.c_str(), 61001, 61002), 0);
  ASSERT_EQ(chmod(source.c_str(), 06755), 0);
  CrossFileSystems();
  ASSERT_EQ(Ask(GetParam(), source, dir_ / "target"), 0);
  const struct stat after = StatOf(dir_ / "target");
  EXPECT_EQ(after.st_uid, 61001U);
  EXPECT_EQ(after.st_gid, 61002U);
  EXPECT_EQ(after.st_mode & 07777U, 06755U);
}

TEST_P(FileTransferTest, DropsSetIdBitsWhereTheOwnerCannotBeKept) {
  if (!IsRoot()) GTEST_SKIP() << "needs root, to make a file of another user";
  const std::string source = WriteSource();
  ASSERT_EQ(chmod(source.c_str(), 06755), 0);
  ASSERT_EQ(chown(dir_.Path().c_str(), kOrdinaryId, kOrdinaryId), 0);
  RunInChild([&] {
    BecomeOrdinaryUser();
    CrossFileSystems();
    EXPECT_EQ(Ask(GetParam(), source, dir_ / "target"), 0);
  });
  const struct stat after = StatOf(dir_ / "target");
  EXPECT_EQ(after.st_uid, kOrdinaryId);
  EXPECT_EQ(after.st_mode & 07777U, 0755U);
}

// Each step up to the one by which the copy takes its place.
TEST_P(FileTransferTest, AStepThatFailsLeavesEverythingAsItWas) {
  const std::string source = WriteSource();
  dir_.Write("target", "before");
  const auto expect_failure = [&](Fault& step, int error, int spared = 0) {
    CrossFileSystems();
    step.Arm(error, spared);
    ExpectFailureWithoutTrace(source, error);
  };
  expect_failure(faults.open, EMFILE);
  expect_failure(faults.open, EMFILE, 1);  // of the target's directory
  expect_failure(faults.mkostemp, ENFILE);
  expect_failure(faults.read, EIO);
  expect_failure(faults.write, ENOSPC);
  expect_failure(faults.fchown, EROFS);
  CrossFileSystems();
  faults.fchown.ArmEach({EPERM, EIO});  // the owner, and then the group alone
  ExpectFailureWithoutTrace(source, EIO);
  expect_failure(faults.fchmod, EIO);
  expect_failure(faults.futimens, EIO);
  expect_failure(faults.fsync, EIO);
}

TEST_P(FileTransferTest, AFileThatCannotBeGivenAwayIsCopiedWithoutItsSetIdBits) {
  for (const int error : {EPERM, EINVAL}) {  // not allowed, or there is no such user in this root
    const std::string source = WriteSource();
    ASSERT_EQ(chmod(source.c_str(), 06755), 0);
    CrossFileSystems();
    faults.fchown.Arm(error, 0, 2);
    ASSERT_EQ(Ask(GetParam(), source, dir_ / "target"), 0);
    EXPECT_EQ(ReadFile(dir_ / "target"), "content");
    EXPECT_EQ(StatOf(dir_ / "target").st_mode & 07777U, 0755U);
  }
}

TEST_P(FileTransferTest, InterruptedCallsGoOn) {
  const std::string source = WriteSource();
  CrossFileSystems();
  faults.read.Arm(EINTR);
  faults.write.Arm(EINTR);
  EXPECT_EQ(Ask(GetParam(), source, dir_ / "target"), 0);
  EXPECT_EQ(ReadFile(dir_ / "target"), "content");
}

TEST_P(FileTransferTest, ADirectoryThatCannotBeMadeDurableKeepsTheSource) {
  const std::string source = WriteSource();
  CrossFileSystems();
  faults.fsync.Arm(EIO, 1);
  ExpectRefused(source, dir_ / "target", EIO);
  EXPECT_THAT(dir_.Names(), ElementsAre("source", "target"));
}

TEST(FileCopyFailureTest, ACopyThatCannotTakeItsPlaceLeavesEverythingAsItWas) {
  const FaultScope scope;
  const TempDir dir;
  const std::string source = dir.Write("source", "content");
  faults.rename.Arm(EPERM);
  EXPECT_LT(Ask(Request::kCopy, source, dir.Write("target", "before")), 0);
  EXPECT_EQ(errno, EPERM);
  EXPECT_THAT(dir.Names(), ElementsAre("source", "target"));
  EXPECT_EQ(ReadFile(dir / "target"), "before");
}

TEST(FileMoveTest, WithinAFileSystemIsARename) {
  const TempDir dir;
  const std::string source = dir.Write("source", "content");
  const ino_t before = StatOf(source).st_ino;
  ASSERT_EQ(Ask(Request::kMove, source, dir / "target"), 0);
  EXPECT_EQ(StatOf(dir / "target").st_ino, before);
}

TEST(FileMoveTest, ARefusedRenameIsNotTurnedIntoACopy) {
  const FaultScope scope;
  const TempDir dir;
  const std::string source = dir.Write("source", "content");
  faults.rename.Arm(EPERM);
  EXPECT_LT(Ask(Request::kMove, source, dir / "target"), 0);
  EXPECT_EQ(errno, EPERM);
  EXPECT_THAT(dir.Names(), ElementsAre("source"));
}

TEST(FileMoveTest, ASourceThatCannotBeRemovedIsAFailureWithBothInPlace) {
  const FaultScope scope;
  const TempDir dir;
  const std::string source = dir.Write("closed/source", "content");
  fs::create_directory(dir / "open");
  ASSERT_EQ(chmod(dir.Path().c_str(), 0755), 0);
  ASSERT_EQ(chmod((dir / "open").c_str(), 0777), 0);
  ASSERT_EQ(chmod((dir / "closed").c_str(), 0555), 0);
  RunInChild([&] {
    BecomeOrdinaryUser();
    faults.rename.Arm(EXDEV);
    EXPECT_LT(Ask(Request::kMove, source, dir / "open/target"), 0);
    EXPECT_EQ(errno, EACCES);
  });
  EXPECT_EQ(ReadFile(source), "content");
  EXPECT_EQ(ReadFile(dir / "open/target"), "content");
  ASSERT_EQ(chmod((dir / "closed").c_str(), 0755), 0);
}

TEST(FileMoveTest, BetweenRealFileSystems) {
  const TempDir dir;
  if (!fs::is_directory("/dev/shm") || access("/dev/shm", W_OK) != 0 ||
      StatOf("/dev/shm").st_dev == StatOf(dir.Path()).st_dev) {
    GTEST_SKIP() << "/dev/shm is not a second file system here";
  }
  const TempDir other("/dev/shm");
  const std::string source = dir.Write("source", "content");
  ASSERT_EQ(chmod(source.c_str(), 0604), 0);
  const struct stat before = StatOf(source);
  ASSERT_EQ(Ask(Request::kMove, source, other / "target"), 0);
  EXPECT_THAT(dir.Names(), ElementsAre());
  EXPECT_THAT(other.Names(), ElementsAre("target"));
  ExpectSameAttributes(StatOf(other / "target"), before);
  EXPECT_EQ(ReadFile(other / "target"), "content");
}

}  // namespace
