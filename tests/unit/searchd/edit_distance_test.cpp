#include "host/searchd/edit_distance.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <string>
#include <vector>

namespace searchd {
namespace {

using Word = std::u32string;

std::string ToText(const Word& word) { return {word.begin(), word.end()}; }

// How many slips make `b` of `a`, by the table of all their beginnings.
std::size_t Distance(const Word& a, const Word& b) {
  std::array<std::array<std::size_t, 8>, 8> table{};
  for (std::size_t i = 0; i <= a.size(); ++i) {
    for (std::size_t j = 0; j <= b.size(); ++j) {
      if (i == 0 || j == 0) {
        table[i][j] = i + j;
        continue;
      }
      const std::size_t other = a[i - 1] == b[j - 1] ? 0 : 1;
      table[i][j] =
          std::min({table[i - 1][j] + 1, table[i][j - 1] + 1, table[i - 1][j - 1] + other});
      if (i > 1 && j > 1 && a[i - 1] == b[j - 2] && a[i - 2] == b[j - 1]) {
        table[i][j] = std::min(table[i][j], table[i - 2][j - 2] + 1);
      }
    }
  }
  return table[a.size()][b.size()];
}

// All words of the letters a and b that have one to four of them.
std::vector<Word> ShortWords() {
  std::vector<Word> words = {U"a", U"b"};
  for (std::size_t i = 0; words[i].size() < 4; ++i) {
    for (const char32_t letter : {U'a', U'b'}) words.push_back(words[i] + letter);
  }
  return words;
}

bool SomeBeginningIsNear(const Word& text, const Word& typed) {
  for (std::size_t size = 0; size <= text.size(); ++size) {
    if (Distance(text.substr(0, size), typed) <= 1) return true;
  }
  return false;
}

bool SomePartIsNear(const Word& text, const Word& typed) {
  for (std::size_t start = 0; start < text.size(); ++start) {
    if (SomeBeginningIsNear(text.substr(start), typed)) return true;
  }
  return false;
}

TEST(EditDistanceTest, IsWhatTheTableSaysForAllShortWords) {
  const std::vector<Word> words = ShortWords();
  ASSERT_EQ(words.size(), 2U + 4U + 8U + 16U);
  for (const Word& a : words) {
    for (const Word& b : words) {
      EXPECT_EQ(IsWithinOneEdit(a, b), Distance(a, b) <= 1) << ToText(a) << " " << ToText(b);
      EXPECT_EQ(BeginsWithinOneEdit(a, b), SomeBeginningIsNear(a, b))
          << ToText(a) << " typed " << ToText(b);
      EXPECT_EQ(ContainsWithinOneEdit(a, b), SomePartIsNear(a, b))
          << ToText(a) << " typed " << ToText(b);
      EXPECT_TRUE(MayContainWithinOneEdit(a, b) ||
                  (Distance(a, b) > 1 && !SomeBeginningIsNear(a, b) && !SomePartIsNear(a, b)))
          << ToText(a) << " typed " << ToText(b);
    }
  }
}

TEST(EditDistanceTest, WhatHoldsNeitherHalfMayNotContainIt) {
  EXPECT_FALSE(MayContainWithinOneEdit(U"mailserver", U"camera"));
}

TEST(EditDistanceTest, OneSlipAnywhereIsNear) {
  for (const Word& typed : {Word(U"xamera"), Word(U"camxra"), Word(U"camerx"),     // another letter
                            Word(U"amera"), Word(U"camra"), Word(U"camer"),        // one too few
                            Word(U"xcamera"), Word(U"camxera"), Word(U"camerax"),  // one too many
                            Word(U"acmera"), Word(U"caemra"), Word(U"camear")}) {  // two swapped
    EXPECT_TRUE(IsWithinOneEdit(U"camera", typed)) << ToText(typed);
    EXPECT_TRUE(IsWithinOneEdit(typed, U"camera")) << ToText(typed);
    EXPECT_TRUE(BeginsWithinOneEdit(U"camerastation", typed)) << ToText(typed);
    EXPECT_TRUE(ContainsWithinOneEdit(U"mycamerastation", typed)) << ToText(typed);
  }
}

TEST(EditDistanceTest, TwoSlipsAreTooMany) {
  for (const Word& typed : {Word(U"xamerx"), Word(U"mera"), Word(U"caxxmera"), Word(U"acmear"),
                            Word(U"camxrx"), Word(U"cmaare"), Word(U"acxera")}) {
    EXPECT_FALSE(IsWithinOneEdit(U"camera", typed)) << ToText(typed);
  }
  for (const Word& typed : {Word(U"xaxera"), Word(U"acmear"), Word(U"acamrea"), Word(U"acxera")}) {
    EXPECT_FALSE(BeginsWithinOneEdit(U"camerastation", typed)) << ToText(typed);
    EXPECT_FALSE(ContainsWithinOneEdit(U"mycamerastation", typed)) << ToText(typed);
  }
}

TEST(EditDistanceTest, WordsWithoutLettersAreNearToOneLetter) {
  EXPECT_TRUE(IsWithinOneEdit(U"", U""));
  EXPECT_TRUE(IsWithinOneEdit(U"", U"a"));
  EXPECT_FALSE(IsWithinOneEdit(U"", U"ab"));
  EXPECT_TRUE(BeginsWithinOneEdit(U"abc", U""));
}

}  // namespace
}  // namespace searchd
