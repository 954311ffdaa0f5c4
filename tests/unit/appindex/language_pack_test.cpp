// The texts of one texts root, from real files.
#include <gmock/gmock.h>
#include <unistd.h>

#include <string>

#include "appindex/device_identity.h"
#include "appindex/string_pool.h"
#include "tests/support/device_root_test.h"

namespace velkor::appindex {
namespace {

using ::testing::IsEmpty;

constexpr char kRoot[] = "/texts/";

void WriteTexts(const std::string& lang, const std::string& strings) {
  test::WriteFile(kRoot + lang + "/strings", strings);
}

// A text of a pack that is loaded now.
std::string Text(const std::string& lang, const std::string& section, const std::string& key) {
  return LanguagePack(kRoot).GetString(lang, section, key);
}

class LanguagePackTest : public test::DeviceRootTest {
 protected:
  LanguagePackTest() { WriteTexts("enu", "[common]\nok=\"OK\"\ncancel=\"Cancel\"\n"); }
  ~LanguagePackTest() override { EXPECT_THAT(TakeLog(), IsEmpty()); }
};

TEST_F(LanguagePackTest, EachLanguageHasItsOwnTexts) {
  WriteTexts("ger", "[common]\ncancel=\"Abbrechen\"\n");
  WriteTexts("tha", "[common]\ncancel=\"ยกเลิก\"\n");
  EXPECT_EQ(Text("enu", "common", "cancel"), "Cancel");
  EXPECT_EQ(Text("ger", "common", "cancel"), "Abbrechen");
  EXPECT_EQ(Text("tha", "common", "cancel"), "ยกเลิก");
}

TEST_F(LanguagePackTest, AllSupportedLanguagesAreLoaded) {
  for (const std::string& lang : GetSupportedLangs()) {
    WriteTexts(lang, "[common]\nok=\"ok " + lang + "\"\n");
  }
  const LanguagePack pack(kRoot);
  for (const std::string& lang : GetSupportedLangs()) {
    EXPECT_EQ(pack.GetString(lang, "common", "ok"), "ok " + lang);
  }
}

TEST_F(LanguagePackTest, AMissingLanguageGivesTheEnglishText) {
  EXPECT_EQ(Text("ger", "common", "ok"), "OK");
}

TEST_F(LanguagePackTest, AnUnknownLanguageGivesTheEnglishTextEvenIfItsDirectoryExists) {
  WriteTexts("xyz", "[common]\nok=\"XYZ\"\n");
  EXPECT_EQ(Text("xyz", "common", "ok"), "OK");
  EXPECT_EQ(Text("", "common", "ok"), "OK");
  EXPECT_EQ(Text("ENU", "common", "ok"), "OK");
}

TEST_F(LanguagePackTest, ALanguageWithoutAnyTextGivesTheEnglishText) {
  WriteTexts("ger", "[common]\n# nothing yet\n");
  EXPECT_EQ(Text("ger", "common", "ok"), "OK");
}

TEST_F(LanguagePackTest, AMissingSectionGivesThePlaceholderEvenIfEnglishHasIt) {
  WriteTexts("ger", "[other]\nok=\"gut\"\n");
  EXPECT_EQ(Text("ger", "common", "ok"), "common:ok");
}

TEST_F(LanguagePackTest, AMissingSectionOfEnglishInPlaceOfALanguageGivesThePlaceholder) {
  EXPECT_EQ(Text("ger", "none", "ok"), "none:ok");
}

TEST_F(LanguagePackTest, AMissingKeyOfAnExistingSectionGivesTheEmptyString) {
  EXPECT_EQ(Text("enu", "common", "missing"), "");
}

TEST_F(LanguagePackTest, AMissingKeyGivesTheEmptyStringEvenIfEnglishHasIt) {
  WriteTexts("ger", "[common]\ncancel=\"Abbrechen\"\n");
  EXPECT_EQ(Text("ger", "common", "ok"), "");
}

TEST_F(LanguagePackTest, AMissingKeyOfEnglishInPlaceOfALanguageGivesTheEmptyString) {
  EXPECT_EQ(Text("ger", "common", "missing"), "");
}

TEST_F(LanguagePackTest, WithoutAnyLanguageEveryRequestGivesThePlaceholder) {
  const LanguagePack pack("/no such root/");
  EXPECT_EQ(pack.GetString("enu", "common", "ok"), "common:ok");
  EXPECT_EQ(pack.GetString("ger", "common", "ok"), "common:ok");
  EXPECT_EQ(pack.GetString("", "", ""), ":");
}

TEST_F(LanguagePackTest, WithoutEnglishAMissingLanguageGivesThePlaceholder) {
  unlink("/texts/enu/strings");
  WriteTexts("ger", "[common]\nok=\"gut\"\n");
  EXPECT_EQ(Text("fre", "common", "ok"), "common:ok");
  EXPECT_EQ(Text("ger", "common", "ok"), "gut");
}

TEST_F(LanguagePackTest, ALookUpChangesNothing) {
  const LanguagePack pack(kRoot);
  EXPECT_EQ(pack.GetString("enu", "common", "missing"), "");
  EXPECT_EQ(pack.GetString("enu", "none", "ok"), "none:ok");
  EXPECT_EQ(pack.GetString("enu", "none", "ok"), "none:ok");
  EXPECT_EQ(pack.GetString("enu", "common", "ok"), "OK");
}

TEST_F(LanguagePackTest, EditsAfterLoadingAreNotSeen) {
  const LanguagePack pack(kRoot);
  WriteTexts("enu", "[common]\nok=\"Fine\"\n");
  WriteTexts("ger", "[common]\nok=\"gut\"\n");
  EXPECT_EQ(pack.GetString("enu", "common", "ok"), "OK");
  EXPECT_EQ(pack.GetString("ger", "common", "ok"), "OK");
}

}  // namespace
}  // namespace velkor::appindex
