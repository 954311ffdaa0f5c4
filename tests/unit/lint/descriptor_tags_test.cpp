// The findings about a descriptor by itself: each where it belongs, and none where all is well.
#include "tests/unit/lint/lint_test.h"

namespace tool::lint {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

TEST_F(LintTest, GoodPackageHasNoFinding) { EXPECT_THAT(Find(), IsEmpty()); }

TEST_F(LintTest, JsonSyntaxNamesThePlaceAndTheCause) {
  const auto found = FindWith("{\n  \"app\": \"A\",\n  \"title\": \"t\",\n}\n", "json-syntax");
  ASSERT_THAT(found, ElementsAre(Is("json-syntax", "")));
  EXPECT_EQ(found[0].position.line, 4U);
  EXPECT_EQ(found[0].position.column, 1U);
  EXPECT_THAT(found[0].message, HasSubstr("a comma before the closing \"}\""));
}

TEST_F(LintTest, JsonSyntaxIsTheOnlyFindingAboutTheContent) {
  Describe("{");
  EXPECT_THAT(Find(), ElementsAre(Is("json-syntax", "")));
}

TEST_F(LintTest, NotUtf8NamesTheByte) {
  const auto found = FindWith("{\"app\": \"A\",\n \"title\": \"a\xFF\"}", "not-utf8");
  ASSERT_EQ(found.size(), 1U);
  EXPECT_EQ(found[0].position.line, 2U);
  EXPECT_EQ(found[0].position.column, 13U);
  EXPECT_THAT(FindWith(R"({"app": "A", "title": "Überblick"})", "not-utf8"), IsEmpty());
}

TEST_F(LintTest, WrongTypeInEveryPlace) {
  const auto found = FindWith(R"([
    {"app": 1, "title": null, "desc": [], "keywords": "k", "stringset": {}, "enable": [],
     "disable": "M1", "modules": {}},
    {"app": "A", "title": "t", "keywords": [1, {"text": 2, "weight": 1.5}, {"weight": "3"}],
     "enable": {"model": "M1", "platform": [1]}, "modules": [7]},
    "entry"
  ])",
                              "wrong-type");
  std::vector<std::string> pointers;
  for (const Finding& finding : found) pointers.push_back(finding.pointer);
  EXPECT_THAT(pointers,
              ElementsAre("/0/app", "/0/title", "/0/desc", "/0/keywords", "/0/stringset",
                          "/0/enable", "/0/disable", "/0/modules", "/1/keywords/0",
                          "/1/keywords/1/text", "/1/keywords/1/weight", "/1/keywords/2/weight",
                          "/1/enable/model", "/1/enable/platform/0", "/1/modules/0", "/2"));
}

TEST_F(LintTest, WrongTypeOfTheRoot) {
  EXPECT_THAT(FindWith("\"text\"", "wrong-type"), ElementsAre(Is("wrong-type", "")));
  EXPECT_THAT(FindWith("null", "wrong-type"), ElementsAre(Is("wrong-type", "")));
}

TEST_F(LintTest, WrongTypeSaysWhatIsWantedAndWhatThereIs) {
  const auto found = FindWith(R"({"app": "A", "title": 7})", "wrong-type");
  ASSERT_EQ(found.size(), 1U);
  EXPECT_EQ(found[0].message, "\"title\" must be a text, not a number");
}

TEST_F(LintTest, MissingMember) {
  EXPECT_THAT(
      FindWith(R"([{}, {"app": "A", "title": "t", "keywords": [{"weight": 2}],
                           "modules": [{"params": "p"}]}])",
               "missing-member"),
      ElementsAre(Is("missing-member", "/0"), Is("missing-member", "/0"),
                  Is("missing-member", "/1/keywords/0"), Is("missing-member", "/1/modules/0")));
}

TEST_F(LintTest, ParamsMissing) {
  EXPECT_THAT(FindWith(R"({"app": "A", "title": "t", "modules": [{"title": "m"},
                           {"title": "n", "params": "p"}]})",
                       "params-missing"),
              ElementsAre(Is("params-missing", "/modules/0")));
}

TEST_F(LintTest, EmptyMember) {
  EXPECT_THAT(
      FindWith(R"({"app": "", "title": "", "desc": "", "stringset": "",
                           "keywords": ["", {"text": ""}],
                           "modules": [{"params": "", "title": "t"}]})",
               "empty-member"),
      ElementsAre(Is("empty-member", "/app"), Is("empty-member", "/title"),
                  Is("empty-member", "/stringset"), Is("empty-member", "/keywords/0"),
                  Is("empty-member", "/keywords/1/text"), Is("empty-member", "/modules/0/params")));
}

TEST_F(LintTest, NoEntries) {
  EXPECT_THAT(FindWith("[]", "no-entries"), ElementsAre(Is("no-entries", "")));
  EXPECT_THAT(FindWith(R"([{"app": "A", "title": "t"}])", "no-entries"), IsEmpty());
}

TEST_F(LintTest, UnknownMember) {
  EXPECT_THAT(
      FindWith(R"({"$schema": "s", "app": "A", "title": "t", "a/b~c": 1,
                           "keywords": [{"text": "k", "wieght": 2}],
                           "disable": {"models": []},
                           "modules": [{"params": "p", "title": "m", "app": "B"}]})",
               "unknown-member"),
      ElementsAre(Is("unknown-member", "/a~1b~0c"), Is("unknown-member", "/keywords/0/wieght"),
                  Is("unknown-member", "/disable/models"), Is("unknown-member", "/modules/0/app")));
}

TEST_F(LintTest, WeightRange) {
  EXPECT_THAT(FindWith(R"({"app": "A", "title": "t", "keywords": [
                           {"text": "a", "weight": 0}, {"text": "b", "weight": 1},
                           {"text": "c", "weight": 5}, {"text": "d", "weight": 6},
                           {"text": "e", "weight": -3}, {"text": "f", "weight": 10000000000}]})",
                       "weight-range"),
              ElementsAre(Is("weight-range", "/keywords/0/weight"),
                          Is("weight-range", "/keywords/3/weight"),
                          Is("weight-range", "/keywords/4/weight"),
                          Is("weight-range", "/keywords/5/weight")));
}

TEST_F(LintTest, WeightRangeSaysWhatTheWeightCounts) {
  std::vector<std::string> messages;
  for (const Finding& finding : FindWith(R"({"app": "A", "title": "t", "keywords": [
           {"text": "a", "weight": 0}, {"text": "b", "weight": 6}, {"text": "c", "weight": 2147483647},
           {"text": "d", "weight": 2147483648}, {"text": "e", "weight": -10000000000}]})",
                                         "weight-range")) {
    messages.push_back(finding.message);
  }
  const std::string none = "a weight of more than 31 bits counts as 1";
  EXPECT_THAT(messages, ElementsAre("a weight below 1 leaves the keyword out",
                                    "a weight above 5 has no more effect than 5",
                                    "a weight above 5 has no more effect than 5", none, none));
}

TEST_F(LintTest, DescriptionMissing) {
  EXPECT_THAT(FindWith(R"({"app": "A", "title": "t", "modules": [
                           {"params": "p", "title": "m", "desc": ""},
                           {"params": "q", "title": "n", "desc": "d"}]})",
                       "description-missing"),
              ElementsAre(Is("description-missing", ""), Is("description-missing", "/modules/0")));
}

TEST_F(LintTest, DuplicateIdOfEntriesAndModules) {
  EXPECT_THAT(FindWith(R"([{"app": "A", "title": "t", "modules": [
                              {"params": "p", "title": "m"}, {"params": "p", "title": "n"}]},
                           {"app": "A", "title": "u"}, {"app": "A?p", "title": "v"},
                           {"app": "B", "title": "w"}])",
                       "duplicate-id"),
              ElementsAre(Is("duplicate-id", "/0/modules/1/params"), Is("duplicate-id", "/1/app"),
                          Is("duplicate-id", "/2/app")));
}

TEST_F(LintTest, DuplicateIdOnlyWhereADeviceShowsBoth) {
  EXPECT_THAT(FindWith(R"([{"app": "A", "title": "t", "enable": {"model": ["M1"]}},
                           {"app": "A", "title": "u", "disable": {"model": ["M1"]}}])",
                       "duplicate-id"),
              IsEmpty());
  EXPECT_THAT(FindWith(R"([{"app": "A", "title": "t", "enable": {"model": ["M1"]}},
                           {"app": "A", "title": "u", "enable": {"platform": ["p1"]}}])",
                       "duplicate-id"),
              ElementsAre(Is("duplicate-id", "/1/app")));
}

TEST_F(LintTest, DuplicateIdAmongPackages) {
  const std::string entry = R"({"app": "A", "title": "t", "desc": "d"})";
  dir_.Write("var/packages/One/index.conf", entry);
  const std::string second = dir_.Write("var/packages/Two/index.conf", entry);
  const auto found = FindIn(dir_ / "var/packages", "duplicate-id");
  ASSERT_THAT(found, ElementsAre(Is("duplicate-id", "/app")));
  EXPECT_EQ(found[0].file, second);
}

TEST_F(LintTest, SameDescriptorNamedTwiceIsCheckedOnce) {
  const Outcome outcome = Lint({dir_ / "pkg", dir_ / "pkg/ui/index.conf"}, options_);
  EXPECT_EQ(outcome.checked.size(), 1U);
}

TEST_F(LintTest, KeywordRepeatsTitle) {
  WriteTexts("enu",
             "[app]\ntitle=\"Photo Album\"\ndesc=\"d\"\nkw=\"photo album\"\nx=\"photos\"\n"
             "[one]\ntitle=\"t\"\ndesc=\"d\"\n");
  EXPECT_THAT(FindWith(R"({"app": "A", "title": "app:title", "keywords": [
                           "app:title", {"text": "app:kw"}, "PHOTO ALBUM", "app:x", "album"]})",
                       "keyword-repeats-title"),
              ElementsAre(Is("keyword-repeats-title", "/keywords/0"),
                          Is("keyword-repeats-title", "/keywords/1/text"),
                          Is("keyword-repeats-title", "/keywords/2")));
}

}  // namespace
}  // namespace tool::lint
