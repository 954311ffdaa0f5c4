#include "host/searchd/analyzer.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "host/searchd/language.h"

namespace searchd {
namespace {

using Strings = std::vector<std::string>;

FieldRule Rule(AnalyzerKind kind, bool lower_case = false) {
  FieldRule rule;
  rule.analyzer = kind;
  rule.lower_case = lower_case;
  return rule;
}

std::vector<Word> WordsOf(const std::string& index, const std::string& text,
                          const FieldRule& rule = Rule(AnalyzerKind::kStandard)) {
  return Analyzer(LanguageOfIndex(index)).Words(rule, text);
}

Strings Raw(const std::vector<Word>& words) {
  Strings raw;
  for (const Word& word : words) raw.push_back(word.raw);
  return raw;
}

Strings Plain(const std::vector<Word>& words) {
  Strings plain;
  for (const Word& word : words) plain.push_back(word.plain);
  return plain;
}

TEST(LanguageTest, IsWhatTheIdEndsIn) {
  EXPECT_EQ(LanguageOfIndex("appindex_ger").locale, "de");
  EXPECT_EQ(LanguageOfIndex("my_own_ptb").locale, "pt_BR");
  EXPECT_TRUE(LanguageOfIndex("appindex_trk").turkic);
  for (const char* id : {"", "ger", "appindex_", "appindex_GER", "appindex_ger_x"}) {
    EXPECT_EQ(LanguageOfIndex(id).locale, "") << id;
  }
}

TEST(LanguageTest, EveryLanguageOfTheUserInterfaceIsKnown) {
  for (const char* code :
       {"chs", "cht", "csy", "dan", "enu", "fre", "ger", "hun", "ita", "jpn", "krn",
        "nld", "nor", "plk", "ptb", "ptg", "rus", "spn", "sve", "tha", "trk"}) {
    const Language language = LanguageOfIndex(std::string("appindex_") + code);
    EXPECT_NE(language.locale, "") << code;
    EXPECT_NO_THROW(Analyzer{language}) << code;
  }
}

TEST(AnalyzerTest, CutsWordsAndFoldsCase) {
  EXPECT_EQ(Raw(WordsOf("x_enu", "File-Station 7.2: it's ON!")),
            (Strings{"file", "station", "7.2", "it's", "on"}));
  EXPECT_EQ(Raw(WordsOf("x_enu", "")), Strings{});
  EXPECT_EQ(Raw(WordsOf("x_enu", " - \t!")), Strings{});
}

TEST(AnalyzerTest, FoldsWidthAndCompatibilityForms) {
  EXPECT_EQ(Raw(WordsOf("x_enu", "ＦＩＬＥ ﬁle")), (Strings{"file", "file"}));
  EXPECT_EQ(Raw(WordsOf("x_jpn", "ﾌｧｲﾙ")), Raw(WordsOf("x_jpn", "ファイル")));
}

TEST(AnalyzerTest, PutsTheFormWithoutAccentsBeside) {
  const std::vector<Word> words = WordsOf("x_ger", "Größe Zürich");
  EXPECT_EQ(Raw(words), (Strings{"grösse", "zürich"}));
  EXPECT_EQ(Plain(words), (Strings{"grosse", "zurich"}));
  EXPECT_EQ(Plain(WordsOf("x_plk", "łódź")), Strings{"lodz"});
  EXPECT_EQ(Plain(WordsOf("x_dan", "smørrebrød")), Strings{"smorrebrod"});
  EXPECT_EQ(Plain(WordsOf("x_rus", "ёлка")), Strings{"елка"});
}

TEST(AnalyzerTest, LeavesMarksThatAreLetters) {
  EXPECT_EQ(Plain(WordsOf("x_tha", "ไฟล์")), Raw(WordsOf("x_tha", "ไฟล์")));
  EXPECT_EQ(Plain(WordsOf("x_krn", "파일")), Strings{"파일"});
  EXPECT_EQ(Plain(WordsOf("x_jpn", "ガ")), Strings{"が"});
}

TEST(AnalyzerTest, KnowsTheTurkishLetters) {
  EXPECT_EQ(Raw(WordsOf("x_trk", "ISI İZLE")), (Strings{"ısı", "izle"}));
  EXPECT_EQ(Raw(WordsOf("x_enu", "ISI")), Strings{"isi"});
  EXPECT_EQ(Plain(WordsOf("x_trk", "ISI")), Strings{"isi"});
  EXPECT_EQ(Plain(WordsOf("x_enu", "İzle")), Strings{"izle"});
}

TEST(AnalyzerTest, FindsWordsWhereNoSpaceIs) {
  EXPECT_EQ(Raw(WordsOf("x_tha", "การจัดการไฟล์")), (Strings{"การ", "จัดการ", "ไฟล์"}));
  EXPECT_EQ(Raw(WordsOf("x_chs", "文件管理")), (Strings{"文件", "管理"}));
  EXPECT_EQ(Raw(WordsOf("x_jpn", "ファイル管理")), (Strings{"ファイル", "管理"}));
  EXPECT_EQ(Raw(WordsOf("x_tha", "กา\u200Bไฟล์")), (Strings{"กา", "ไฟล์"}));
}

TEST(AnalyzerTest, TakesKatakanaAndHiraganaAsOne) {
  EXPECT_EQ(Plain(WordsOf("x_jpn", "ファイル")), Strings{"ふぁいる"});
}

TEST(AnalyzerTest, ObeysTheAnalyzerOfTheField) {
  EXPECT_EQ(Raw(WordsOf("x_enu", "A-7 b.C", Rule(AnalyzerKind::kWhiteSpace))),
            (Strings{"A-7", "b.C"}));
  EXPECT_EQ(Raw(WordsOf("x_enu", "A-7\u3000b.C ", Rule(AnalyzerKind::kWhiteSpace, true))),
            (Strings{"a-7", "b.c"}));
  EXPECT_EQ(Raw(WordsOf("x_enu", "One Two", Rule(AnalyzerKind::kKeyword))), Strings{"One Two"});
  EXPECT_EQ(Raw(WordsOf("x_enu", "One Two", Rule(AnalyzerKind::kKeyword, true))),
            Strings{"one two"});
  EXPECT_EQ(Raw(WordsOf("x_enu", "", Rule(AnalyzerKind::kKeyword))), Strings{});
}

TEST(AnalyzerTest, ComparesWholeTexts) {
  const Analyzer analyzer(LanguageOfIndex("x_fre"));
  EXPECT_EQ(analyzer.WholeText("  Éditeur   Photo "), "editeur photo");
  EXPECT_EQ(analyzer.WholeText(""), "");
}

TEST(AnalyzerTest, SortsAsTheLanguageDoes) {
  const Analyzer swedish(LanguageOfIndex("x_sve"));
  const Analyzer german(LanguageOfIndex("x_ger"));
  EXPECT_GT(swedish.SortKey("Öl"), swedish.SortKey("Zebra"));
  EXPECT_LT(german.SortKey("Öl"), german.SortKey("Zebra"));
  EXPECT_LT(german.SortKey("apfel"), german.SortKey("Birne"));
  const std::string lengthy(1000, 'x');
  EXPECT_LT(german.SortKey(lengthy + "a"), german.SortKey(lengthy + "b"));
}

TEST(GramsTest, AreThePartsOfAWord) {
  EXPECT_EQ(IndexGrams("bits"), (Strings{"bi", "bit", "it", "its", "ts"}));
  EXPECT_EQ(IndexGrams("文件"), (Strings{"文", "文件", "件"}));
  EXPECT_EQ(IndexGrams(""), Strings{});
}

TEST(GramsTest, OfAQueryAreAmongThoseOfAWord) {
  const Strings indexed = IndexGrams("bittorrent");
  for (const char* part : {"bi", "tor", "torrent", "bittorrent", "nt"}) {
    for (const std::string& gram : QueryGrams(part)) {
      EXPECT_EQ(std::count(indexed.begin(), indexed.end(), gram) > 0, true) << gram;
    }
  }
  EXPECT_EQ(QueryGrams("torr"), (Strings{"tor", "orr"}));
}

TEST(SplitWhiteSpaceTest, KnowsEveryKindOfSpace) {
  EXPECT_EQ(SplitWhiteSpace(" a\tb\u3000c\u00A0d\n"), (Strings{"a", "b", "c", "d"}));
  EXPECT_EQ(SplitWhiteSpace(" \n"), Strings{});
}

}  // namespace
}  // namespace searchd
