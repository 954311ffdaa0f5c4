// References and packs, from real files.
#include "appindex/string_pool.h"

#include <gmock/gmock.h>

#include <memory>
#include <string>

#include "tests/support/device_root_test.h"

namespace velkor::appindex {
namespace {

constexpr char kBuiltInRoot[] = "/usr/tovo/tovoman/webman/texts/";
constexpr char kBuiltInConf[] = "/usr/tovo/tovoman/webman/modules/X/index.conf";

void WriteTexts(const std::string& texts_root, const std::string& lang,
                const std::string& strings) {
  test::WriteFile(texts_root + lang + "/strings", strings);
}

class StringPoolTest : public test::DeviceRootTest {
 protected:
  StringPoolTest() {
    WriteTexts(kBuiltInRoot, "enu", "[app]\ntitle=\"Settings\"\ntitle:x=\"Settings of x\"\n");
    WriteTexts(kBuiltInRoot, "ger", "[app]\ntitle=\"Einstellungen\"\n");
  }

  StringPool pool_;
};

TEST_F(StringPoolTest, ATextWithoutAColonIsItsOwnTranslation) {
  EXPECT_EQ(pool_.GetString("enu", "Backup"), "Backup");
  EXPECT_EQ(pool_.GetString("ger", "Backup"), "Backup");
  EXPECT_EQ(pool_.GetString("no such language", ""), "");
}

TEST_F(StringPoolTest, AReferenceIsSplitAtItsFirstColon) {
  EXPECT_EQ(pool_.GetString("enu", "app:title"), "Settings");
  EXPECT_EQ(pool_.GetString("enu", "app:title:x"), "Settings of x");
}

TEST_F(StringPoolTest, AReferenceWithAnEmptySectionOrKeyIsLookedUpToo) {
  EXPECT_EQ(pool_.GetString("enu", ":title"), ":title");
  EXPECT_EQ(pool_.GetString("enu", "app:"), "");
  EXPECT_EQ(pool_.GetString("enu", ":"), ":");
}

TEST_F(StringPoolTest, AnUnresolvedReferenceIsItsOwnText) {
  EXPECT_EQ(pool_.GetString("enu", "none:title:x"), "none:title:x");
}

TEST_F(StringPoolTest, SectionAndKeyMayBeGivenApart) {
  EXPECT_EQ(pool_.GetString("ger", "app", "title"), "Einstellungen");
  EXPECT_EQ(pool_.GetString("fre", "app", "title"), "Settings");
}

TEST_F(StringPoolTest, APackagesTextsAreFoundAndThoseOfBuiltInModulesAfterThem) {
  WriteTexts("/var/packages/Foo/target/ui/texts/", "ger", "[app]\ntitle=\"Fotoalbum\"\n");
  pool_.SetTextsRootByConfPath("/var/packages/Foo/target/ui/index.conf");
  EXPECT_EQ(pool_.GetString("ger", "app:title"), "Fotoalbum");
  pool_.SetTextsRootByConfPath(kBuiltInConf);
  EXPECT_EQ(pool_.GetString("ger", "app:title"), "Einstellungen");
}

TEST_F(StringPoolTest, AStringSetsTextsAreFound) {
  WriteTexts("/var/packages/Foo/ui/strs/", "ger", "[app]\ntitle=\"Sicherung\"\n");
  pool_.SetTextsRootByStringSet("/var/packages/Foo/ui/index.conf", "strs");
  EXPECT_EQ(pool_.GetString("ger", "app:title"), "Sicherung");
}

TEST_F(StringPoolTest, APackIsLoadedOnceAndEditsAreNotSeen) {
  EXPECT_EQ(pool_.GetString("enu", "app:title"), "Settings");
  WriteTexts(kBuiltInRoot, "enu", "[app]\ntitle=\"Preferences\"\n");
  EXPECT_EQ(pool_.GetString("enu", "app:title"), "Settings");
  EXPECT_EQ(StringPool().GetString("enu", "app:title"), "Preferences");
}

TEST_F(StringPoolTest, EachTextsRootHasOnePack) {
  const std::shared_ptr<LanguagePack> pack = pool_.GetLangPack(kBuiltInRoot);
  EXPECT_EQ(pool_.GetLangPack(kBuiltInRoot), pack);
  EXPECT_NE(pool_.GetLangPack("/other/"), pack);
}

TEST_F(StringPoolTest, GetLangPackDoesNotSetTheCurrentRoot) {
  WriteTexts("/other/", "enu", "[app]\ntitle=\"Other\"\n");
  EXPECT_EQ(pool_.GetLangPack("/other/")->GetString("enu", "app", "title"), "Other");
  EXPECT_EQ(pool_.GetString("enu", "app:title"), "Settings");
}

TEST_F(StringPoolTest, GetStringKeepsNoReferenceToThePack) {
  const std::shared_ptr<LanguagePack> pack = pool_.GetLangPack(kBuiltInRoot);
  pool_.GetString("enu", "app:title");
  EXPECT_EQ(pack.use_count(), 2);  // the pool's and this one
}

TEST_F(StringPoolTest, APackOutlivesItsPool) {
  auto pool = std::make_unique<StringPool>();
  const std::shared_ptr<LanguagePack> pack = pool->GetLangPack(kBuiltInRoot);
  pool.reset();
  EXPECT_EQ(pack.use_count(), 1);
  EXPECT_EQ(pack->GetString("enu", "app", "title"), "Settings");
}

}  // namespace
}  // namespace velkor::appindex
