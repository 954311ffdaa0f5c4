// The findings about what the search daemon refuses.
#include "tests/unit/lint/lint_test.h"

namespace tool::lint {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

constexpr std::size_t kMiB = std::size_t{1024} * 1024;

std::string With(const std::string& member, const std::string& value) {
  return R"({"app": "A", "title": "t", "desc": "d", )" + (member + value) + "}";
}

TEST_F(LintTest, NulCharacterInEveryPlace) {
  EXPECT_THAT(
      FindWith(R"({"app": "A\u0000", "title": "t\u0000", "desc": "\u0000",
                           "keywords": ["k", {"text": "\u0000"}],
                           "modules": [{"params": "p\u0000", "title": "m", "desc": "d"}]})",
               "nul-character"),
      testing::UnorderedElementsAre(Is("nul-character", "/app"), Is("nul-character", "/title"),
                                    Is("nul-character", "/desc"), Is("nul-character", "/keywords"),
                                    Is("nul-character", "/modules/0/params")));
}

TEST_F(LintTest, NulCharacterInATextNamesTheLanguage) {
  WriteTexts("ger", GoodTexts("ger") + std::string("[nul]\ntitle=\"a\0b\"\n", 18));
  WriteTexts("enu", GoodTexts("enu") + "[nul]\ntitle=\"ab\"\n");
  const auto found =
      FindWith(R"({"app": "A", "title": "nul:title", "desc": "app:desc"})", "nul-character");
  ASSERT_THAT(found, ElementsAre(Is("nul-character", "/title")));
  EXPECT_THAT(found[0].languages, ElementsAre("ger"));
  EXPECT_THAT(found[0].message, HasSubstr("the title of the document in ger holds"));
}

TEST_F(LintTest, NulCharacterOfAnEnglishTitleIsNoMistakeOfTheKeywords) {
  EXPECT_THAT(FindWith(R"({"app": "A", "title": "\u0000", "keywords": ["k"]})", "nul-character"),
              ElementsAre(Is("nul-character", "/title")));
}

TEST_F(LintTest, NulCharacterInAReferenceThatNothingResolves) {
  EXPECT_THAT(FindWith(R"({"app": "A", "title": "t", "desc": "no:\u0000"})", "nul-character"),
              ElementsAre(Is("nul-character", "/desc")));
}

TEST_F(LintTest, NulCharacterWhereNoDocumentHasItIsNone) {
  EXPECT_THAT(FindWith(R"({"app": "A", "title": "t", "stringset": "\u0000", "other": "\u0000",
                           "enable": {"model": ["\u0000"]}})",
                       "nul-character"),
              IsEmpty());
}

TEST_F(LintTest, TextTooLong) {
  const std::string most = "\"" + std::string(kMiB, 'x') + "\"";
  const std::string more = "\"" + std::string(kMiB + 1, 'x') + "\"";
  EXPECT_THAT(FindWith(R"({"app": "A", "title": "t", "desc": )" + most + "}", "text-too-long"),
              IsEmpty());
  EXPECT_THAT(FindWith(R"({"app": "A", "title": "t", "desc": )" + more + "}", "text-too-long"),
              ElementsAre(Is("text-too-long", "/desc")));
  EXPECT_THAT(FindWith(R"({"app": "A", "desc": "d", "title": )" + more + "}", "text-too-long"),
              testing::Contains(Is("text-too-long", "/title")));
}

TEST_F(LintTest, TextTooLongOfAnId) {
  EXPECT_THAT(
      FindWith(R"({"app": ")" + std::string(4097, 'a') + R"(", "title": "t"})", "text-too-long"),
      ElementsAre(Is("text-too-long", "/app")));
  EXPECT_THAT(FindWith(R"({"app": ")" + std::string(4000, 'a') +
                           R"(", "title": "t", "modules": [{"title": "m", "params": ")" +
                           std::string(96, 'p') + R"("}]})",
                       "text-too-long"),
              ElementsAre(Is("text-too-long", "/modules/0/params")));
}

TEST_F(LintTest, TextTooLongOfKeywordsByTheirWeight) {
  const std::string word = "\"" + std::string(kMiB / 10, 'k') + "\"";
  EXPECT_THAT(FindWith(With("\"keywords\": ", "[{\"text\": " + word + ", \"weight\": 4}]"),
                       "text-too-long"),
              IsEmpty());
  const auto found = FindWith(With("\"keywords\": ", "[{\"text\": " + word + ", \"weight\": 5}]"),
                              "text-too-long");
  ASSERT_THAT(found, ElementsAre(Is("text-too-long", "/keywords")));
  EXPECT_THAT(found[0].languages, IsEmpty()) << "in every language";
}

TEST_F(LintTest, TextTooLongInOneLanguage) {
  // No text is that long in a file, but wrong bytes are replaced by longer ones.
  WriteTexts("jpn", GoodTexts("jpn") + "[app]\ndesc=\"" + std::string(kMiB / 2, '\xFF') + "\"\n");
  const auto found = Find("text-too-long");
  ASSERT_THAT(found, ElementsAre(Is("text-too-long", "/desc")));
  EXPECT_THAT(found[0].languages, ElementsAre("jpn"));
}

TEST_F(LintTest, TextTooLongOnceWrongBytesAreReplaced) {
  EXPECT_THAT(
      FindWith(R"({"app": "A", "title": "t", "desc": ")" + std::string(kMiB / 2, '\xFF') + "\"}",
               "text-too-long"),
      ElementsAre(Is("text-too-long", "/desc")));
}

}  // namespace
}  // namespace tool::lint
