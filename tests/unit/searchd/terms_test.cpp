#include "host/searchd/terms.h"

#include <gtest/gtest.h>

#include <string>

namespace searchd {
namespace {

constexpr std::size_t kMaxTermBytes = 245;

TEST(TermsTest, AreDifferentForDifferentMembers) {
  EXPECT_NE(WordTerm(FieldPrefix("a"), "bc"), WordTerm(FieldPrefix("ab"), "c"));
  EXPECT_NE(WordTerm(UnnamedFieldsPrefix(), "abc"), WordTerm(FieldPrefix("a"), "bc"));
  EXPECT_NE(KeyTerm("abc"), WholeTitleTerm("abc"));
}

TEST(TermsTest, FitHoweverLongTheWord) {
  const std::string prefix = FieldPrefix(std::string(64, 'n'));
  for (const std::size_t size : {160U, 161U, 300U, 100000U}) {
    const std::string word(size, 'w');
    EXPECT_LE(WordTerm(prefix, word).size(), kMaxTermBytes);
    EXPECT_LE(KeyTerm(word).size(), kMaxTermBytes);
    EXPECT_LE(WholeTitleTerm(word).size(), kMaxTermBytes);
  }
}

TEST(TermsTest, TellLongWordsApart) {
  const std::string beginning(500, 'w');
  EXPECT_NE(KeyTerm(beginning + "1"), KeyTerm(beginning + "2"));
  EXPECT_EQ(KeyTerm(beginning), KeyTerm(beginning));
  EXPECT_NE(KeyTerm(beginning), KeyTerm(beginning + "w"));
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
  const std::string term = WholeTitleTerm(word);
  EXPECT_EQ((term.size() - 1) % 3, 0U);
}

}  // namespace
}  // namespace searchd
