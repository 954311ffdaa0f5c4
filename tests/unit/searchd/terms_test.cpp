#include "host/searchd/terms.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace searchd {
namespace {

constexpr std::size_t kMaxTermBytes = 245;

std::string WordIn(const std::string& member, const std::string& word) {
  return WordTerm(FieldPrefix(member, Space::kWords), word);
}

TEST(TermsTest, AreDifferentForDifferentMembers) {
  EXPECT_NE(WordIn("a", "bc"), WordIn("ab", "c"));
  EXPECT_NE(WordIn("", "abc"), WordIn("a", "bc"));
  EXPECT_NE(KeyTerm("abc"), WordTerm(kTitlePrefix, "abc"));
}

// Otherwise the beginnings of words of one kind would be looked for among those of another.
TEST(TermsTest, OfDifferentKindsNeverBeginAlike) {
  std::vector<std::string> prefixes = {
      KeyTerm(""),         kApplicationTerm,      kTitlePrefix,
      kPlainTitlePrefix,   kBareTitlePrefix,      kSkeletonPrefix,
      kNamePrefix,         kTitleBeginningPrefix, kPlainTitleBeginningPrefix,
      kNameBeginningPrefix};
  for (const char* member : {"", "a", "aw", "title", "search_title"}) {
    for (const Space space : kSpaces) prefixes.push_back(FieldPrefix(member, space));
  }
  for (const std::string& one : prefixes) {
    for (const std::string& other : prefixes) {
      if (&one == &other) continue;
      EXPECT_NE(other.compare(0, one.size(), one), 0) << one << " " << other;
    }
  }
}

TEST(TermsTest, FitHoweverLongTheWord) {
  for (const Space space : kSpaces) {
    const std::string prefix = FieldPrefix(std::string(64, 'n'), space);
    for (const std::size_t size : {160U, 161U, 300U, 100000U}) {
      const std::string word(size, 'w');
      EXPECT_LE(WordTerm(prefix, word).size(), kMaxTermBytes);
      EXPECT_LE(WordTerm(prefix, Pair(word, word)).size(), kMaxTermBytes);
      EXPECT_LE(WordTermBeginning(prefix, word).size(), kMaxTermBytes);
      EXPECT_LE(KeyTerm(word).size(), kMaxTermBytes);
    }
  }
}

TEST(TermsTest, TellLongWordsApart) {
  const std::string beginning(500, 'w');
  EXPECT_NE(KeyTerm(beginning + "1"), KeyTerm(beginning + "2"));
  EXPECT_EQ(KeyTerm(beginning), KeyTerm(beginning));
  EXPECT_NE(KeyTerm(beginning), KeyTerm(beginning + "w"));
}

TEST(TermsTest, TellPairsApart) {
  EXPECT_NE(Pair("a", "bc"), Pair("ab", "c"));
  EXPECT_NE(Pair("a", "b"), Pair("b", "a"));
}

TEST(TermsTest, OfAWordBeginAsItsBeginningDoes) {
  for (const std::size_t size : {1U, 100U, 128U, 129U, 160U, 161U, 500U}) {
    const std::string word = std::string(size, 'w') + "end";
    for (const std::size_t typed : {std::size_t{1}, size / 2, size, size + 1}) {
      const std::string beginning = WordTermBeginning("P", word.substr(0, typed));
      EXPECT_EQ(WordTerm("P", word).compare(0, beginning.size(), beginning), 0)
          << size << " " << typed;
    }
  }
}

TEST(TermsTest, AreCutBetweenCharacters) {
  std::string word;
  while (word.size() < 300) word += "文";
  const std::string term = WordTerm(kTitlePrefix, word);
  EXPECT_EQ((term.size() - 1 - 32) % 3, 0U);
  EXPECT_EQ((WordTermBeginning(kTitlePrefix, word).size() - 1) % 3, 0U);
}

}  // namespace
}  // namespace searchd
