// The library gives the same whatever locale the program has chosen.
#include <gtest/gtest.h>
#include <json/writer.h>  // prints values in failure messages

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
