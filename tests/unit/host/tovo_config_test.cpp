#include "device/tovo_config.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <array>
#include <cerrno>
#include <optional>
#include <string>
#include <thread>

#include "tests/unit/host/child.h"
#include "tests/unit/host/temp_dir.h"

namespace {

constexpr char kUntouched[] = "untouched";

// The value, or nothing when the reader fails.
std::optional<std::string> Read(const std::string& file, const std::string& key) {
  std::array<char, 256> value{};
  if (TLIBCFileGetKeyValue(file.c_str(), key.c_str(), value.data(), value.size(), 0) < 0) {
    return std::nullopt;
  }
  return value.data();
}

class FileGetKeyValueTest : public testing::Test {
 protected:
  std::optional<std::string> ReadFrom(const std::string& content, const std::string& key) const {
    return Read(dir_.Write("conf", content), key);
  }

  // Expects the call to fail with `error` and to leave its buffer alone.
  static void ExpectFailure(const std::string& file, const char* key, int error) {
    std::string buffer = kUntouched;
    errno = 0;
    EXPECT_LT(
        TLIBCFileGetKeyValue(file.c_str(), key, buffer.data(), static_cast<int>(buffer.size()), 0),
        0);
    EXPECT_EQ(TLIBCErrGet(), error);
    EXPECT_EQ(errno, error);
    EXPECT_EQ(buffer, kUntouched);
  }

  const TempDir dir_;
};

TEST_F(FileGetKeyValueTest, ReadsTheValueInItsQuotes) {
  EXPECT_EQ(ReadFrom("other=\"1\"\nunique=\"marovant_x86_ABC_Plus\"\n", "unique"),
            "marovant_x86_ABC_Plus");
}

TEST_F(FileGetKeyValueTest, TheLastValueOfAKeyHolds) {
  EXPECT_EQ(ReadFrom("key=\"old\"\nkey=\"new\"\nother=\"x\"\n", "key"), "new");
}

TEST_F(FileGetKeyValueTest, TheLastLineNeedsNoLineEnd) {
  EXPECT_EQ(ReadFrom("a=\"1\"\nkey=\"value\"", "key"), "value");
}

TEST_F(FileGetKeyValueTest, CommentsAreNoValues) {
  const std::string content = "#key=\"1\"\n  # key=\"2\"\nkey=\"3\" # key=\"4\"\n";
  EXPECT_EQ(ReadFrom(content, "key"), "3");
  EXPECT_EQ(ReadFrom(content, "#key"), std::nullopt);
}

TEST_F(FileGetKeyValueTest, BlanksAroundKeyAndValueAndCarriageReturnsDoNotCount) {
  EXPECT_EQ(ReadFrom(" key \t= \"a b\" \r\n", "key"), "a b");
  EXPECT_EQ(ReadFrom("key=plain \r\n", "key"), "plain");
}

TEST_F(FileGetKeyValueTest, AnEmptyValueIsAValue) {
  EXPECT_EQ(ReadFrom("key=\"\"\n", "key"), "");
  EXPECT_EQ(ReadFrom("key=\n", "key"), "");
}

TEST_F(FileGetKeyValueTest, ABackslashEscapesInDoubleQuotesOnly) {
  EXPECT_EQ(ReadFrom(R"(key="say \"hi\" \\ \$ \` \n")", "key"), R"(say "hi" \ $ ` \n)");
  EXPECT_EQ(ReadFrom(R"(key='say "hi" \\')", "key"), R"(say "hi" \\)");
  EXPECT_EQ(ReadFrom(R"(key=C:\\dir)", "key"), R"(C:\\dir)");
}

TEST_F(FileGetKeyValueTest, LinesThatAreNotWellFormedAreSkipped) {
  EXPECT_EQ(ReadFrom("key=\"good\"\n\nkey=\"open\nkey\nkey=\"a\"b\nkey=\"\\\"\nkey=\"\\\n=\"x\"\n",
                     "key"),
            "good");
}

TEST_F(FileGetKeyValueTest, TheKeyIsTheWholeKey) {
  ExpectFailure(dir_.Write("conf", "keys=\"1\"\nke=\"2\"\nKEY=\"3\"\n"), "key", ENODATA);
}

TEST_F(FileGetKeyValueTest, ALongValueIsCutAndTerminated) {
  const std::string file = dir_.Write("conf", "key=\"0123456789\"\n");
  std::string buffer(12, '~');
  EXPECT_GE(TLIBCFileGetKeyValue(file.c_str(), "key", buffer.data(), 5, 0), 0);
  EXPECT_EQ(buffer, std::string("0123\0~~~~~~~", 12));
}

TEST_F(FileGetKeyValueTest, AValueThatJustFitsIsWhole) {
  const std::string file = dir_.Write("conf", "key=\"0123\"\n");
  std::string buffer(8, '~');
  EXPECT_GE(TLIBCFileGetKeyValue(file.c_str(), "key", buffer.data(), 5, 0), 0);
  EXPECT_STREQ(buffer.c_str(), "0123");
}

TEST_F(FileGetKeyValueTest, ABufferOfOneByteGetsTheTerminator) {
  const std::string file = dir_.Write("conf", "key=\"0123\"\n");
  std::string buffer = "~~";
  EXPECT_GE(TLIBCFileGetKeyValue(file.c_str(), "key", buffer.data(), 1, 0), 0);
  EXPECT_EQ(buffer, std::string("\0~", 2));
}

TEST_F(FileGetKeyValueTest, AMissingFileIsAFailure) { ExpectFailure(dir_ / "no", "key", ENOENT); }

TEST_F(FileGetKeyValueTest, ADirectoryIsAFailure) { ExpectFailure(dir_.Path(), "key", EINVAL); }

TEST_F(FileGetKeyValueTest, AFifoIsAFailureAndNotWaitedFor) {
  ASSERT_EQ(mkfifo((dir_ / "fifo").c_str(), 0600), 0);
  ExpectFailure(dir_ / "fifo", "key", EINVAL);
}

TEST_F(FileGetKeyValueTest, AFileOfUnreasonableSizeIsAFailure) {
  ExpectFailure(dir_.Write("conf", "key=\"1\"\n" + std::string(1024 * 1024, '\n')), "key", EFBIG);
}

TEST_F(FileGetKeyValueTest, AnUnreadableFileIsAFailure) {
  const std::string file = dir_.Write("conf", "key=\"1\"\n");
  ASSERT_EQ(chmod(file.c_str(), 0), 0);
  ASSERT_EQ(chmod(dir_.Path().c_str(), 0755), 0);
  RunInChild([&] {
    BecomeOrdinaryUser();
    ExpectFailure(file, "key", EACCES);
  });
}

TEST_F(FileGetKeyValueTest, ArgumentsThatMakeNoSenseAreRefused) {
  const std::string file = dir_.Write("conf", "key=\"1\"\n");
  std::string buffer = kUntouched;
  const auto refused = [&](const char* path, const char* key, char* value, int size, int flags) {
    return TLIBCFileGetKeyValue(path, key, value, size, flags) < 0 && TLIBCErrGet() == EINVAL;
  };
  EXPECT_TRUE(refused(nullptr, "key", buffer.data(), 9, 0));
  EXPECT_TRUE(refused(file.c_str(), nullptr, buffer.data(), 9, 0));
  EXPECT_TRUE(refused(file.c_str(), "key", nullptr, 9, 0));
  EXPECT_TRUE(refused(file.c_str(), "key", buffer.data(), 0, 0));
  EXPECT_TRUE(refused(file.c_str(), "key", buffer.data(), -1, 0));
  EXPECT_TRUE(refused(file.c_str(), "key", buffer.data(), 9, 1));
  EXPECT_EQ(buffer, kUntouched);
}

TEST_F(FileGetKeyValueTest, LeavesNoDescriptorOpen) {
  const std::string file = dir_.Write("conf", "key=\"1\"\n");
  const std::size_t before = OpenDescriptors();
  EXPECT_EQ(Read(file, "key"), "1");
  EXPECT_EQ(Read(dir_.Path(), "key"), std::nullopt);
  EXPECT_EQ(OpenDescriptors(), before);
}

TEST(ErrGetTest, EveryThreadHasANumberOfItsOwn) {
  EXPECT_EQ(Read("/absent/file", "key"), std::nullopt);
  EXPECT_EQ(TLIBCErrGet(), ENOENT);
  int in_new_thread = -1;
  std::thread([&] { in_new_thread = TLIBCErrGet(); }).join();
  EXPECT_EQ(in_new_thread, 0);
}

TEST(ErrGetTest, TheNumberOutlivesASuccess) {
  const TempDir dir;
  EXPECT_EQ(Read("/absent/file", "key"), std::nullopt);
  EXPECT_EQ(Read(dir.Write("conf", "key=\"1\""), "key"), "1");
  EXPECT_EQ(TLIBCErrGet(), ENOENT);
}

class UserAgentTest : public testing::Test {
 protected:
  void WriteRelease(const std::string& content) { root_.Write("etc/os-release", content); }

  // What the query gives in the device root: the text, or "error N".
  void ExpectText(const std::string& expected) {
    RunInRoot(root_, [&] {
      std::array<char, 1024> text{};
      const int result = TLIBHbinfoUserAgentGet("appindex", text.data(), text.size());
      EXPECT_EQ(result < 0 ? "error " + std::to_string(TLIBCErrGet()) : text.data(), expected);
    });
  }

  const TempDir root_;
};

TEST_F(UserAgentTest, NamesTheReleaseAndItsBuild) {
  WriteRelease("NAME=Device\nBUILD_ID=64570\nVERSION_ID=\"7.2\"\nID=device\nVERSION=7\n");
  ExpectText("device-7.2-64570");
}

TEST_F(UserAgentTest, LeavesOutWhatTheReleaseDoesNotSay) {
  WriteRelease("ID=rolling\n");
  ExpectText("rolling");
}

TEST_F(UserAgentTest, ReadsEitherKindOfQuotesAndEscapes) {
  WriteRelease("# one\nID='dev\"ice'\nVERSION_ID=\"7\\\"2\\$\"\nBUILD_ID=\"\"\n");
  ExpectText("dev\"ice-7\"2$");
}

TEST_F(UserAgentTest, FallsBackToTheVendorsCopy) {
  root_.Write("usr/lib/os-release", "ID=vendor\nVERSION_ID=1\n");
  ExpectText("vendor-1");
}

TEST_F(UserAgentTest, TheFileInEtcComesFirst) {
  root_.Write("usr/lib/os-release", "ID=vendor\n");
  WriteRelease("ID=device\n");
  ExpectText("device");
}

TEST_F(UserAgentTest, NoReleaseFileIsAFailure) { ExpectText("error " + std::to_string(ENOENT)); }

TEST_F(UserAgentTest, AFileThatNamesNoReleaseIsAFailure) {
  WriteRelease("NAME=\"Device\"\n");
  ExpectText("error " + std::to_string(ENODATA));
}

TEST_F(UserAgentTest, ATextThatDoesNotFitIsAFailureRatherThanCut) {
  WriteRelease("ID=device\nVERSION_ID=7\n");
  RunInRoot(root_, [] {
    std::string buffer = kUntouched;
    EXPECT_LT(TLIBHbinfoUserAgentGet("appindex", buffer.data(), 8), 0);
    EXPECT_EQ(TLIBCErrGet(), ERANGE);
    EXPECT_EQ(buffer, kUntouched);
    EXPECT_GE(TLIBHbinfoUserAgentGet("appindex", buffer.data(), 9), 0);
    EXPECT_STREQ(buffer.c_str(), "device-7");
  });
}

TEST_F(UserAgentTest, ArgumentsThatMakeNoSenseAreRefused) {
  std::string buffer = kUntouched;
  EXPECT_LT(TLIBHbinfoUserAgentGet(nullptr, buffer.data(), 9), 0);
  EXPECT_LT(TLIBHbinfoUserAgentGet("appindex", nullptr, 9), 0);
  EXPECT_LT(TLIBHbinfoUserAgentGet("appindex", buffer.data(), 0), 0);
  EXPECT_EQ(TLIBCErrGet(), EINVAL);
  EXPECT_EQ(buffer, kUntouched);
}

}  // namespace
