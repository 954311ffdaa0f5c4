// While a word is being typed, what the whole of it finds stays found.
#include <gtest/gtest.h>

#include <array>
#include <string>
#include <utility>
#include <vector>

#include "tests/unit/searchd/memory_index.h"

namespace searchd {
namespace {

void ExpectFoundByEveryBeginning(MemoryIndex& index, const std::string& id,
                                 const std::string& text) {
  for (const std::string& typed : WhileTyping(text)) {
    EXPECT_TRUE(index.Finds(typed, id)) << '"' << typed << "\" of \"" << text << '"';
  }
}

TEST(TypingTest, EveryBeginningOfATitleFindsIt) {
  for (const auto& [language, title] :
       std::vector<std::pair<std::string, std::string>>{{"enu", "Settings"},
                                                        {"ger", "Fotografien ordnen"},
                                                        {"rus", "Резервное копирование"},
                                                        {"fre", "Éditeur d'étiquettes"},
                                                        {"tha", "การสำรองข้อมูลและการกู้คืน"},
                                                        {"chs", "文件管理与备份"},
                                                        {"cht", "檔案總管與備份"},
                                                        {"jpn", "データベース管理システム"},
                                                        {"krn", "사진 관리 프로그램"},
                                                        {"trk", "Işık İstasyonu Yöneticisi"},
                                                        {"csy", "Správa souborů a záloh"},
                                                        {"nld", "Foto's en video's"},
                                                        {"enu", "Wi-Fi & C++ 7.2 Tools"}}) {
    MemoryIndex index(language);
    index.Add("it", title);
    index.Add("other", "Qwxyz");
    ExpectFoundByEveryBeginning(index, "it", title);
  }
}

TEST(TypingTest, EveryBeginningOfAKeywordAndOfADescriptionFindsIt) {
  for (const auto& [language, text] :
       std::vector<std::pair<std::string, std::string>>{{"enu", "settings"},
                                                        {"ger", "Fotografien"},
                                                        {"rus", "резервное копирование"},
                                                        {"tha", "สำรองข้อมูล"},
                                                        {"chs", "备份"},
                                                        {"jpn", "バックアップ"},
                                                        {"krn", "데이터베이스"}}) {
    MemoryIndex index(language);
    index.Add("keyword", "One", "one " + text);
    index.Add("desc", "Two", "", "does " + text + " and more");
    ExpectFoundByEveryBeginning(index, "keyword", text);
    ExpectFoundByEveryBeginning(index, "desc", text);
  }
}

TEST(TypingTest, AnotherFormOfTheWordStaysFound) {
  for (const auto& [language, title, typed] :
       std::vector<std::array<std::string, 3>>{{"enu", "Photo", "photos"},
                                               {"enu", "Setting", "settings"},
                                               {"enu", "Activity", "activities"},
                                               {"enu", "Library", "libraries"},
                                               {"ger", "Fotografie", "Fotografien"},
                                               {"ger", "Sicherung", "Sicherungen"},
                                               {"rus", "Файл", "файлы"},
                                               {"rus", "Фотография", "фотографии"},
                                               {"hun", "Fájl", "fájlok"},
                                               {"spn", "Canción", "canciones"},
                                               {"trk", "Dosya", "dosyalar"}}) {
    MemoryIndex index(language);
    index.Add("it", title);
    index.Add("other", "Qwxyz");
    ExpectFoundByEveryBeginning(index, "it", typed);
  }
}

TEST(TypingTest, AnotherFormStaysFoundBesideTheWordItself) {
  MemoryIndex index;
  index.Add("it", "Activity");
  index.Add("itself", "Activities Log");
  ExpectFoundByEveryBeginning(index, "it", "activities");
  ExpectFoundByEveryBeginning(index, "itself", "activities");
}

TEST(TypingTest, AWordThatGoesOnIsNoFormOfTheWordThatItBeginsWith) {
  MemoryIndex index;
  index.Add("1", "Data Sync", "data sync");
  index.Add("2", "Note Station", "note station");
  index.Add("3", "Mail Server", "mail server");
  index.Add("4", "Home", "home");
  for (const char* typed : {"database", "databas", "notebook", "noteboo", "mailbox", "homepage"}) {
    EXPECT_EQ(index.Find(typed), Strings{}) << typed;
  }
}

TEST(TypingTest, AWordThatSaysLittleRemovesNothingWhileItIsBeingTyped) {
  MemoryIndex index;
  index.Add("it", "Photos");
  index.Add("other", "Qwxyz");
  ExpectFoundByEveryBeginning(index, "it", "photos settings");
  ExpectFoundByEveryBeginning(index, "it", "photos app");
}

TEST(TypingTest, ATextWithoutTheAccentsStaysFound) {
  MemoryIndex index("fre");
  index.Add("it", "Éditeur de façades");
  ExpectFoundByEveryBeginning(index, "it", "editeur de facades");
  ExpectFoundByEveryBeginning(index, "it", "facades editeur");
}

TEST(TypingTest, ASpaceBehindAWordKeepsIt) {
  MemoryIndex index;
  index.Add("it", "File Station");
  for (const char* typed : {"file ", "file station ", " file", "station  ", "file\u3000"}) {
    EXPECT_EQ(index.Find(typed), Strings{"it"}) << '"' << typed << '"';
  }
}

TEST(TypingTest, AJoinedNameStaysFound) {
  MemoryIndex index;
  index.Add("it", "Libre Office");
  index.Add("other", "Bit Torrent");
  ExpectFoundByEveryBeginning(index, "it", "libreoffice");
  MemoryIndex joined;
  joined.Add("it", "LibreOffice");
  joined.Add("other", "BitTorrent");
  ExpectFoundByEveryBeginning(joined, "it", "libre office");
}

}  // namespace
}  // namespace searchd
