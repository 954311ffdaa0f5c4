// Whatever the language and however it is written, what a person types finds what is meant.
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

void ExpectFound(const std::vector<Case>& cases) {
  for (const Case& one : cases) {
    MemoryIndex index(one.language);
    index.Add("it", one.title);
    index.Add("other", "Qwxyz");
    for (const std::string& query : one.queries) {
      EXPECT_EQ(index.Find(query), Strings{"it"}) << one.language << " " << query;
      EXPECT_NE(index.MatchedBy(query), "fuzzy") << one.language << " " << query;
    }
  }
}

TEST(LanguagesTest, CaseDoesNotMatter) {
  ExpectFound(
      {{"enu", "Backup Center", {"BACKUP", "backup", "cEnTeR", "BACKUP CENTER"}},
       {"rus", "Журнал событий", {"ЖУРНАЛ", "журнал СОБЫТИЙ"}},
       {"ger",
        "Straßenkarte",
        {"STRASSENKARTE", "strassenkarte", "straßenkarte", "STRAẞENKARTE", "Strass", "Straß"}},
       {"none", "ΦΩΤΟΓΡΑΦΊΕΣ", {"φωτογραφίες", "φωτογραφιες"}}});
}

TEST(LanguagesTest, TurkishLettersAreFoundInAnyCaseAndWithoutTheirDots) {
  ExpectFound({{"trk",
                "Işık İstasyonu",
                {"ışık", "IŞIK", "isik", "ISIK", "istasyon", "İSTASYON", "ISTASYON", "İstasyonu"}},
               {"trk", "WIFI AYARI", {"wifi", "WİFİ", "wıfı", "ayarı", "ayari"}},
               {"enu", "ISI Tool", {"isi", "ISI", "İSİ"}}});
}

TEST(LanguagesTest, AccentsMayBeLeftOutOrAdded) {
  ExpectFound({{"fre", "Éditeur de façades", {"editeur", "facade", "ÉDITEUR", "édit", "edit"}},
               {"spn", "Configuración", {"configuracion", "configuracio"}},
               {"csy", "Správa souborů", {"sprava", "souboru", "sprava soub"}},
               {"plk", "Łódź zdjęcia", {"lodz", "zdjecia", "łodz"}},
               {"hun", "Biztonsági mentés", {"biztonsagi", "mentes"}},
               {"dan", "Smørrebrød", {"smorrebrod", "smørre"}},
               {"sve", "Säkerhetskopia", {"sakerhetskopia", "sakerhet"}},
               {"ger", "Übersicht", {"ubersicht", "uber"}},
               {"enu", "Cafe Manager", {"café", "CAFÉ"}},
               {"rus", "Учёт", {"учет", "учёт"}}});
}

TEST(LanguagesTest, ThaiWordsAreFoundWithoutSpaces) {
  ExpectFound(
      {{"tha", "ตัวจัดการไฟล์", {"ต", "ตัว", "ตัวจัดก", "ไฟล์", "จัดการ", "จัดการไฟล์", "การไฟล์", "ไฟล"}},
       {"tha", "ศูนย์สำรองข้อมูล", {"สำรอง", "ข้อมูล", "สำรองข้อมูล", "ศูนย์", "รองข้อ"}}});
}

TEST(LanguagesTest, ChineseWordsAreFoundWithoutSpaces) {
  ExpectFound({{"chs", "文件管理器", {"文", "文件", "管理", "件管", "管理器", "文件 管理"}},
               {"cht", "備份與還原", {"備份", "還原", "與還", "備份 還原"}},
               {"chs", "NAS 照片2024", {"nas", "照片", "nas照片", "2024", "照片2024"}}});
}

TEST(LanguagesTest, JapaneseIsFoundInAnyKanaAndWidth) {
  ExpectFound(
      {{"jpn",
        "ファイル管理",
        {"フ", "ファイ", "ふぁいる", "ﾌｧｲﾙ", "管理", "ふぁいる管理", "ル管", "イル"}},
       {"jpn", "ガイド", {"がいど", "ｶﾞｲﾄﾞ", "ガイ"}},
       {"jpn", "Ｐｈｏｔｏ アルバム", {"photo", "ＰＨＯＴＯ", "アルバム", "ｱﾙﾊﾞﾑ", "あるばむ"}}});
}

TEST(LanguagesTest, KoreanWordsAreFoundWithTheirEndings) {
  ExpectFound({{"krn", "사진 관리자", {"사진", "사", "관리", "관리자", "사진관리자", "진 관"}},
               {"krn", "사진을 관리", {"사진", "사진을"}},
               {"krn", "데이터베이스", {"데이터", "베이스"}}});
}

// Pairs of characters that stand here and there make no word.
TEST(LanguagesTest, WordsOfAnotherTextAreNotPutTogetherFromItsCharacters) {
  MemoryIndex japanese("jpn");
  japanese.Add("it", "メール");
  japanese.Add("other", "イメージ", "イメージ",
               "インストールイメージやディスクイメージを管理します");
  EXPECT_EQ(japanese.Find("メール"), Strings{"it"});
  MemoryIndex thai("tha");
  thai.Add("it", "ตาราง");
  thai.Add("other", "กข", "กข", "ตามเวลาและราคาของทางร้าน");
  EXPECT_EQ(thai.Find("ตาราง"), Strings{"it"});
}

TEST(LanguagesTest, AnApostropheMayBeTypedAsTheKeyboardHasIt) {
  ExpectFound({{"enu", "Anna’s Notes", {"anna's", "anna’s", "Anna's Notes"}},
               {"enu", "Anna's Notes", {"anna’s", "anna's"}},
               {"fre", "Éditeur d’images", {"d'images", "editeur d'im"}}});
}

TEST(LanguagesTest, AWordWithTheApostropheThatWasTypedComesFirst) {
  MemoryIndex french("fre");
  french.Add("a", "Albums");
  french.Add("b", "Partage d'albums");
  EXPECT_EQ(french.Find("d'albums"), (Strings{"b", "a"}));
  EXPECT_EQ(french.Find("albums"), (Strings{"a", "b"}));
}

TEST(LanguagesTest, WordsBehindAnApostropheAreWords) {
  MemoryIndex french("fre");
  french.Add("title", "Album");
  french.Add("desc", "Un", "un", "Ouvre l'album et d’autres");
  EXPECT_EQ(french.Find("album"), (Strings{"title", "desc"}));
  MemoryIndex italian("ita");
  italian.Add("title", "Archivio");
  italian.Add("desc", "Uno", "uno", "Apre l'archivio");
  EXPECT_EQ(italian.Find("archivio"), (Strings{"title", "desc"}));
}

TEST(LanguagesTest, DecomposedTextIsTheSameAsComposed) {
  ExpectFound({{"krn", "사진", {"\u1109\u1161\u110C\u1175\u11AB"}},
               {"fre", "E\u0301diteur", {"éditeur", "editeur"}},
               {"fre", "Éditeur", {"e\u0301diteur"}},
               {"jpn", "ガイド", {"カ\u3099イト\u3099"}}});
}

TEST(LanguagesTest, EnglishIsFoundInEveryLanguage) {
  for (const char* language :
       {"chs", "cht", "csy", "dan", "enu", "fre", "ger", "hun", "ita", "jpn", "krn",
        "nld", "nor", "plk", "ptb", "ptg", "rus", "spn", "sve", "tha", "trk", "none"}) {
    MemoryIndex index(language);
    index.Add("it", "Qwxyz", "File Station FILE INDEXING");
    for (const char* query : {"file", "FILE", "File Station", "indexing", "INDEXING", "sta"}) {
      EXPECT_EQ(index.Find(query), Strings{"it"}) << language << " " << query;
    }
  }
}

TEST(LanguagesTest, InflectedWordsAreFoundInEitherForm) {
  ExpectFound({{"enu", "Photo Libraries", {"photos", "library"}},
               {"ger", "Sicherungen", {"Sicherung"}},
               {"ger", "Sicherung", {"Sicherungen"}},
               {"rus", "Файлы", {"файл"}},
               {"rus", "Файл", {"файлы"}},
               {"hun", "Fájl", {"fájlok", "fajlok"}},
               {"spn", "Canción", {"canciones"}},
               {"tha", "Photo", {"photos"}},
               {"jpn", "Photos", {"photo"}}});
}

TEST(LanguagesTest, APartOfAnyWordIsFound) {
  ExpectFound({{"enu", "BitTorrent", {"torrent", "orren", "ttor"}},
               {"ger", "Datensicherungsverwaltung", {"sicherung", "verwaltung", "sicherungsverw"}},
               {"fre", "Télééditeur", {"éditeur", "editeur"}},
               {"rus", "Фоторедактор", {"редактор", "РЕДАКТ"}}});
}

TEST(LanguagesTest, AnUnknownLanguageFindsWordsAndTheirBeginnings) {
  ExpectFound({{"xyz", "Photo Album 文件 ไฟล์", {"photo", "alb", "文件", "ไฟล์", "album photo"}}});
  MemoryIndex index("xyz");
  index.Add("it", "Qwxyz", "", "many photos");
  EXPECT_EQ(index.Find("photo"), Strings{"it"});
  EXPECT_EQ(index.MatchedBy("photo"), "prefix") << "no language has no stems";
}

}  // namespace
}  // namespace searchd
