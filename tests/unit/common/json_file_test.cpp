#include <gmock/gmock.h>
#include <json/value.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <filesystem>
#include <ostream>
#include <string>
#include <vector>

#include "appindex/utilities/json_helpers.h"
#include "file_calls.h"
#include "json_samples.h"
#include "tests/support/device_root_test.h"

namespace {

using test::FileCall;
using test::FileCallHook;
using test::FileCallResult;
using test::ModeOf;
using test::ReadFile;
using test::WriteFile;
using testing::ElementsAre;
using testing::IsEmpty;
using velkor::fromFile;
using velkor::toFile;

constexpr char kPath[] = "/data/state";
constexpr std::size_t kLimit = 16 * 1024 * 1024;

std::vector<std::string> NamesIn(const std::string& dir) {
  std::vector<std::string> names;
  for (const auto& entry : std::filesystem::directory_iterator(dir)) {
    names.push_back(entry.path().filename());
  }
  return names;
}

class JsonFileTest : public test::DeviceRootTest {
 protected:
  JsonFileTest() { test::MakeDirs("/data"); }
};

class FromFileTest : public JsonFileTest {
 protected:
  // Whether `path` cannot be read as JSON, with the value left as it was.
  static bool IsRefused(const std::string& path) {
    Json::Value value("kept");
    const bool refused = !fromFile(value, path);
    const int kept = errno;
    EXPECT_EQ(value == Json::Value("kept"), refused);
    errno = kept;
    return refused;
  }
};

TEST_F(FromFileTest, ReadsAWholeFile) {
  WriteFile(kPath, "{\"a\": [1]}\n");
  Json::Value value;
  EXPECT_TRUE(fromFile(value, kPath));
  EXPECT_EQ(value, Parsed(R"({"a":[1]})"));
}

TEST_F(FromFileTest, FollowsALink) {
  WriteFile("/data/file", "[1]");
  ASSERT_EQ(symlink("/data/file", kPath), 0);
  EXPECT_FALSE(IsRefused(kPath));
}

TEST_F(FromFileTest, RefusesAMissingFile) {
  EXPECT_TRUE(IsRefused(kPath));
  EXPECT_EQ(errno, ENOENT);
}

TEST_F(FromFileTest, RefusesAFileThatMayNotBeRead) {
  WriteFile(kPath, "[1]");
  const FileCallHook hook([](const FileCall& call) -> FileCallResult {
    if (call.name != "open") return {};
    return EACCES;
  });
  EXPECT_TRUE(IsRefused(kPath));
  EXPECT_EQ(errno, EACCES);
}

TEST_F(FromFileTest, RefusesAnEmptyOrInvalidFile) {
  for (const std::string& content :
       {std::string(), std::string("{"), std::string("[1] x"), std::string("[1]\0", 4)}) {
    WriteFile(kPath, content);
    EXPECT_TRUE(IsRefused(kPath));
  }
}

TEST_F(FromFileTest, RefusesAFileThatIsTooDeep) {
  WriteFile(kPath, std::string(100000, '['));
  EXPECT_TRUE(IsRefused(kPath));
}

TEST_F(FromFileTest, RefusesADirectory) {
  EXPECT_TRUE(IsRefused("/data"));
  EXPECT_EQ(errno, EISDIR);
}

TEST_F(FromFileTest, RefusesAFifoWithoutWaitingForAWriter) {
  ASSERT_EQ(mkfifo(kPath, 0644), 0);
  EXPECT_TRUE(IsRefused(kPath));
  EXPECT_EQ(errno, EINVAL);
}

TEST_F(FromFileTest, RefusesASocket) { EXPECT_TRUE(IsRefused("/dev/log")); }

TEST_F(FromFileTest, RefusesALinkToAFifo) {
  ASSERT_EQ(mkfifo("/data/fifo", 0644), 0);
  ASSERT_EQ(symlink("/data/fifo", kPath), 0);
  EXPECT_TRUE(IsRefused(kPath));
}

TEST_F(FromFileTest, ReadsAFileOf16MiB) {
  WriteFile(kPath, "[]" + std::string(kLimit - 2, ' '));
  EXPECT_FALSE(IsRefused(kPath));
}

TEST_F(FromFileTest, RefusesAFileOfOneByteMore) {
  WriteFile(kPath, "[]" + std::string(kLimit - 1, ' '));
  EXPECT_TRUE(IsRefused(kPath));
  EXPECT_EQ(errno, EFBIG);
}

class ToFileTest : public JsonFileTest {
 protected:
  // Lets no file grow beyond `size` bytes: a write then stops short and the next one fails.
  static void LimitFileSize(rlim_t size) {
    signal(SIGXFSZ, SIG_IGN);
    const rlimit limit{size, RLIM_INFINITY};
    setrlimit(RLIMIT_FSIZE, &limit);
  }

  Json::Value old_ = Parsed(R"({"old":1})");
  Json::Value new_ = Parsed(R"({"new":"value"})");
};

Json::Value Content(const std::string& path) { return Parsed(ReadFile(path)); }

TEST_F(ToFileTest, MakesAFileThatReadsBackAsTheValue) {
  EXPECT_TRUE(toFile(new_, kPath));
  EXPECT_EQ(Content(kPath), new_);
  EXPECT_THAT(NamesIn("/data"), ElementsAre("state"));
}

TEST_F(ToFileTest, WritesInTheCurrentDirectoryAndInTheRoot) {
  ASSERT_EQ(chdir("/data"), 0);
  EXPECT_TRUE(toFile(new_, "state"));
  EXPECT_EQ(Content(kPath), new_);
  EXPECT_TRUE(toFile(new_, "/state"));
  EXPECT_EQ(Content("/state"), new_);
}

TEST_F(ToFileTest, TheModeIsTheOneAskedForWhateverTheUmask) {
  const mode_t previous = umask(0077);
  EXPECT_TRUE(toFile(new_, "/data/default"));
  umask(0);
  EXPECT_TRUE(toFile(new_, "/data/private", 0600));
  umask(previous);
  EXPECT_EQ(ModeOf("/data/default"), 0644U);
  EXPECT_EQ(ModeOf("/data/private"), 0600U);
}

TEST_F(ToFileTest, ReplacesAFileAsAWhole) {
  WriteFile(kPath, std::string(1000, ' ') + "{}", 0666);
  ASSERT_EQ(link(kPath, "/data/old"), 0);
  EXPECT_TRUE(toFile(new_, kPath, 0600));
  EXPECT_EQ(Content(kPath), new_);
  EXPECT_EQ(ModeOf(kPath), 0600U);
  EXPECT_EQ(ReadFile("/data/old"), std::string(1000, ' ') + "{}") << "never written into";
}

TEST_F(ToFileTest, TheFileIsPrivateBeforeItHasContentAndDurableBeforeItReplacesTheOldOne) {
  ASSERT_TRUE(toFile(old_, kPath));
  const std::size_t size = velkor::toString(new_).size();
  std::vector<std::string> steps;
  const FileCallHook hook([&](const FileCall& call) -> FileCallResult {
    struct stat info {};
    if (call.fd >= 0) fstat(call.fd, &info);
    if (call.name == "write") {
      EXPECT_EQ(info.st_mode, S_IFREG | 0600U);
      steps.push_back("write");
    } else if (call.name == "fsync" && S_ISREG(info.st_mode)) {
      EXPECT_GE(static_cast<std::size_t>(info.st_size), size);
      EXPECT_EQ(Content(kPath), old_);
      steps.push_back("fsync file");
    } else if (call.name == "fsync") {
      struct stat directory {};
      stat("/data", &directory);
      EXPECT_EQ(info.st_ino, directory.st_ino);
      EXPECT_EQ(Content(kPath), new_);
      steps.push_back("fsync directory");
    } else if (call.name == "rename") {
      EXPECT_EQ(call.path, kPath);
      steps.push_back("rename");
    }
    return {};
  });
  EXPECT_TRUE(toFile(new_, kPath, 0600));
  EXPECT_THAT(steps, ElementsAre("write", "fsync file", "rename", "fsync directory"));
}

TEST_F(ToFileTest, FailsInADirectoryThatDoesNotExist) {
  EXPECT_FALSE(toFile(new_, "/none/state"));
  EXPECT_EQ(errno, ENOENT);
  EXPECT_FALSE(test::Exists("/none"));
}

TEST_F(ToFileTest, FailsWhereADirectoryStandsAndLeavesNothingBehind) {
  test::MakeDirs(kPath);
  EXPECT_FALSE(toFile(new_, kPath));
  EXPECT_EQ(errno, EISDIR);
  EXPECT_THAT(NamesIn("/data"), ElementsAre("state"));
  EXPECT_THAT(NamesIn(kPath), IsEmpty());
}

TEST_F(ToFileTest, AWriteThatStopsShortKeepsTheOldFileAndLeavesNothingBehind) {
  ASSERT_TRUE(toFile(old_, kPath));
  LimitFileSize(1000);
  const bool written = toFile(Json::Value(std::string(5000, 'x')), kPath);
  const int error = errno;
  LimitFileSize(RLIM_INFINITY);
  EXPECT_FALSE(written);
  EXPECT_EQ(error, EFBIG);
  EXPECT_EQ(Content(kPath), old_);
  EXPECT_THAT(NamesIn("/data"), ElementsAre("state"));
}

// A step of replacing a file that fails: the call, and which of its kind.
struct FailingStep {
  const char* call;
  int number;
  bool old_file_stays;

  std::string Name() const { return call + std::to_string(number); }
  // How the test framework prints one.
  friend void PrintTo(const FailingStep& step, std::ostream* out) { *out << step.Name(); }
};

class ToFileStepTest : public ToFileTest, public testing::WithParamInterface<FailingStep> {};

TEST_P(ToFileStepTest, AFailingStepIsReportedAndLeavesNothingBehind) {
  ASSERT_TRUE(toFile(old_, kPath));
  const FailingStep step = GetParam();
  int met = 0;
  bool written = true;
  {
    const FileCallHook hook([&](const FileCall& call) -> FileCallResult {
      if (call.name != step.call || ++met != step.number) return {};
      return EIO;
    });
    written = toFile(new_, kPath);
  }
  const int error = errno;
  ASSERT_GE(met, step.number) << "the step was not met";
  EXPECT_FALSE(written);
  EXPECT_EQ(error, EIO);
  EXPECT_EQ(Content(kPath), step.old_file_stays ? old_ : new_);
  EXPECT_THAT(NamesIn("/data"), ElementsAre("state"));
}

INSTANTIATE_TEST_SUITE_P(
    , ToFileStepTest,
    testing::Values(FailingStep{"fchmod", 1, true}, FailingStep{"write", 1, true},
                    FailingStep{"fsync", 1, true}, FailingStep{"close", 1, true},
                    FailingStep{"rename", 1, true}, FailingStep{"open", 1, false},
                    FailingStep{"fsync", 2, false}),
    [](const testing::TestParamInfo<FailingStep>& step) { return step.param.Name(); });

}  // namespace
