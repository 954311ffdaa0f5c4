// Emphasis of what was searched for.
#include "tool/emphasis.h"

#include <gtest/gtest.h>

#include <string>

namespace tool {
namespace {

// With brackets in place of the control sequences.
std::string Marked(const std::string& text, const std::string& query) {
  std::string marked = Emphasised(text, query);
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

TEST(Emphasised, WordsThatOverlapAreMarkedOnce) {
  EXPECT_EQ(Marked("Photos", "photo photos"), "[Photo]s");
}

}  // namespace
}  // namespace tool
