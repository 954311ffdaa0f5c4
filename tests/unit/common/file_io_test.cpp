// Files that cannot be read, or that change while they are read.
#include "common/file_io.h"

#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

#include "file_calls.h"
#include "tests/support/device_root_test.h"

namespace velkor {
namespace {

using test::FileCall;
using test::FileCallHook;
using test::FileCallResult;

constexpr char kPath[] = "/file";

// Does something, once, before the first call of this name, and makes that call fail if it returns
// an error.
class Before {
 public:
  Before(std::string name, std::function<FileCallResult()> what)
      : hook_([this, name = std::move(name), what = std::move(what)](const FileCall& call) {
          if (done_ || call.name != name) return FileCallResult();
          done_ = true;
          return what();
        }) {}

  bool IsDone() const { return done_; }

 private:
  bool done_ = false;
  FileCallHook hook_;
};

class FileIoTest : public test::DeviceRootTest {
 protected:
  FileIoTest() { test::WriteFile(kPath, "content"); }

  static FileCallResult Append(const std::string& text) {
    std::ofstream(kPath, std::ios::app) << text;
    return {};
  }

  // The names in the root that begin with "file".
  static std::vector<std::string> Files() {
    std::vector<std::string> names;
    for (const auto& entry : std::filesystem::directory_iterator("/")) {
      const std::string name = entry.path().filename();
      if (name.compare(0, 4, "file") == 0) names.push_back(name);
    }
    return names;
  }

  static void ExpectRefused(std::size_t limit, int error) {
    std::string content = "untouched";
    errno = 0;
    EXPECT_FALSE(ReadRegularFile(kPath, limit, content));
    EXPECT_EQ(errno, error);
    EXPECT_EQ(content, "untouched");
  }
};

TEST_F(FileIoTest, AnInterruptedReadGoesOnAndIsNoFailure) {
  const Before read("read", [] { return EINTR; });
  std::string content;
  errno = 0;
  EXPECT_TRUE(ReadRegularFile(kPath, 100, content));
  EXPECT_EQ(content, "content");
  EXPECT_EQ(errno, 0);
  EXPECT_TRUE(read.IsDone());
}

TEST_F(FileIoTest, AReadThatFailsIsAFailure) {
  const Before read("read", [] { return EIO; });
  ExpectRefused(100, EIO);
}

TEST_F(FileIoTest, AFileThatGrowsMeanwhileIsReadToItsEnd) {
  const Before read("read", [] { return Append(std::string(1000, 'x')); });
  std::string content;
  EXPECT_TRUE(ReadRegularFile(kPath, 2000, content));
  EXPECT_EQ(content, "content" + std::string(1000, 'x'));
}

TEST_F(FileIoTest, AFileThatGrowsBeyondTheLimitIsRefused) {
  const Before read("read", [] { return Append(" and more"); });
  ExpectRefused(8, EFBIG);
}

TEST_F(FileIoTest, AFifoThatTakesTheFilesPlaceIsRefusedWithoutWaiting) {
  const Before opened("open", []() -> FileCallResult {
    EXPECT_EQ(unlink(kPath), 0);
    EXPECT_EQ(mkfifo(kPath, 0644), 0);
    return {};
  });
  ExpectRefused(100, EINVAL);
  EXPECT_TRUE(opened.IsDone());
}

// Piece by piece.

// What was given of the file, and errno; whether it was all of it.
bool ReadInPieces(std::string& content, int& error) {
  errno = 0;
  const bool read = ReadRegularFile(kPath, [&](std::string_view piece) { content += piece; });
  error = errno;
  return read;
}

TEST_F(FileIoTest, PiecesAreTheWholeFileInOrder) {
  std::string text;
  for (int i = 0; i < 20000; ++i) text += std::to_string(i) + "\n";
  test::WriteFile(kPath, text);
  std::string content;
  int error = -1;
  EXPECT_TRUE(ReadInPieces(content, error));
  EXPECT_EQ(content, text);
  EXPECT_EQ(error, 0);
}

TEST_F(FileIoTest, PiecesGoOnAfterAnInterruptionWhichIsNoFailure) {
  const Before read("read", [] { return EINTR; });
  std::string content;
  int error = -1;
  EXPECT_TRUE(ReadInPieces(content, error));
  EXPECT_EQ(content, "content");
  EXPECT_EQ(error, 0);
  EXPECT_TRUE(read.IsDone());
}

TEST_F(FileIoTest, PiecesThatCannotBeReadAreAFailure) {
  const Before read("read", [] { return EIO; });
  std::string content;
  int error = -1;
  EXPECT_FALSE(ReadInPieces(content, error));
  EXPECT_EQ(error, EIO);
}

TEST_F(FileIoTest, PiecesOfWhatIsNoRegularFileAreNone) {
  ASSERT_EQ(unlink(kPath), 0);
  test::MakeDirs(kPath);
  std::string content;
  int error = -1;
  EXPECT_FALSE(ReadInPieces(content, error));
  EXPECT_EQ(error, EISDIR);
  EXPECT_EQ(content, "");
}

// Replacing.

TEST_F(FileIoTest, AnInterruptedWriteGoesOn) {
  const Before write("write", [] { return EINTR; });
  EXPECT_TRUE(ReplaceFile(kPath, "new", 0600));
  EXPECT_TRUE(write.IsDone());
  EXPECT_EQ(test::ReadFile(kPath), "new");
}

TEST_F(FileIoTest, AFileThatCannotBeLookedAtOnceItIsOpenIsRefused) {
  const Before look("fstat", [] { return EIO; });
  ExpectRefused(100, EIO);
}

TEST_F(FileIoTest, ANameWithANulIsNotThatOfTheFileBeforeIt) {
  std::string content = "untouched";
  EXPECT_FALSE(ReadRegularFile(kPath + std::string("\0.conf", 6), 100, content));
  EXPECT_EQ(errno, ENOENT);
  EXPECT_EQ(content, "untouched");
}

// Between making the temporary file and locking it.
TEST_F(FileIoTest, ATemporaryFileThatAnotherWriterTookForALeftoverIsMadeAnew) {
  const Before lock("flock", []() -> FileCallResult {
    for (const std::string& name : Files()) {
      if (name == "file") continue;
      EXPECT_EQ(unlink(("/" + name).c_str()), 0);
    }
    return {};
  });
  EXPECT_TRUE(ReplaceFile(kPath, "new", 0600));
  EXPECT_TRUE(lock.IsDone());
  EXPECT_EQ(test::ReadFile(kPath), "new");
  EXPECT_THAT(Files(), testing::ElementsAre("file"));
}

TEST_F(FileIoTest, WhereThereAreNoLocksAFileIsReplacedAllTheSame) {
  const Before lock("flock", [] { return ENOLCK; });
  EXPECT_TRUE(ReplaceFile(kPath, "new", 0600));
  EXPECT_TRUE(lock.IsDone());
  EXPECT_EQ(test::ReadFile(kPath), "new");
}

TEST_F(FileIoTest, ATemporaryFileThatCannotBeLookedAtIsWrittenAllTheSame) {
  const Before look("fstat", [] { return EIO; });
  EXPECT_TRUE(ReplaceFile(kPath, "new", 0600));
  EXPECT_TRUE(look.IsDone());
  EXPECT_EQ(test::ReadFile(kPath), "new");
}

TEST_F(FileIoTest, OnlyLeftoversOfTheFileItselfAreRemoved) {
  test::WriteFile("/file.new.left12", "");
  test::WriteFile("/life.new.left12", "");
  EXPECT_TRUE(ReplaceFile(kPath, "new", 0600));
  EXPECT_FALSE(test::Exists("/file.new.left12"));
  EXPECT_TRUE(test::Exists("/life.new.left12"));
}

// Another writer holds its lock.
TEST_F(FileIoTest, ATemporaryFileThatIsBeingWrittenStays) {
  test::WriteFile("/file.new.kept12", "");
  const Before lock("flock", [] { return EWOULDBLOCK; });
  EXPECT_TRUE(ReplaceFile(kPath, "new", 0600));
  EXPECT_TRUE(test::Exists("/file.new.kept12"));
}

// No writer makes one.
TEST_F(FileIoTest, ALinkNamedLikeALeftoverStays) {
  test::WriteFile("/elsewhere", "");
  ASSERT_EQ(symlink("/elsewhere", "/file.new.link12"), 0);
  EXPECT_TRUE(ReplaceFile(kPath, "new", 0600));
  EXPECT_TRUE(test::Exists("/file.new.link12"));
}

}  // namespace
}  // namespace velkor
