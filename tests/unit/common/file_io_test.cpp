// Files that cannot be read, or that change while they are read.
#include "common/file_io.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <fstream>
#include <functional>
#include <string>

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

TEST_F(FileIoTest, AnInterruptedWriteGoesOn) {
  const Before write("write", [] { return EINTR; });
  EXPECT_TRUE(ReplaceFile(kPath, "new", 0600));
  EXPECT_TRUE(write.IsDone());
  EXPECT_EQ(test::ReadFile(kPath), "new");
}

}  // namespace
}  // namespace velkor
