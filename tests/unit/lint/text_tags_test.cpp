// The findings about translated texts.
#include <sys/stat.h>

#include <algorithm>
#include <filesystem>
#include <string>
#include <vector>

#include "tests/unit/lint/lint_test.h"

namespace tool::lint {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::SizeIs;

TEST_F(LintTest, ReferenceUnresolved) {
  const auto found = FindWith(
      R"({"app": "A", "title": "app:nothing", "desc": "Note: not a reference",
          "keywords": ["literal", "nowhere:kw", "app:kw"]})",
      "reference-unresolved");
  ASSERT_THAT(found,
              ElementsAre(Is("reference-unresolved", "/title"), Is("reference-unresolved", "/desc"),
                          Is("reference-unresolved", "/keywords/1")));
  EXPECT_THAT(found[1].message, HasSubstr("always looked up as section:key"));
}

TEST_F(LintTest, ReferenceUnresolvedWhenItIsEmptyEverywhere) {
  for (const std::string& lang : velkor::appindex::GetSupportedLangs()) {
    WriteTexts(lang, "[app]\ntitle=\"\"\ndesc=\"d " + lang + "\"\n");
  }
  EXPECT_THAT(
      FindWith(R"({"app": "A", "title": "app:title", "desc": "app:desc"})", "reference-unresolved"),
      ElementsAre(Is("reference-unresolved", "/title")));
}

TEST_F(LintTest, EnglishMissing) {
  WriteTexts("enu", "[app]\ntitle=\"Title\"\ndesc=\"d\"\n[one]\ntitle=\"t\"\ndesc=\"d\"\n");
  EXPECT_THAT(Find("english-missing"), ElementsAre(Is("english-missing", "/keywords/0")));
}

TEST_F(LintTest, EnglishMissingAltogetherIsSaidOnce) {
  WriteTexts("enu", "");
  EXPECT_THAT(Find("english-missing"), ElementsAre(Is("english-missing", "")));
}

TEST_F(LintTest, TextsUnread) {
  const std::string texts = "[app]\ntitle=\"T\"\ndesc=\"D\"\nkw=\"K\"\n";
  WriteTexts("fre", "");
  WriteTexts("ger", texts + std::string(1024 * 1024, '#'));
  WriteTexts("ita", "title=\"T\"\n");
  const auto found = Find("texts-unread");
  ASSERT_THAT(found, ElementsAre(Is("texts-unread", ""), Is("texts-unread", "")));
  EXPECT_THAT(found[0].message, HasSubstr("ger/strings gives no texts"));
  EXPECT_THAT(found[0].languages, ElementsAre("ger"));
  EXPECT_THAT(found[1].languages, ElementsAre("ita"));
}

TEST_F(LintTest, SectionMissing) {
  WriteTexts("ger", "[app]\ntitle=\"T\"\ndesc=\"D\"\nkw=\"K\"\n");
  WriteTexts("fre", "[app]\ntitle=\"T\"\ndesc=\"D\"\nkw=\"K\"\n");
  const auto found = Find("section-missing");
  ASSERT_THAT(found, ElementsAre(Is("section-missing", "/modules/0/title")));
  EXPECT_THAT(found[0].languages, ElementsAre("fre", "ger"));
  EXPECT_EQ(found[0].position.line, 8U);
  EXPECT_THAT(Find("text-missing"), IsEmpty());
}

TEST_F(LintTest, SectionMissingNotForALanguageWithoutTexts) {
  WriteTexts("ger", "");
  EXPECT_THAT(Find("section-missing"), IsEmpty());
}

TEST_F(LintTest, SectionMissingNotWhereNoLanguageHasIt) {
  EXPECT_THAT(FindWith(R"({"app": "A", "title": "nowhere:title", "desc": "d"})", "section-missing"),
              IsEmpty());
}

TEST_F(LintTest, SectionUneven) {
  WriteTexts("ger", GoodTexts("ger") + "[menu]\nopen=\"Öffnen\"\n");
  const auto found = Find("section-uneven");
  ASSERT_THAT(found, ElementsAre(Is("section-uneven", "")));
  EXPECT_THAT(found[0].languages, SizeIs(20));
  for (const std::string& lang : velkor::appindex::GetSupportedLangs()) {
    WriteTexts(lang, GoodTexts(lang) + "[menu]\nopen=\"o\"\n");
  }
  EXPECT_THAT(Find("section-uneven"), IsEmpty());
}

TEST_F(LintTest, TextMissing) {
  WriteTexts("jpn", "[app]\ntitle=\"T\"\nkw=\"K\"\n[one]\ntitle=\"t\"\ndesc=\"d\"\n");
  const auto found = Find("text-missing");
  ASSERT_THAT(found, ElementsAre(Is("text-missing", "/desc")));
  EXPECT_THAT(found[0].languages, ElementsAre("jpn"));
}

TEST_F(LintTest, TextEmpty) {
  WriteTexts("jpn", "[app]\ntitle=\"T\"\ndesc=\"\"\nkw=\"K\"\n[one]\ntitle=\"t\"\ndesc=\"d\"\n");
  const auto found = Find("text-empty");
  ASSERT_THAT(found, ElementsAre(Is("text-empty", "/desc")));
  EXPECT_THAT(found[0].languages, ElementsAre("jpn"));
}

TEST_F(LintTest, TextUntranslatedSentence) {
  WriteTexts("ita", GoodTexts("enu"));
  const auto found = Find("text-untranslated");
  ASSERT_THAT(found, ElementsAre(Is("text-untranslated", "/desc")));  // not the short texts
  EXPECT_THAT(found[0].languages, ElementsAre("ita"));
}

TEST_F(LintTest, TextUntranslatedNotForTermsAndNames) {
  for (const std::string& lang : velkor::appindex::GetSupportedLangs()) {
    WriteTexts(lang, "[app]\ntitle=\"Photo Album\"\ndesc=\"SMB NFS FTP WebDAV\"\n");
  }
  EXPECT_THAT(
      FindWith(R"({"app": "A", "title": "app:title", "desc": "app:desc"})", "text-untranslated"),
      IsEmpty());
}

TEST_F(LintTest, LanguageAbsentIsANote) {
  WriteTexts("trk", "; nothing translated yet\n");
  const auto found = Find();
  ASSERT_THAT(found, ElementsAre(Is("language-absent", "")));
  EXPECT_THAT(found[0].languages, ElementsAre("trk"));
  EXPECT_EQ(found[0].severity, Severity::kNote);
}

TEST_F(LintTest, LanguageUnknown) {
  WriteTexts("deu", GoodTexts("ger"));
  const auto found = Find();
  ASSERT_THAT(found, ElementsAre(Is("language-unknown", "")));
  EXPECT_THAT(found[0].message, HasSubstr("texts/deu"));
}

TEST_F(LintTest, TextsNotFoundInThePackage) {
  const std::string with_reference = R"({"app": "A", "title": "app:title", "desc": "d"})";
  dir_.Write("other/index.conf", with_reference);
  EXPECT_THAT(FindIn(dir_ / "other"), ElementsAre(Is("texts-not-found", "")));
  dir_.Write("other/index.conf", R"({"app": "A", "title": "Literal", "desc": "d"})");
  EXPECT_THAT(FindIn(dir_ / "other"), IsEmpty());
}

TEST_F(LintTest, TextsNotFoundForABuiltInModule) {
  const std::string conf = dir_.Write("usr/tovo/tovoman/webman/modules/M/index.conf",
                                      R"({"app": "A", "title": "app:title", "desc": "d"})");
  const auto found = FindIn(conf);
  ASSERT_THAT(found, ElementsAre(Is("texts-not-found", "")));
  EXPECT_THAT(found[0].message, HasSubstr("web interface's texts are not there"));
}

TEST_F(LintTest, TextsNotFoundBecauseADirectoryCannotBeOpened) {
  dir_.Write("shut/index.conf", R"({"app": "A", "title": "app:title", "desc": "d"})");
  for (const char* name : {"a", "b"}) {
    dir_.Write(std::string("shut/") + name + "/texts/enu/strings", GoodTexts("enu"));
  }
  // The one that is met first; the texts in the other one are there, but are not reached.
  std::filesystem::path first = *std::filesystem::directory_iterator(dir_ / "shut");
  if (!std::filesystem::is_directory(first)) {
    first = *++std::filesystem::directory_iterator(dir_ / "shut");
  }
  ASSERT_EQ(chmod(first.c_str(), 0), 0);
  ASSERT_EQ(chmod(dir_.Path().c_str(), 0755), 0);
  std::vector<Finding> found;
  {
    const HeldBackByModes user;
    found = FindIn(dir_ / "shut");
  }
  chmod(first.c_str(), 0755);
  ASSERT_THAT(found, ElementsAre(Is("texts-not-found", "")));
  EXPECT_THAT(found[0].message, HasSubstr("cannot be opened, which ends the search for texts"));
}

TEST_F(LintTest, TextsNotFoundBesideTheDescriptor) {
  EXPECT_THAT(FindWith(R"({"app": "A", "title": "app:title", "desc": "d", "stringset": "strs"})",
                       "texts-not-found"),
              ElementsAre(Is("texts-not-found", "/stringset")));
  dir_.Write("pkg/ui/strs/enu/strings", "[app]\ntitle=\"T\"\n");
  EXPECT_THAT(Find("texts-not-found"), IsEmpty());
  EXPECT_THAT(Find("reference-unresolved"), IsEmpty());
}

TEST_F(LintTest, TextsAmbiguous) {
  dir_.Write("pkg/share/texts/enu/strings", GoodTexts("enu"));
  const auto found = Find("texts-ambiguous");
  ASSERT_THAT(found, ElementsAre(Is("texts-ambiguous", "")));
  EXPECT_THAT(found[0].message, HasSubstr("share/texts/ and "));
  EXPECT_THAT(FindWith(R"({"app": "A", "title": "app:title", "desc": "d", "stringset": "texts"})",
                       "texts-ambiguous"),
              IsEmpty());
}

TEST_F(LintTest, TextsBeyondReach) {
  dir_.Write("deep/index.conf", R"({"app": "A", "title": "app:title", "desc": "d"})");
  dir_.Write("deep/1/2/3/4/5/6/texts/enu/strings", "[app]\ntitle=\"T\"\n");
  EXPECT_THAT(FindIn(dir_ / "deep"), ElementsAre(Is("texts-beyond-reach", "")));
}

TEST_F(LintTest, TextsWithinReach) {
  dir_.Write("near/index.conf", R"({"app": "A", "title": "app:title", "desc": "d"})");
  dir_.Write("near/1/2/3/4/5/texts/enu/strings", "[app]\ntitle=\"T\"\n");
  EXPECT_THAT(FindIn(dir_ / "near"), ElementsAre(Is("language-absent", "")));
}

}  // namespace
}  // namespace tool::lint
