// The language of a locale.
#include "tool/languages.h"

#include <gmock/gmock.h>

#include <CLI/CLI.hpp>
#include <cstdlib>
#include <set>

#include "appindex/device_identity.h"

namespace tool {
namespace {

TEST(Languages, LocalesNamesBecomeCodes) {
  EXPECT_EQ(CodeOfLocale("de_AT.UTF-8"), "ger");
  EXPECT_EQ(CodeOfLocale("fr"), "fre");
  EXPECT_EQ(CodeOfLocale("nb_NO@latin"), "nor");
  EXPECT_EQ(CodeOfLocale("pt_BR.UTF-8"), "ptb");
  EXPECT_EQ(CodeOfLocale("pt_PT.UTF-8"), "ptg");
  EXPECT_EQ(CodeOfLocale("zh_TW.UTF-8"), "cht");
  EXPECT_EQ(CodeOfLocale("zh_CN.UTF-8"), "chs");
}

TEST(Languages, OthersAreEnglish) {
  EXPECT_EQ(CodeOfLocale("C.UTF-8"), "enu");
  EXPECT_EQ(CodeOfLocale(""), "enu");
  EXPECT_EQ(CodeOfLocale("eo"), "enu");
}

TEST(Languages, EveryLanguageOfTheDeviceIsSomeLocales) {
  std::set<std::string> codes;
  for (const char* locale : {"zh_CN", "zh_TW", "cs_CZ", "da_DK", "en_GB", "fr_FR", "de_DE",
                             "hu_HU", "it_IT", "ja_JP", "ko_KR", "nl_NL", "nb_NO", "pl_PL",
                             "pt_BR", "pt_PT", "ru_RU", "es_ES", "sv_SE", "th_TH", "tr_TR"}) {
    codes.insert(CodeOfLocale(locale));
  }
  EXPECT_EQ(codes, velkor::appindex::GetSupportedLangs());
}

TEST(Languages, TheUsersIsThatOfTheStrongestVariable) {
  for (const char* variable : {"LC_ALL", "LC_MESSAGES", "LANG"}) unsetenv(variable);
  EXPECT_EQ(UsersLanguage(), "enu");
  setenv("LANG", "de_DE.UTF-8", 1);
  EXPECT_EQ(UsersLanguage(), "ger");
  setenv("LC_MESSAGES", "fr_FR.UTF-8", 1);
  EXPECT_EQ(UsersLanguage(), "fre");
  setenv("LC_ALL", "", 1);
  EXPECT_EQ(UsersLanguage(), "fre");
  setenv("LC_ALL", "ja_JP.UTF-8", 1);
  EXPECT_EQ(UsersLanguage(), "jpn");
}

TEST(Languages, UnknownCodeIsRefusedWithThoseThereAre) {
  EXPECT_NO_THROW(RequireLanguage("ger"));
  try {
    RequireLanguage("xyz");
    FAIL() << "no exception";
  } catch (const CLI::ValidationError& error) {
    EXPECT_THAT(error.what(), testing::HasSubstr("chs cht csy"));
  }
}

}  // namespace
}  // namespace tool
