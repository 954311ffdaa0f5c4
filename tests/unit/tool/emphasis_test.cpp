// Emphasis of what was searched for.
#include "tool/emphasis.h"

#include <gtest/gtest.h>

#include <string>

namespace tool {
namespace {

// With brackets in place of the control sequences.
std::string Marked(const std::string& text, const std::string& query,
                   Likeness likeness = Likeness::kSame) {
  std::string marked = Emphasised(text, {{query, likeness}});
  for (const auto& [sequence, mark] : {std::pair<std::string, std::string>("\033[1m", "["),
                                       std::pair<std::string, std::string>("\033[0m", "]")}) {
    for (std::size_t at = 0; (at = marked.find(sequence)) != std::string::npos;) {
      marked.replace(at, sequence.size(), mark);
    }
  }
  return marked;
}

TEST(Emphasised, BeginningsOfWords) {
  EXPECT_EQ(Marked("Photo Album", "album"), "Photo [Album]");
  EXPECT_EQ(Marked("Photo Album", "pho"), "[Pho]to Album");
  EXPECT_EQ(Marked("Photo Album", "pho al"), "[Pho]to [Al]bum");
}

TEST(Emphasised, WhiteSpaceOfAnyAmountPartsTheWords) {
  EXPECT_EQ(Marked("Photo Album", "  pho \t\u3000 al "), "[Pho]to [Al]bum");
  EXPECT_EQ(Marked("Photo Album", " "), "Photo Album");
}

TEST(Emphasised, InsideWordsOnlyWhereNoneBeginsSo) {
  EXPECT_EQ(Marked("Fotoalbum", "album"), "Foto[album]");
  EXPECT_EQ(Marked("Album, Fotoalbum", "album"), "[Album], Fotoalbum");
}

TEST(Emphasised, CaseAccentsAndWidthDoNotMatter) {
  EXPECT_EQ(Marked("Réglages système", "REGLAGES"), "[Réglages] système");
  EXPECT_EQ(Marked("ＦＴＰ server", "ftp"), "[ＦＴＰ] server");
  EXPECT_EQ(Marked("バックアップ", "ばっくあっぷ"), "[バックアップ]");
}

TEST(Emphasised, ScriptsWithoutSpaces) {
  EXPECT_EQ(Marked("写真アルバム", "アルバム"), "写真[アルバム]");
  EXPECT_EQ(Marked("备份中心", "备份"), "[备份]中心");
}

TEST(Emphasised, NothingFoundLeavesTheText) {
  EXPECT_EQ(Marked("Photo Album", "mail"), "Photo Album");
  EXPECT_EQ(Marked("Photo Album", ""), "Photo Album");
  EXPECT_EQ(Marked("", "mail"), "");
}

TEST(Emphasised, OtherFormsOfAWordWhereTheyWereFound) {
  EXPECT_EQ(Marked("Photo Album", "photos"), "Photo Album");
  EXPECT_EQ(Marked("Photo Album", "photos", Likeness::kForm), "[Photo] Album");
  EXPECT_EQ(Marked("Activity Log, Active Users", "activities", Likeness::kForm),
            "[Activity] Log, Active Users");
  EXPECT_EQ(Marked("Alte Häuser", "haus", Likeness::kForm), "Alte [Häus]er") << "it is there";
  EXPECT_EQ(Marked("Altes Haus", "häuser", Likeness::kForm), "Altes [Haus]");
  EXPECT_EQ(Marked("Mail Server", "photos", Likeness::kForm), "Mail Server");
  EXPECT_EQ(Marked("Photography", "phosphor", Likeness::kForm), "Photography")
      << "less than half of the word";
}

TEST(Emphasised, WordsThatAreMeantBySlips) {
  EXPECT_EQ(Marked("Photo Album", "phtoo"), "Photo Album");
  EXPECT_EQ(Marked("Photo Album", "phtoo", Likeness::kSlip), "[Photo] Album");
  EXPECT_EQ(Marked("Réglages système", "sisteme", Likeness::kSlip), "Réglages [système]");
  EXPECT_EQ(Marked("Photo Album", "calendar", Likeness::kSlip), "Photo Album");
}

TEST(Emphasised, WordsThatOverlapAreMarkedOnce) {
  EXPECT_EQ(Marked("Photos", "photo photos"), "[Photo]s");
}

}  // namespace
}  // namespace tool
