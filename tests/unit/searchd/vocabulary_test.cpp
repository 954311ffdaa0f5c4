#include "host/searchd/vocabulary.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <set>
#include <string>

#include "tests/unit/searchd/memory_index.h"

namespace searchd {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class VocabularyTest : public testing::Test {
 protected:
  static Vocabulary::Wanted Beginning(const std::u32string& letters) {
    return {letters, false, [&letters](const std::u32string& text) {
              return text.compare(0, letters.size(), letters) == 0 ? 1.0 : 0.0;
            }};
  }

  static Strings Terms(const std::vector<Vocabulary::Found>& found) {
    Strings terms;
    for (const Vocabulary::Found& text : found) terms.push_back(text.term);
    return terms;
  }

  static std::set<std::string> TermsOf(const std::string& title) {
    MemoryIndex index;
    index.Add("new", title);
    std::set<std::string> terms;
    AddWordsAndTitles(terms, index.Database().get_document(1));
    return terms;
  }

  // The field of titles is the one whose words these are.
  std::size_t Titles() const {
    for (std::size_t i = 0; i < fields_.size(); ++i) {
      if (fields_[i].role == Role::kTitle) return i;
    }
    throw std::logic_error("no titles");
  }

  Strings Words(const Vocabulary& vocabulary, const std::u32string& beginning) const {
    Strings words;
    const std::string prefix = FieldPrefix("title", Space::kWords);
    for (const std::string& term : Terms(vocabulary.FindWords(Titles(), Beginning(beginning)))) {
      EXPECT_EQ(term.compare(0, prefix.size(), prefix), 0);
      words.push_back(term.substr(prefix.size()));
    }
    return words;
  }

  MemoryIndex index_;
  std::vector<Field> fields_ = SearchedFields(index_.GetMapping());
};

TEST_F(VocabularyTest, HoldsWordsAndTitlesOfTheDatabase) {
  index_.Add("a", "Photo Station");
  const Vocabulary vocabulary(index_.Database(), fields_);
  EXPECT_THAT(Words(vocabulary, U"ph"), ElementsAre("photo"));
  EXPECT_THAT(Terms(vocabulary.FindTitles(Beginning(U"photos"))), ElementsAre("~photostation"));
}

TEST_F(VocabularyTest, LearnsWhatIsNew) {
  for (const char* title : {"Photo Station", "Mail Server", "Text Editor"}) {
    index_.Add(title, title);
  }
  Vocabulary vocabulary(index_.Database(), fields_);
  ASSERT_TRUE(vocabulary.Learn(TermsOf("Phone Book")));
  EXPECT_THAT(Words(vocabulary, U"pho"), ElementsAre("photo", "phone"));
  EXPECT_THAT(Terms(vocabulary.FindTitles(Beginning(U"phone"))), ElementsAre("~phonebook"));
}

TEST_F(VocabularyTest, LearnsNothingTwice) {
  for (const char* title : {"Photo Station", "Mail Server", "Text Editor"}) {
    index_.Add(title, title);
  }
  Vocabulary vocabulary(index_.Database(), fields_);
  ASSERT_TRUE(vocabulary.Learn(TermsOf("Photo Station")));
  ASSERT_TRUE(vocabulary.Learn(TermsOf("Zoo")));
  ASSERT_TRUE(vocabulary.Learn(TermsOf("Zoo")));
  EXPECT_THAT(Words(vocabulary, U"p"), ElementsAre("photo"));
  EXPECT_THAT(Words(vocabulary, U"z"), ElementsAre("zoo"));
}

TEST_F(VocabularyTest, HasToBeReadAnewWhenMoreIsNewThanItHolds) {
  index_.Add("a", "Photo");
  Vocabulary vocabulary(index_.Database(), fields_);
  EXPECT_FALSE(vocabulary.Learn(TermsOf("Mail Server Contacts Calendar Notes")));
}

TEST_F(VocabularyTest, KnowsWordsAndTitlesAmongAllTerms) {
  EXPECT_TRUE(IsWordOrTitle("~photo"));
  EXPECT_TRUE(IsWordOrTitle(FieldPrefix("title", Space::kWords) + "photo"));
  EXPECT_TRUE(IsWordOrTitle(FieldPrefix("", Space::kPlainWords) + "photo"));
  EXPECT_FALSE(IsWordOrTitle(FieldPrefix("title", Space::kStems) + "photo"));
  EXPECT_FALSE(IsWordOrTitle(FieldPrefix("w", Space::kGrams) + "photo"));
  EXPECT_FALSE(IsWordOrTitle(KeyTerm("w")));
  EXPECT_FALSE(IsWordOrTitle(kApplicationTerm));
  EXPECT_FALSE(IsWordOrTitle(std::string(1, '\x80')));
}

TEST_F(VocabularyTest, OfTooManyThoseThatAreWorthMostAreFound) {
  for (int i = 0; i < 250; ++i) index_.Add("w" + std::to_string(i), "aa" + std::to_string(i));
  index_.Add("best", "zz");
  const Vocabulary vocabulary(index_.Database(), fields_);
  const std::u32string none;
  const std::vector<Vocabulary::Found> found = vocabulary.FindTitles(
      {none, false, [](const std::u32string& text) { return text == U"zz" ? 2.0 : 1.0; }});
  ASSERT_EQ(found.size(), 200U);
  EXPECT_EQ(found.front().term, "~zz");
  EXPECT_EQ(found.front().worth, 2);
}

// While the index is searched and written in turn.
TEST_F(VocabularyTest, ATypoFindsWhatWasWrittenSince) {
  for (const char* title : {"Photo Station", "Mail Server", "Text Editor"}) {
    index_.Add(title, title);
  }
  ASSERT_EQ(index_.MatchedBy("photp"), "fuzzy");
  index_.Add("new", "Calendar");
  EXPECT_THAT(index_.Find("calemdar"), ElementsAre("new"));
  EXPECT_THAT(index_.Find("calxndxr"), IsEmpty());
}

}  // namespace
}  // namespace searchd
