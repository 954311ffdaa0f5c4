// The findings about device filters.
#include "tests/unit/lint/lint_test.h"

namespace tool::lint {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

// A descriptor of one entry with these filters, given as members.
std::string Filtered(const std::string& filters) {
  return R"({"app": "A", "title": "t", "desc": "d")" + (filters.empty() ? "" : ", " + filters) +
         "}";
}

TEST_F(LintTest, FilterNeverPasses) {
  for (const char* filters : {
           R"("enable": {})",
           R"("enable": {"model": []})",
           R"("enable": {"model": ["M1"]}, "disable": {"model": ["M1", "M2"]})",
           R"("enable": {"model": ["M1"], "platform": ["p"]},
              "disable": {"model": ["M1"], "platform": ["p"]})",
       }) {
    EXPECT_THAT(FindWith(Filtered(filters), "filter-never-passes"),
                ElementsAre(Is("filter-never-passes", "/enable")))
        << filters;
  }
}

TEST_F(LintTest, FilterPassesOnSomeDevice) {
  for (const char* filters : {
           "",
           R"("enable": {"model": ["M1"]})",
           R"("disable": {})",
           R"("disable": {"model": ["M1"]})",
           R"("enable": {"model": ["M1", "M2"]}, "disable": {"model": ["M1"]})",
           R"("enable": {"model": ["M1"]}, "disable": {"platform": ["p"]})",
           R"("enable": {"model": ["M1"], "platform": ["p"]}, "disable": {"model": ["M1"]})",
       }) {
    EXPECT_THAT(FindWith(Filtered(filters), "filter-never-passes"), IsEmpty()) << filters;
  }
}

TEST_F(LintTest, FilterNeverPassesForAModuleBecauseOfItsEntry) {
  EXPECT_THAT(FindWith(R"({"app": "A", "title": "t", "enable": {"model": ["M1"]}, "modules": [
                           {"params": "p", "title": "m", "enable": {"model": ["M2"]}},
                           {"params": "q", "title": "n", "enable": {"model": ["M1"]}}]})",
                       "filter-never-passes"),
              ElementsAre(Is("filter-never-passes", "/modules/0/enable")));
}

TEST_F(LintTest, FilterNeverPassesIsSaidOnceOfAnEntryWithModules) {
  EXPECT_THAT(FindWith(R"({"app": "A", "title": "t", "enable": {}, "modules": [
                           {"params": "p", "title": "m"}]})",
                       "filter-never-passes"),
              ElementsAre(Is("filter-never-passes", "/enable")));
}

TEST_F(LintTest, FilterNeverPassesWhenAllKnownDevicesAreExcluded) {
  const std::string filters = R"("disable": {"model": ["M1", "M2"]})";
  EXPECT_THAT(FindWith(Filtered(filters), "filter-never-passes"), IsEmpty());
  options_.known.models = {"M1", "M2"};
  EXPECT_THAT(FindWith(Filtered(filters), "filter-never-passes"),
              ElementsAre(Is("filter-never-passes", "/disable")));
  options_.known.models = {"M1", "M2", "M3"};
  EXPECT_THAT(FindWith(Filtered(filters), "filter-never-passes"), IsEmpty());
}

TEST_F(LintTest, ModelUnknown) {
  const std::string filters = R"("enable": {"model": ["M1", "m1"], "platform": ["p9"]})";
  EXPECT_THAT(FindWith(Filtered(filters), "model-unknown"), IsEmpty());
  options_.known.models = {"M1", "M2"};
  EXPECT_THAT(FindWith(Filtered(filters), "model-unknown"),
              ElementsAre(Is("model-unknown", "/enable/model/1")));
}

TEST_F(LintTest, PlatformUnknown) {
  const std::string filters = R"("disable": {"model": ["M9"], "platform": ["p1", "P1"]})";
  EXPECT_THAT(FindWith(Filtered(filters), "platform-unknown"), IsEmpty());
  options_.known.platforms = {"p1"};
  EXPECT_THAT(FindWith(Filtered(filters), "platform-unknown"),
              ElementsAre(Is("platform-unknown", "/disable/platform/1")));
}

TEST_F(LintTest, KnownNamesAreReadFromAFile) {
  const KnownNames known =
      ReadKnownNames(dir_.Write("known.json", R"({"models": ["M1", "M2"], "other": 1})"));
  EXPECT_THAT(*known.models, ElementsAre("M1", "M2"));
  EXPECT_FALSE(known.platforms);
}

TEST_F(LintTest, KnownNamesOfAnotherShapeAreRefused) {
  for (const char* text : {"[]", "{", R"({"models": "M1"})", R"({"platforms": [1]})"}) {
    EXPECT_THROW(ReadKnownNames(dir_.Write("known.json", text)), std::runtime_error) << text;
  }
  EXPECT_THROW(ReadKnownNames(dir_ / "nothing"), std::runtime_error);
}

}  // namespace
}  // namespace tool::lint
