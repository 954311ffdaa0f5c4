// The library gives the same whatever locale the program has chosen.
#include <gtest/gtest.h>
#include <json/writer.h>  // prints values in failure messages

#include <clocale>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <locale>
#include <string>
#include <utility>

#include "appindex/utilities/json_helpers.h"
#include "tests/reliability/callers_process.h"

namespace {

using test::AllCalls;

class CallersLocale : public test::CallersProcess {
 protected:
  // Before the device root is entered, where there are no locales.
  static void SetUpTestSuite() { locale_ = newlocale(LC_ALL_MASK, "C.UTF-8", nullptr); }
  static void TearDownTestSuite() {
    if (locale_ != nullptr) freelocale(std::exchange(locale_, nullptr));
  }

  ~CallersLocale() override {
    std::locale::global(std::locale::classic());
    uselocale(LC_GLOBAL_LOCALE);
  }

  // Every function, and numbers that are no integers, of which the library itself needs none.
  void ExpectTheUsual(const test::IndexModel::Indexes& usual) {
    EXPECT_EQ(Fault(AllCalls()), "");
    EXPECT_EQ(model_.Committed(), usual);
    Json::Value value;
    EXPECT_TRUE(velkor::fromString(value, "[2.5,1234567.5,1e-3]"));
    EXPECT_EQ(velkor::toString(value), "[2.5,1234567.5,0.001]");
  }

  static inline locale_t locale_ = nullptr;
};

TEST_F(CallersLocale, OfTheSystemChangesNothing) {
  const auto usual = UsualIndexes();
  ExpectTheUsual(usual);
  ASSERT_NE(locale_, nullptr);
  uselocale(locale_);
  ExpectTheUsual(usual);
}

#ifdef WITHOUT_SANITIZER  // which would report what the C library loses where LOCPATH is set

class CallersGermanLocale : public CallersLocale {
 protected:
  // Makes one with a decimal comma.
  static void SetUpTestSuite() {
    std::string place = (std::filesystem::temp_directory_path() / "locale-XXXXXX").string();
    ASSERT_NE(mkdtemp(place.data()), nullptr);
    const std::string make = "localedef -i de_DE -f UTF-8 " + place + "/de_DE.UTF-8 2>/dev/null";
    setenv("LOCPATH", place.c_str(), 1);
    if (std::system(make.c_str()) == 0) locale_ = newlocale(LC_ALL_MASK, "de_DE.UTF-8", nullptr);
    std::filesystem::remove_all(place);
  }
};

TEST_F(CallersGermanLocale, ChangesNothing) {
  if (locale_ == nullptr) GTEST_SKIP() << "needs localedef and the definition of de_DE";
  const auto usual = UsualIndexes();
  uselocale(locale_);
  char text[16];
  std::snprintf(text, sizeof(text), "%.1f", 2.5);
  ASSERT_STREQ(text, "2,5");
  ExpectTheUsual(usual);
}

#endif

class CommaAndGroups : public std::numpunct<char> {
 protected:
  char do_decimal_point() const override { return ','; }
  char do_thousands_sep() const override { return '.'; }
  std::string do_grouping() const override { return "\3"; }
};

// But for numbers that are no integers: the JSON library reads them with a stream of its own, which
// takes over the program's locale.
TEST_F(CallersLocale, OfCppStreamsWithACommaAndGroupsChangesNothing) {
  const auto usual = UsualIndexes();
  std::locale::global(std::locale(std::locale::classic(), new CommaAndGroups));
  EXPECT_EQ(Fault(AllCalls()), "");
  EXPECT_EQ(model_.Committed(), usual);
}

}  // namespace
