// Words that say little never keep a search from finding what the other words find.
#include "host/searchd/common_words.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/unit/searchd/memory_index.h"

namespace searchd {
namespace {

struct Case {
  const char* language;
  const char* title;
  std::vector<std::string> queries;
};

TEST(CommonWordsTest, WordsForSettingsAndApplicationsAreNotRequiredInAnyLanguage) {
  const std::vector<Case> cases = {
      {"chs", "照片", {"照片 设置", "设置 照片", "照片设置", "照片 应用", "照片应用程序"}},
      {"cht", "照片", {"照片 設定", "設定 照片", "照片設定", "照片 應用程式"}},
      {"csy", "Fotky", {"fotky nastavení", "nastaveni fotky", "aplikace fotky"}},
      {"dan", "Billeder", {"billeder indstillinger", "indstillinger billeder", "app billeder"}},
      {"enu", "Photos", {"photos settings", "settings photos", "photos app", "Photos Application"}},
      {"fre", "Photos", {"photos paramètres", "parametres photos", "application photos"}},
      {"ger", "Fotos", {"fotos einstellungen", "Einstellungen Fotos", "fotos anwendung"}},
      {"hun", "Fotók", {"fotók beállítások", "beallitasok fotok", "fotók alkalmazás"}},
      {"ita", "Foto", {"foto impostazioni", "impostazioni foto", "applicazione foto"}},
      {"jpn", "写真", {"写真 設定", "設定 写真", "写真設定", "写真 アプリ", "写真アプリ"}},
      {"krn", "사진", {"사진 설정", "설정 사진", "사진 앱", "앱 사진"}},
      {"nld", "Foto's", {"foto's instellingen", "instellingen foto's", "toepassing foto's"}},
      {"nor", "Bilder", {"bilder innstillinger", "innstillinger bilder", "app bilder"}},
      {"plk", "Zdjęcia", {"zdjęcia ustawienia", "ustawienia zdjecia", "aplikacja zdjęcia"}},
      {"ptb", "Fotos", {"fotos configurações", "configuracoes fotos", "aplicativo fotos"}},
      {"ptg", "Fotos", {"fotos definições", "definicoes fotos", "aplicação fotos"}},
      {"rus", "Фото", {"фото настройки", "Настройки Фото", "приложение фото"}},
      {"spn", "Fotos", {"fotos configuración", "configuracion fotos", "fotos ajustes"}},
      {"sve", "Bilder", {"bilder inställningar", "installningar bilder", "app bilder"}},
      {"tha", "รูปภาพ", {"รูปภาพ การตั้งค่า", "ตั้งค่า รูปภาพ", "แอป รูปภาพ"}},
      {"trk",
       "Fotoğraflar",
       {"fotoğraflar ayarlar", "AYARLAR fotoğraflar", "uygulama fotograflar"}},
  };
  ASSERT_EQ(cases.size(), 21U);
  for (const Case& one : cases) {
    MemoryIndex index(one.language);
    index.Add("it", one.title);
    index.Add("other", "Qwxyz");
    for (const std::string& query : one.queries) {
      EXPECT_EQ(index.Find(query), Strings{"it"}) << one.language << " " << query;
    }
  }
}

TEST(CommonWordsTest, AreNotRequiredWhereNoSpaceStandsBesideThem) {
  for (const Case& one : std::vector<Case>{
           {"chs", "照片", {"照片设置", "设置照片", "照片应用"}},
           {"cht", "照片", {"照片設定", "設定照片"}},
           {"jpn", "写真", {"写真設定", "設定写真", "写真アプリ"}},
           {"tha", "รูปภาพ", {"ตั้งค่ารูปภาพ", "การตั้งค่ารูปภาพ", "รูปภาพตั้งค่า", "แอปรูปภาพ"}}}) {
    MemoryIndex index(one.language);
    index.Add("it", one.title);
    index.Add("other", "Qwxyz");
    for (const std::string& query : one.queries) {
      EXPECT_EQ(index.Find(query), Strings{"it"}) << one.language << " " << query;
    }
  }
}

TEST(CommonWordsTest, DocumentsWithTheWordComeFirst) {
  MemoryIndex index;
  index.Add("without", "Photos");
  index.Add("with", "Photos settings");
  index.Add("elsewhere", "Other settings");
  EXPECT_EQ(index.Find("photos settings"), (Strings{"with", "without"}));
  EXPECT_EQ(index.Find("settings photos"), (Strings{"with", "without"}));
}

TEST(CommonWordsTest, AreLookedForWhenNothingElseIsTyped) {
  MemoryIndex index;
  index.Add("settings", "Settings");
  index.Add("app", "App Center");
  index.Add("other", "Photos");
  EXPECT_EQ(index.Find("settings"), Strings{"settings"});
  EXPECT_EQ(index.Find("app"), Strings{"app"});
}

TEST(CommonWordsTest, DoNotRemoveEachOthersResults) {
  MemoryIndex index;
  index.Add("settings", "Settings");
  index.Add("other", "Photos");
  EXPECT_EQ(index.Find("settings app"), Strings{"settings"});
  EXPECT_EQ(index.Find("app settings"), Strings{"settings"});
}

MemoryIndex Stations(const std::string& language, const std::string& word, int with, int without) {
  MemoryIndex index(language);
  for (int i = 0; i < with; ++i) {
    index.Add("with" + std::to_string(i), word + " Q" + std::to_string(i));
  }
  for (int i = 0; i < without; ++i) {
    index.Add("without" + std::to_string(i), "Z" + std::to_string(i));
  }
  return index;
}

TEST(CommonWordsTest, AWordInHalfOfTheTitlesIsNotRequired) {
  MemoryIndex index = Stations("enu", "Station", 5, 4);
  index.Add("photos", "Photos");
  EXPECT_EQ(index.Find("photos station"), Strings{"photos"});
  EXPECT_EQ(index.Find("station photos"), Strings{"photos"});
  EXPECT_EQ(index.Find("station").size(), 5U);
}

TEST(CommonWordsTest, AWordInLessThanHalfOfTheTitlesIsRequired) {
  MemoryIndex index = Stations("enu", "Station", 5, 5);
  index.Add("photos", "Photos");
  EXPECT_EQ(index.Find("photos station"), Strings{});
  EXPECT_EQ(index.Find("station photos"), Strings{});
}

TEST(CommonWordsTest, AWordWithAccentsInHalfOfTheTitlesIsNotRequiredEither) {
  MemoryIndex index = Stations("fre", "Éditeur", 5, 4);
  index.Add("photos", "Photos");
  EXPECT_EQ(index.Find("éditeur photos"), Strings{"photos"});
  EXPECT_EQ(index.Find("editeur photos"), Strings{"photos"});
}

TEST(CommonWordsTest, InAFewDocumentsHalfOfTheTitlesSaysNothing) {
  MemoryIndex index;
  index.Add("a", "Mail Server");
  index.Add("b", "Web Server");
  index.Add("c", "Mail Client");
  EXPECT_EQ(index.Find("client server"), Strings{});
  EXPECT_EQ(index.Find("web server"), Strings{"b"});
}

}  // namespace
}  // namespace searchd
