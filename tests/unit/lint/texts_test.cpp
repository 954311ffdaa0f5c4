// The states of texts agree with what the library makes of them.
#include "tool/lint/texts.h"

#include <gtest/gtest.h>

#include "appindex/device_identity.h"
#include "appindex/string_pool.h"
#include "tests/unit/host/temp_dir.h"

namespace tool::lint {
namespace {

class TextsTest : public ::testing::Test {
 protected:
  TextsTest() {
    dir_.Write("enu/strings", "[a]\nfull=\"English\"\nempty=\"\"\n[b]\nonly=\"English b\"\n");
    dir_.Write("ger/strings", "[a]\nfull=\"Deutsch\"\nempty=\"nicht leer\"\nc:d=\"Doppelpunkt\"\n");
    dir_.Write("fre/strings", "; nothing\n");
  }

  TempDir dir_;
};

TEST_F(TextsTest, StatesAreWhatTheLibraryShows) {
  const Texts texts(dir_.Path() + "/");
  const velkor::appindex::LanguagePack pack(dir_.Path() + "/");
  for (const std::string& lang : velkor::appindex::GetSupportedLangs()) {
    for (const char* text :
         {"a:full", "a:empty", "a:none", "b:only", "c:none", "a:c:d", ":", "a:"}) {
      const Reference reference(text);
      const std::string shown = pack.GetString(lang, reference.section, reference.key);
      switch (texts.StateOf(lang, reference)) {
        case TextState::kPresent:
          EXPECT_EQ(shown, texts.TextOf(lang, reference)) << lang << " " << text;
          EXPECT_NE(shown, "") << lang << " " << text;
          break;
        case TextState::kNoLanguage:
          EXPECT_EQ(shown, pack.GetString("enu", reference.section, reference.key));
          break;
        case TextState::kNoSection:
          EXPECT_EQ(shown, text) << lang;
          break;
        case TextState::kNoKey:
        case TextState::kEmpty:
          EXPECT_EQ(shown, "") << lang << " " << text;
          break;
      }
    }
  }
}

TEST_F(TextsTest, EachStateOccurs) {
  const Texts texts(dir_.Path() + "/");
  EXPECT_EQ(texts.StateOf("ger", Reference("a:full")), TextState::kPresent);
  EXPECT_EQ(texts.StateOf("ger", Reference("a:c:d")), TextState::kPresent);
  EXPECT_EQ(texts.StateOf("fre", Reference("a:full")), TextState::kNoLanguage);
  EXPECT_EQ(texts.StateOf("ger", Reference("b:only")), TextState::kNoSection);
  EXPECT_EQ(texts.StateOf("ger", Reference("a:none")), TextState::kNoKey);
  EXPECT_EQ(texts.StateOf("enu", Reference("a:empty")), TextState::kEmpty);
}

TEST_F(TextsTest, AnEmptyRootHasNoTexts) { EXPECT_FALSE(Texts("").HasLanguage("enu")); }

}  // namespace
}  // namespace tool::lint
