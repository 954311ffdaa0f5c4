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

Strings Bare(const std::vector<Word>& words) {
  Strings bare;
  for (const Word& word : words) bare.push_back(word.bare);
  return bare;
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

// Letters that consist of no other one and a mark.
TEST(AnalyzerTest, PutsWhatPeopleTypeForForeignLettersBeside) {
  EXPECT_EQ(
      Plain(WordsOf("x_enu", "ægir óðinn þór øre łódź cœur đak ħal ŧak ılık")),
      (Strings{"aegir", "odinn", "thor", "ore", "lodz", "coeur", "dak", "hal", "tak", "ilik"}));
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
  const Word whole = analyzer.WholeText("  Éditeur   Photo ");
  EXPECT_EQ(whole.raw, "éditeur photo");
  EXPECT_EQ(whole.plain, "editeur photo");
  EXPECT_EQ(whole.bare, "editeur photo");
  EXPECT_EQ(analyzer.WholeText("").raw, "");
}

TEST(AnalyzerTest, SortsAsTheLanguageDoes) {
  Analyzer swedish(LanguageOfIndex("x_sve"));
  Analyzer german(LanguageOfIndex("x_ger"));
  EXPECT_GT(swedish.SortKey("Öl"), swedish.SortKey("Zebra"));
  EXPECT_LT(german.SortKey("Öl"), german.SortKey("Zebra"));
  EXPECT_LT(german.SortKey("apfel"), german.SortKey("Birne"));
  const std::string lengthy(1000, 'x');
  EXPECT_LT(german.SortKey(lengthy + "a"), german.SortKey(lengthy + "b"));
}

TEST(AnalyzerTest, ComparesTextsWithoutSpacesAndPunctuation) {
  const Analyzer analyzer(LanguageOfIndex("x_enu"));
  EXPECT_EQ(analyzer.Skeleton(" Libre-Office  7.2!"), "libreoffice72");
  EXPECT_EQ(analyzer.Skeleton("Fenêtre d'État"), "fenetredetat");
  EXPECT_EQ(analyzer.Skeleton("?! -"), "");
  const Analyzer thai(LanguageOfIndex("x_tha"));
  EXPECT_EQ(thai.Skeleton("ไฟล์ ดี"), thai.Skeleton("ไฟล์ดี")) << "marks are no punctuation";
  EXPECT_NE(thai.Skeleton("ดี"), thai.Skeleton("ดา"));
}

TEST(AnalyzerTest, PutsTheFormWithoutMarksBeside) {
  EXPECT_EQ(Bare(WordsOf("x_tha", "ไฟล์")), Bare(WordsOf("x_tha", "ไฟล")));
  EXPECT_EQ(Bare(WordsOf("x_jpn", "ガ")), Strings{"か"});
  EXPECT_EQ(Bare(WordsOf("x_ger", "Größe")), Strings{"grosse"});
  EXPECT_EQ(Bare(WordsOf("x_enu", "word")), Strings{"word"});
}

struct Forms {
  const char* index;
  const char* one;
  const char* other;
};

// Whether two words have a stem in common.
bool AreOfOneStem(const Forms& forms) {
  const Analyzer analyzer(LanguageOfIndex(forms.index));
  const Strings stems = analyzer.Stems(analyzer.WholeText(forms.one));
  const Strings others = analyzer.Stems(analyzer.WholeText(forms.other));
  return std::find_first_of(stems.begin(), stems.end(), others.begin(), others.end()) !=
         stems.end();
}

TEST(StemTest, JoinsTheFormsOfAWordInEveryLanguageThatHasAStemmer) {
  for (const Forms& forms : std::vector<Forms>{{"x_dan", "billeder", "billede"},
                                               {"x_enu", "photos", "photo"},
                                               {"x_fre", "sauvegardes", "sauvegarde"},
                                               {"x_ger", "Sicherungen", "Sicherung"},
                                               {"x_hun", "fájlok", "fájl"},
                                               {"x_ita", "immagini", "immagine"},
                                               {"x_nld", "bestanden", "bestand"},
                                               {"x_nor", "filer", "fil"},
                                               {"x_ptb", "arquivos", "arquivo"},
                                               {"x_ptg", "ficheiros", "ficheiro"},
                                               {"x_rus", "файлы", "файл"},
                                               {"x_spn", "archivos", "archivo"},
                                               {"x_sve", "bilder", "bild"},
                                               {"x_trk", "dosyalar", "dosya"}}) {
    EXPECT_TRUE(AreOfOneStem(forms)) << forms.one;
    EXPECT_FALSE(AreOfOneStem({forms.index, forms.one, "qwertz"})) << forms.one;
  }
}

TEST(StemTest, JoinsFormsTypedWithoutAccents) {
  EXPECT_TRUE(AreOfOneStem({"x_hun", "fajlok", "fájlok"}));
  EXPECT_TRUE(AreOfOneStem({"x_fre", "telecharge", "télécharge"}));
  EXPECT_TRUE(AreOfOneStem({"x_spn", "canciones", "canción"}));
}

TEST(StemTest, IsNoneWithoutAStemmer) {
  for (const char* index : {"x_csy", "x_plk", "x_unknown", "x"}) {
    const Analyzer analyzer(LanguageOfIndex(index));
    EXPECT_EQ(analyzer.Stems(analyzer.WholeText("photos")), Strings{}) << index;
  }
}

TEST(BeginningsTest, HaveUpToTwoCharacters) {
  EXPECT_EQ(Beginnings("mail"), (Strings{"m", "ma"}));
  EXPECT_EQ(Beginnings("文件"), (Strings{"文", "文件"}));
  EXPECT_EQ(Beginnings(""), Strings{});
}

TEST(GramsTest, BeginWithEachCharacterOfAWord) {
  EXPECT_EQ(Grams("bits", 2, 2), (Strings{"bi", "it", "ts"}));
  EXPECT_EQ(Grams("bits", 2, 3), (Strings{"bit", "its", "ts"}));
  EXPECT_EQ(Grams("bits", 3, 8), (Strings{"bits", "its"}));
  EXPECT_EQ(Grams("文件b", 1, 2), (Strings{"文件", "件b", "b"}));
  EXPECT_EQ(Grams("文件", 3, 8), Strings{});
  EXPECT_EQ(Grams("", 1, 2), Strings{});
}

TEST(GramsTest, OneCharacterSaysSomethingInScriptsWithoutSpaces) {
  EXPECT_EQ(DenseCharacters("b文件é"), (Strings{"文", "件"}));
  EXPECT_EQ(DenseCharacters("ไฟ"), (Strings{"ไ", "ฟ"}));
  EXPECT_EQ(DenseCharacters("bits"), Strings{});
  EXPECT_EQ(DenseCharacters(""), Strings{});
}

// Whether what was typed is found by n-grams of a word of two characters to `most`.
bool IsFoundByGrams(const std::string& part, const std::string& word, std::size_t most) {
  const Strings indexed = Grams(word, 2, most);
  const Strings typed = QueryGrams(part, most);
  return !typed.empty() && std::all_of(typed.begin(), typed.end(), [&](const std::string& gram) {
    const bool beginning = CountCharacters(gram) < most;
    return std::any_of(indexed.begin(), indexed.end(), [&](const std::string& other) {
      return other == gram || (beginning && other.compare(0, gram.size(), gram) == 0);
    });
  });
}

TEST(GramsTest, OfAQueryAreAmongThoseOfEveryWordWithThePart) {
  for (const std::string& word :
       Strings{"bittorrent", "datensicherungsverwaltung", "文件管理器", "การจัดการไฟล์",
               "ファイル管理システム", "사진관리프로그램", "резервноекопирование", "文b件"}) {
    for (std::size_t begin = 0; begin < word.size(); ++begin) {
      if ((word[begin] & 0xC0) == 0x80) continue;
      for (std::size_t end = begin + 1; end <= word.size(); ++end) {
        if (end < word.size() && (word[end] & 0xC0) == 0x80) continue;
        const std::string part = word.substr(begin, end - begin);
        if (CountCharacters(part) < 2) continue;
        for (const std::size_t most : {2U, 3U, 8U}) {
          EXPECT_TRUE(IsFoundByGrams(part, word, most)) << part << " in " << word << " " << most;
        }
      }
    }
  }
}

TEST(GramsTest, OfAQueryAreNotThoseOfOtherWords) {
  for (const char* part : {"bt", "zz", "torz", "xbit", "torrents", "tt torr", "torbit"}) {
    for (const std::size_t most : {2U, 3U, 8U}) {
      EXPECT_FALSE(IsFoundByGrams(part, "bittorrent", most)) << part << " " << most;
    }
  }
  EXPECT_FALSE(IsFoundByGrams("torent", "bittorrent", 3));
}

TEST(BehindApostropheTest, IsTheWordThatAShortOneIsJoinedTo) {
  EXPECT_EQ(BehindApostrophe("l'album"), "album");
  EXPECT_EQ(BehindApostrophe("dell'archivio"), "archivio");
  EXPECT_EQ(BehindApostrophe("anna's"), "");
  EXPECT_EQ(BehindApostrophe("album"), "");
  EXPECT_EQ(BehindApostrophe("'"), "");
  EXPECT_EQ(BehindApostrophe(""), "");
}

TEST(CountCharactersTest, CountsCharactersNotBytes) {
  EXPECT_EQ(CountCharacters(""), 0U);
  EXPECT_EQ(CountCharacters("aé文📷"), 4U);
}

TEST(DenseRunsTest, AreWhatStandsInScriptsWithoutSpaces) {
  EXPECT_EQ(DenseRuns("nas文件 管理2"), (Strings{"文件", "管理"}));
  EXPECT_EQ(DenseRuns("ไฟล์dsm"), Strings{"ไฟล์"}) << "with their marks";
  EXPECT_EQ(DenseRuns("사진 앨범"), (Strings{"사진", "앨범"}));
  EXPECT_EQ(DenseRuns("データ"), Strings{"データ"}) << "with the sign for a long vowel";
  EXPECT_EQ(DenseRuns("plain журнал é"), Strings{});
  EXPECT_EQ(DenseRuns(""), Strings{});
}

TEST(SplitWhiteSpaceTest, KnowsEveryKindOfSpace) {
  EXPECT_EQ(SplitWhiteSpace(" a\tb\u3000c\u00A0d\n"), (Strings{"a", "b", "c", "d"}));
  EXPECT_EQ(SplitWhiteSpace(" \n"), Strings{});
}

}  // namespace
}  // namespace searchd
