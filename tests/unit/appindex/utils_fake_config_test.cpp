// The device's unique string with the configuration reader in the test's hands.
#include <gmock/gmock.h>
#include <json/value.h>

#include <cerrno>
#include <string>

#include "appindex/device_identity.h"
#include "appindex/utils_internal.h"
#include "error_of.h"
#include "tests/support/device_root_test.h"
#include "tests/support/fake_config.h"

namespace velkor::appindex {
namespace {

using test::DeviceConfig;
using test::ErrorOf;
using test::FailureLine;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

class UniqueStringTest : public test::DeviceRootTest {
 protected:
  static void SetUnique(const std::string& unique) { DeviceConfig().key_value.text = unique; }

  static std::string ErrorWithErrno(int error) {
    return ErrorOf([error] {
      errno = error;
      PrepareModelAndPlatform();
    });
  }

  static std::string UnreadableLine(const std::string& tail) {
    return FailureLine("utils", 33, "PrepareModelAndPlatform",
                       "Failed [0 > TLIBCFileGetKeyValue(SZF_TOVO_INFO, SZ_HB_UNIQUE, buf, "
                       "sizeof(buf), 0)], reason: Failed to get unique" +
                           tail);
  }

  static std::string MalformedLine(const std::string& tail) {
    return FailureLine("utils", 42, "PrepareModelAndPlatform",
                       "Failed [!boost::regex_search(unique, sm, reg)], "
                       "reason: Malformed hb unique: " +
                           tail);
  }
};

TEST_F(UniqueStringTest, IsReadIntoAZeroedBufferOf256Bytes) {
  SetUnique("marovant_x86_ABC");
  PrepareModelAndPlatform();
  EXPECT_THAT(DeviceConfig().key_value.calls, ElementsAre("/etc/tovoinfo.conf unique 256 0"));
  EXPECT_TRUE(DeviceConfig().key_value_buffer_zeroed);
}

TEST_F(UniqueStringTest, ThatCannotBeReadLogsThePlainLineWhenErrnoIsZero) {
  DeviceConfig().key_value.result = -1;
  EXPECT_EQ(ErrorWithErrno(0), "502: Failed to get unique");
  EXPECT_THAT(TakeLog(), ElementsAre(UnreadableLine("")));
}

TEST_F(UniqueStringTest, ThatCannotBeReadLogsErrnoAndClearsIt) {
  DeviceConfig().key_value.result = -1;
  EXPECT_EQ(ErrorWithErrno(ENOENT), "502: Failed to get unique");
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(UnreadableLine(" [err: No such file or directory]")));
}

TEST_F(UniqueStringTest, ThatCannotBeReadKeepsNothingOfIt) {
  SetUnique("marovant_x86_ABC");
  DeviceConfig().key_value.result = -1;
  ErrorWithErrno(0);
  DeviceConfig().key_value.result = 0;
  SetUnique("marovant_eos_M220");
  EXPECT_EQ(GetPlatform(), "eos");
}

TEST_F(UniqueStringTest, OfAnotherShapeLogsThePlainLineWhenErrnoIsZero) {
  SetUnique("marovant_x86");
  EXPECT_EQ(ErrorWithErrno(0), "502: Malformed hb unique: marovant_x86");
  EXPECT_THAT(TakeLog(), ElementsAre(MalformedLine("marovant_x86")));
}

TEST_F(UniqueStringTest, OfAnotherShapeLogsStaleErrnoAndClearsIt) {
  SetUnique("marovant_x86");
  EXPECT_EQ(ErrorWithErrno(ENOENT), "502: Malformed hb unique: marovant_x86");
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(),
              ElementsAre(MalformedLine("marovant_x86 [err: No such file or directory]")));
}

TEST_F(UniqueStringTest, ThatTheReaderLeavesUnfilledReadsAsEmpty) {
  DeviceConfig().key_value.writes = false;
  EXPECT_EQ(ErrorWithErrno(0), "502: Malformed hb unique: ");
}

TEST_F(UniqueStringTest, PrefixIsCaseSensitive) {
  SetUnique("Marovant_x86_ABC");
  EXPECT_EQ(ErrorWithErrno(0), "502: Malformed hb unique: Marovant_x86_ABC");
}

TEST_F(UniqueStringTest, APositiveResultIsASuccess) {
  DeviceConfig().key_value.result = 16;
  SetUnique("marovant_x86_ABC");
  EXPECT_EQ(GetModel(), "ABC");
}

TEST_F(UniqueStringTest, CapturesStartAtTheFirstPrefix) {
  SetUnique("marovant_marovant_x86_ABC");
  EXPECT_EQ(GetPlatform(), "marovant");
  EXPECT_EQ(GetModel(), "x86_ABC");
}

TEST_F(UniqueStringTest, TheModelIsAllTheRestAlsoBehindALineEnd) {
  SetUnique("marovant_x86_ABC_\nPlus_");
  EXPECT_EQ(GetModel(), "ABC_\nPlus_");
}

TEST_F(UniqueStringTest, IsReadOnceForBothAccessors) {
  SetUnique("marovant_x86_ABC");
  GetPlatform();
  GetModel();
  GetPlatform();
  EXPECT_THAT(DeviceConfig().key_value.calls, SizeIs(1));
}

TEST_F(UniqueStringTest, ReadAgainReplacesBoth) {
  SetUnique("marovant_x86_ABC");
  PrepareModelAndPlatform();
  SetUnique("marovant_eos_M220");
  PrepareModelAndPlatform();
  EXPECT_EQ(GetPlatform(), "eos");
  EXPECT_EQ(GetModel(), "M220");
}

TEST_F(UniqueStringTest, AFailedReadLeavesBothAsTheyWere) {
  SetUnique("marovant_x86_ABC");
  PrepareModelAndPlatform();
  SetUnique("nonsense");
  ErrorWithErrno(0);
  EXPECT_EQ(GetPlatform(), "x86");
  EXPECT_EQ(GetModel(), "ABC");
}

TEST_F(UniqueStringTest, AnEmptyModelIsReadAgainOnEveryCall) {
  SetUnique("marovant_x86_");
  EXPECT_EQ(GetModel(), "");
  EXPECT_EQ(GetModel(), "");
  EXPECT_THAT(DeviceConfig().key_value.calls, SizeIs(2));
  EXPECT_EQ(GetPlatform(), "x86");
  EXPECT_THAT(DeviceConfig().key_value.calls, SizeIs(2));
}

TEST_F(UniqueStringTest, AnEmptyPlatformIsReadAgainOnEveryCall) {
  SetUnique("marovant__ABC");
  EXPECT_EQ(GetPlatform(), "");
  EXPECT_EQ(GetPlatform(), "");
  EXPECT_THAT(DeviceConfig().key_value.calls, SizeIs(2));
  EXPECT_EQ(GetModel(), "ABC");
  EXPECT_THAT(DeviceConfig().key_value.calls, SizeIs(2));
}

TEST_F(UniqueStringTest, IsNotReadForAFilterThatNamesNeitherModelNorPlatform) {
  IsPassFilter(Json::Value(), true);
  IsPassFilter(Json::Value(Json::objectValue), false);
  IsPassFilter(Json::Value("model"), true);
  EXPECT_THAT(DeviceConfig().key_value.calls, IsEmpty());
}

}  // namespace
}  // namespace velkor::appindex
