#include "appindex/error.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>
#include <locale>
#include <string>
#include <type_traits>
#include <utility>
#include <vector>

namespace {

using velkor::Error;

std::string MessageOf(const Error& error) { return error.std::runtime_error::what(); }

static_assert(std::is_base_of_v<std::runtime_error, Error>);
static_assert(std::has_virtual_destructor_v<Error>);
static_assert(std::is_same_v<std::underlying_type_t<Error::ErrorCode>, std::int32_t>);
static_assert(std::is_convertible_v<Error::ErrorCode, int>, "a plain enumeration");

TEST(ErrorTest, WithoutAReasonWhatIsEmptyAndTheMessageHoldsTheCodeAlone) {
  const Error error(502);
  EXPECT_STREQ(error.what(), "");
  EXPECT_EQ(error.reason, "");
  EXPECT_EQ(error.code, 502);
  EXPECT_EQ(MessageOf(error), "Velkor error, code=502");
}

TEST(ErrorTest, WithAReasonWhatIsTheReasonAndTheMessageHoldsItInBrackets) {
  const Error error(913, "x");
  EXPECT_STREQ(error.what(), "x");
  EXPECT_EQ(error.reason, "x");
  EXPECT_EQ(error.code, Error::kElasticdRequestError);
  EXPECT_EQ(MessageOf(error), "Velkor error, code=913, reason=[x]");
}

TEST(ErrorTest, AnEmptyReasonIsNoReason) {
  const Error error(120, "");
  EXPECT_STREQ(error.what(), "");
  EXPECT_EQ(error.code, Error(120).code);
  EXPECT_EQ(error.reason, Error(120).reason);
  EXPECT_EQ(MessageOf(error), "Velkor error, code=120");
}

TEST(ErrorTest, ACodeWithoutANameIsStoredAndPrintedAsItIs) {
  const Error error(4711, "busy");
  EXPECT_EQ(error.code, 4711);
  EXPECT_EQ(MessageOf(error), "Velkor error, code=4711, reason=[busy]");
}

TEST(ErrorTest, ACodeOfTheDaemonIsStoredAndPrintedAsItIs) {
  const Error error(1400);
  EXPECT_EQ(error.code, 1400);
  EXPECT_EQ(MessageOf(error), "Velkor error, code=1400");
}

TEST(ErrorTest, TheExtremesOf32BitsAreStoredAndPrinted) {
  EXPECT_EQ(MessageOf(Error(std::numeric_limits<std::int32_t>::min())),
            "Velkor error, code=-2147483648");
  EXPECT_EQ(MessageOf(Error(std::numeric_limits<std::int32_t>::max())),
            "Velkor error, code=2147483647");
}

TEST(ErrorTest, TheEnumeratorConstructorsEqualThoseOfNumbers) {
  EXPECT_EQ(MessageOf(Error(Error::kGeneralError)), MessageOf(Error(502)));
  EXPECT_EQ(MessageOf(Error(Error::kJsonError, "y")), MessageOf(Error(120, "y")));
  EXPECT_STREQ(Error(Error::kJsonError, "y").what(), "y");
}

TEST(ErrorTest, EveryCodeOfTheLibraryHasItsNumber) {
  const std::vector<std::pair<Error::ErrorCode, int>> numbers = {
      {Error::kJsonError, 120},        {Error::kGeneralError, 502},
      {Error::kCredentialsError, 503}, {Error::kConfigLoadError, 504},
      {Error::kConfigSaveError, 505},  {Error::kLockFileError, 506},
      {Error::kChownError, 801},       {Error::kElasticdRequestError, 913},
      {Error::kTextsRootError, 1300},  {Error::kDaemonBusy, 1400},
  };
  for (const auto& [code, number] : numbers) EXPECT_EQ(static_cast<int>(code), number);
}

TEST(ErrorTest, ACopyHasTheMessageTheCodeAndTheReason) {
  const Error original(913, "gone");
  const Error copy(original);
  Error assigned(120);
  assigned = original;
  for (const Error* error : {&copy, static_cast<const Error*>(&assigned)}) {
    EXPECT_EQ(error->code, 913);
    EXPECT_STREQ(error->what(), "gone");
    EXPECT_EQ(MessageOf(*error), "Velkor error, code=913, reason=[gone]");
  }
}

TEST(ErrorTest, CaughtByItsBaseItStillGivesTheReason) {
  try {
    throw Error(502, "why");
  } catch (const std::exception& error) {
    EXPECT_STREQ(error.what(), "why");
  }
}

TEST(ErrorTest, TheCodeIsFormattedWithoutTheGroupingOfTheGlobalLocale) {
  struct Grouping : std::numpunct<char> {
    char do_thousands_sep() const override { return '.'; }
    std::string do_grouping() const override { return "\3"; }
  };
  const std::locale previous = std::locale::global(std::locale(std::locale(), new Grouping));
  const std::string message = MessageOf(Error(1400));
  std::locale::global(previous);
  EXPECT_EQ(message, "Velkor error, code=1400");
}

}  // namespace
