// The state record in the device root.
#include "appindex/config.h"

#include <gmock/gmock.h>
#include <json/value.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>

#include "appindex/utilities/json_helpers.h"
#include "error_of.h"
#include "tests/support/device_root_test.h"

namespace velkor::appindex {
namespace {

using test::ErrorOf;
using test::FailureLine;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr char kRecord[] = "/var/packages/Velkor/etc/appindex.cfg";

class ConfigTest : public test::DeviceRootTest {
 protected:
  static std::string ErrorOfLoad() {
    return ErrorOf([] { Config config; });
  }
  static void Save(const std::string& indexed_version) {
    Config config;
    config.indexed_version = indexed_version;
    config.Save();
  }
  static Json::Value SavedRecord() {
    Json::Value record;
    EXPECT_TRUE(fromFile(record, kRecord));
    return record;
  }
  static std::string LoadLine(const std::string& tail) {
    return FailureLine("config", 20, "Config",
                       "Failed [IsFileExist(kAppIndexCfgPath) && "
                       "!data.fromFile(kAppIndexCfgPath)], reason: Cannot load json: "
                       "/var/packages/Velkor/etc/appindex.cfg" +
                           tail);
  }
};

TEST_F(ConfigTest, NoRecordFileLoadsAsEmpty) {
  const Config config;
  EXPECT_EQ(config.indexed_version, "");
  EXPECT_EQ(config.current_version, "");
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(ConfigTest, LoadsTheIndexedVersion) {
  test::WriteFile(kRecord, R"({"indexed_version": "7.2-1"})");
  EXPECT_EQ(Config().indexed_version, "7.2-1");
}

TEST_F(ConfigTest, AMissingKeyLoadsAsEmpty) {
  test::WriteFile(kRecord, R"({"current_version": "7.2-1"})");
  EXPECT_EQ(Config().indexed_version, "");
}

TEST_F(ConfigTest, ANumberLoadsAsEmpty) {
  test::WriteFile(kRecord, R"({"indexed_version": 5})");
  EXPECT_EQ(Config().indexed_version, "");
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(ConfigTest, AnyOtherTypeLoadsAsEmpty) {
  for (const char* value : {"null", "true", "7.2", "[\"7.2\"]", "{\"a\":\"7.2\"}"}) {
    test::WriteFile(kRecord, std::string("{\"indexed_version\":") + value + "}");
    EXPECT_EQ(Config().indexed_version, "") << value;
  }
}

TEST_F(ConfigTest, BrokenJsonThrows504AndLogsThePlainLineWhenErrnoIsZero) {
  test::WriteFile(kRecord, R"({"indexed_version": )");
  errno = 0;
  EXPECT_EQ(ErrorOfLoad(), "504: Cannot load json: /var/packages/Velkor/etc/appindex.cfg");
  EXPECT_THAT(TakeLog(), ElementsAre(LoadLine("")));
}

TEST_F(ConfigTest, BrokenJsonLogsStaleErrnoAndClearsIt) {
  test::WriteFile(kRecord, R"({"indexed_version": )");
  errno = ENOENT;
  EXPECT_EQ(ErrorOfLoad(), "504: Cannot load json: /var/packages/Velkor/etc/appindex.cfg");
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(LoadLine(" [err: No such file or directory]")));
}

TEST_F(ConfigTest, AnEmptyFileThrows504) {
  test::WriteFile(kRecord, "");
  EXPECT_EQ(ErrorOfLoad(), "504: Cannot load json: /var/packages/Velkor/etc/appindex.cfg");
}

TEST_F(ConfigTest, AnUnreadableFileThrows504AndLogsWhyAndAsWhom) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: switches to another user";
  test::WriteFile(kRecord, R"({"indexed_version":"7"})", 0600);
  ASSERT_EQ(seteuid(1001), 0);
  EXPECT_EQ(ErrorOfLoad(), "504: Cannot load json: /var/packages/Velkor/etc/appindex.cfg");
  EXPECT_THAT(TakeLog(), ElementsAre(LoadLine(" [err: Permission denied]")));
}

TEST_F(ConfigTest, JsonThatIsNoObjectThrows120) {
  test::WriteFile(kRecord, "[]");
  EXPECT_EQ(ErrorOfLoad(), "120: Not an object, data=[]");
}

TEST_F(ConfigTest, ALinkIsNoRecordFile) {
  test::WriteFile("/tmp/elsewhere", R"({"indexed_version":"7"})");
  ASSERT_EQ(symlink("/tmp/elsewhere", kRecord), 0);
  EXPECT_EQ(Config().indexed_version, "");
}

TEST_F(ConfigTest, TheCurrentVersionIsTheSystems) {
  Config config;
  EXPECT_EQ(config.GetCurrentVersion(), test::kVersion);
  EXPECT_EQ(config.current_version, test::kVersion);
  EXPECT_EQ(config.indexed_version, "");
}

TEST_F(ConfigTest, TheModeIs0600AfterSave) {
  umask(0);
  Save("7.2-1");
  EXPECT_EQ(test::ModeOf(kRecord), 0600U);
}

TEST_F(ConfigTest, TheModeIs0600AfterSaveOverAnOpenFileAndUnderAnyUmask) {
  test::WriteFile(kRecord, "{}", 0666);
  umask(0777);
  Save("7.2-1");
  EXPECT_EQ(test::ModeOf(kRecord), 0600U);
}

TEST_F(ConfigTest, SavedVersionsAreLoadedAgainUnchanged) {
  for (const char* version : {"7.2-1", "", "\"\\\n\t 版本"}) {
    Save(version);
    EXPECT_EQ(Config().indexed_version, version);
  }
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(ConfigTest, OnlyTheIndexedVersionRemainsOfExtraKeysAfterSave) {
  test::WriteFile(kRecord, R"({"indexed_version":"1","extra":[1],"current_version":"x"})");
  Config().Save();
  Json::Value expected;
  expected["indexed_version"] = "1";
  EXPECT_EQ(SavedRecord(), expected);
}

TEST_F(ConfigTest, SaveLeavesNothingElseBesideTheRecord) {
  Save("7.2-1");
  EXPECT_NE(rmdir("/var/packages/Velkor/etc"), 0);
  ASSERT_EQ(unlink(kRecord), 0);
  EXPECT_EQ(rmdir("/var/packages/Velkor/etc"), 0);
}

TEST_F(ConfigTest, SaveKeepsTheFields) {
  Config config;
  config.indexed_version = config.GetCurrentVersion();
  config.Save();
  EXPECT_EQ(config.indexed_version, test::kVersion);
  EXPECT_EQ(config.current_version, test::kVersion);
}

TEST_F(ConfigTest, DestructionWritesNothing) {
  { Config().indexed_version = "7.2-1"; }
  EXPECT_FALSE(test::Exists(kRecord));
}

TEST_F(ConfigTest, SaveByAnotherUserWritesAsRootAndGoesOnAsRoot) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: switches to another user";
  Config config;
  ASSERT_EQ(seteuid(1001), 0);
  config.Save();
  EXPECT_EQ(geteuid(), 0U);
  struct stat info {};
  ASSERT_EQ(stat(kRecord, &info), 0);
  EXPECT_EQ(info.st_uid, 0U);
}

TEST_F(ConfigTest, SaveWhenRootCannotBecomeEffectiveThrows503AndWritesNothing) {
  test::WriteFile("/etc/passwd", "anna:x:1001:100::/home/anna:/bin/sh\n");
  EXPECT_EQ(ErrorOf([] { Save("7.2-1"); }), "503: ");
  EXPECT_FALSE(test::Exists(kRecord));
}

}  // namespace
}  // namespace velkor::appindex
