// The complete log lines of the state record, with the version query and system calls in the test's
// hands.
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <string>

#include "appindex/config.h"
#include "error_of.h"
#include "system_calls.h"
#include "tests/support/device_root_test.h"
#include "tests/support/fake_config.h"

namespace velkor::appindex {
namespace {

using test::Calls;
using test::DeviceConfig;
using test::ErrorOf;
using test::FailureLine;
using ::testing::ElementsAre;
using ::testing::SizeIs;

constexpr char kRecord[] = "/var/packages/Velkor/etc/appindex.cfg";
constexpr char kOldRecord[] = R"({"indexed_version":"old"})";

class CurrentVersionTest : public test::DeviceRootTest {
 protected:
  std::string ErrorWithErrno(int error) {
    return ErrorOf([&] {
      errno = error;
      config_.GetCurrentVersion();
    });
  }
  static std::string Line(const std::string& tail) {
    return FailureLine("config", 30, "GetCurrentVersion",
                       "Failed [0 > TLIBHbinfoUserAgentGet(\"appindex\", buf, sizeof(buf))], "
                       "reason: TLIBHbinfoUserAgentGet failed" +
                           tail);
  }

  Config config_;
};

TEST_F(CurrentVersionTest, IsAskedForTheComponentWithABufferOf1024Bytes) {
  config_.GetCurrentVersion();
  EXPECT_THAT(DeviceConfig().user_agent.calls, ElementsAre("appindex 1024"));
}

TEST_F(CurrentVersionTest, TwoCallsMakeOnePlatformCall) {
  DeviceConfig().user_agent.text = "7.2-1";
  EXPECT_EQ(config_.GetCurrentVersion(), "7.2-1");
  DeviceConfig().user_agent.text = "7.3-1";
  EXPECT_EQ(config_.GetCurrentVersion(), "7.2-1");
  EXPECT_THAT(DeviceConfig().user_agent.calls, SizeIs(1));
}

TEST_F(CurrentVersionTest, IsTakenAsItStands) {
  DeviceConfig().user_agent.text = " a/7.2 (x; y)\n ";
  EXPECT_EQ(config_.GetCurrentVersion(), " a/7.2 (x; y)\n ");
}

TEST_F(CurrentVersionTest, MayFillTheWholeBuffer) {
  DeviceConfig().user_agent.text = std::string(1023, 'v');
  EXPECT_EQ(config_.GetCurrentVersion(), std::string(1023, 'v'));
}

TEST_F(CurrentVersionTest, AnEmptyResultIsAskedForAgain) {
  EXPECT_EQ(config_.GetCurrentVersion(), "");
  DeviceConfig().user_agent.text = "7.2-1";
  EXPECT_EQ(config_.GetCurrentVersion(), "7.2-1");
  EXPECT_THAT(DeviceConfig().user_agent.calls, SizeIs(2));
}

TEST_F(CurrentVersionTest, ThatIsSetAlreadyIsNotAskedFor) {
  config_.current_version = "7.0";
  EXPECT_EQ(config_.GetCurrentVersion(), "7.0");
  EXPECT_THAT(DeviceConfig().user_agent.calls, SizeIs(0));
}

TEST_F(CurrentVersionTest, AFailureThrows502AndLogsThePlainLineWhenErrnoIsZero) {
  DeviceConfig().user_agent.result = -1;
  EXPECT_EQ(ErrorWithErrno(0), "502: TLIBHbinfoUserAgentGet failed");
  EXPECT_THAT(TakeLog(), ElementsAre(Line("")));
}

TEST_F(CurrentVersionTest, AFailureLogsErrnoAndClearsIt) {
  DeviceConfig().user_agent.result = -1;
  EXPECT_EQ(ErrorWithErrno(ENOENT), "502: TLIBHbinfoUserAgentGet failed");
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(Line(" [err: No such file or directory]")));
}

TEST_F(CurrentVersionTest, AFailureLeavesTheVersionEmptyAndTheNextCallAsksAgain) {
  DeviceConfig().user_agent.text = "7.2-1";
  DeviceConfig().user_agent.result = -1;
  ErrorWithErrno(0);
  EXPECT_EQ(config_.current_version, "");
  DeviceConfig().user_agent.result = 0;
  EXPECT_EQ(config_.GetCurrentVersion(), "7.2-1");
}

class SaveFailureTest : public test::DeviceRootTest {
 protected:
  SaveFailureTest() {
    test::WriteFile(kRecord, kOldRecord);
    Calls().chmod.paths.clear();
  }

  static std::string ErrorOfSave() {
    return ErrorOf([] {
      Config config;
      config.indexed_version = "new";
      config.Save();
    });
  }
  static std::string Line(int line, const std::string& condition, const std::string& tail) {
    return FailureLine(
        "config", line, "Save",
        "Failed [" + condition + "], reason: /var/packages/Velkor/etc/appindex.cfg" + tail);
  }
  static std::string WriteLine(const std::string& tail) {
    return Line(45, "!data.toFile(kAppIndexCfgPath)", tail);
  }
  static std::string ChmodLine(const std::string& tail) {
    return Line(46, "-1 == chmod(kAppIndexCfgPath, 0600)", tail);
  }
};

TEST_F(SaveFailureTest, AFailedWriteThrows505AndLogsThePlainLineWhenErrnoIsZero) {
  Calls().rename.fails_for = kRecord;
  Calls().rename.error = test::kNoErrno;
  EXPECT_EQ(ErrorOfSave(), "505: /var/packages/Velkor/etc/appindex.cfg");
  EXPECT_THAT(TakeLog(), ElementsAre(WriteLine("")));
}

TEST_F(SaveFailureTest, AFailedWriteLogsErrnoAndClearsIt) {
  Calls().rename.fails_for = kRecord;
  Calls().rename.error = ENOSPC;
  EXPECT_EQ(ErrorOfSave(), "505: /var/packages/Velkor/etc/appindex.cfg");
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(WriteLine(" [err: No space left on device]")));
}

TEST_F(SaveFailureTest, AFailedWriteKeepsTheOldRecordAndAttemptsNoChmod) {
  Calls().rename.fails_for = kRecord;
  ErrorOfSave();
  EXPECT_EQ(test::ReadFile(kRecord), kOldRecord);
  const auto& chmods = Calls().chmod.paths;
  EXPECT_EQ(std::count(chmods.begin(), chmods.end(), kRecord), 0);
}

TEST_F(SaveFailureTest, AMissingDirectoryIsAFailedWrite) {
  ASSERT_EQ(unlink(kRecord), 0);
  ASSERT_EQ(rmdir("/var/packages/Velkor/etc"), 0);
  EXPECT_EQ(ErrorOfSave(), "505: /var/packages/Velkor/etc/appindex.cfg");
  EXPECT_THAT(TakeLog(), ElementsAre(WriteLine(" [err: No such file or directory]")));
}

TEST_F(SaveFailureTest, AFailedChmodThrows502AndLogsThePlainLineWhenErrnoIsZero) {
  Calls().chmod.fails_for = kRecord;
  Calls().chmod.error = test::kNoErrno;
  EXPECT_EQ(ErrorOfSave(), "502: /var/packages/Velkor/etc/appindex.cfg");
  EXPECT_THAT(TakeLog(), ElementsAre(ChmodLine("")));
}

TEST_F(SaveFailureTest, AFailedChmodLogsErrnoAndClearsIt) {
  Calls().chmod.fails_for = kRecord;
  Calls().chmod.error = EPERM;
  EXPECT_EQ(ErrorOfSave(), "502: /var/packages/Velkor/etc/appindex.cfg");
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(ChmodLine(" [err: Operation not permitted]")));
}

TEST_F(SaveFailureTest, AFailedWriteByAnotherUserGoesOnAsRoot) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: switches to another user";
  Config config;
  ASSERT_EQ(seteuid(1001), 0);
  Calls().rename.fails_for = kRecord;
  EXPECT_EQ(ErrorOf([&] { config.Save(); }), "505: /var/packages/Velkor/etc/appindex.cfg");
  EXPECT_EQ(geteuid(), 0U);
}

}  // namespace
}  // namespace velkor::appindex
