// What a Matcher makes of a plan and what Assess says of each document are the same.
#include "host/searchd/matcher.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <map>
#include <memory>
#include <random>
#include <string>
#include <vector>

#include "host/searchd/assessment.h"
#include "host/searchd/common_words.h"
#include "host/searchd/fallback.h"
#include "tests/unit/searchd/memory_index.h"

namespace searchd {
namespace {

// The same texts in every run and on every machine. Few syllables, so that documents and queries
// meet often and in many ways.
class Texts {
 public:
  Texts(Strings syllables, std::uint32_t seed) : syllables_(std::move(syllables)), engine_(seed) {}

  std::size_t Below(std::size_t limit) { return engine_() % limit; }

  std::string Word() {
    std::string word;
    for (std::size_t i = Below(4) + 1; i > 0; --i) word += syllables_[Below(syllables_.size())];
    return word;
  }

  // Sometimes with a word that a person would not think of.
  std::string Text(std::size_t max_words) {
    static const Strings odd = {"settings", "\u0301",   "&",   "C++", "a-b",
                                "📷",        "ＦＩＬＥ", "7.2", "İ"};
    std::string text;
    for (std::size_t i = Below(max_words + 1); i > 0; --i) {
      text += Below(12) == 0 ? odd[Below(odd.size())] : Word();
      if (Below(8) != 0) text += ' ';
    }
    return text;
  }

 private:
  const Strings syllables_;
  std::mt19937 engine_;
};

struct Script {
  const char* language;
  Strings syllables;
};

const std::vector<Script>& Scripts() {
  static const std::vector<Script> scripts = {
      {"enu", {"fo", "to", "s", "ing", "mail", "x"}},
      {"ger", {"grö", "ße", "gro", "sse", "n", "ä"}},
      {"rus", {"фа", "йл", "ы", "ё", "е", "й"}},
      {"trk", {"ı", "i", "I", "İ", "ş", "ik", "lar"}},
      {"tha", {"ไฟ", "ล์", "จัด", "การ", "ล", "่"}},
      {"jpn", {"ファ", "ふぁ", "イル", "管理", "ー", "が", "か"}},
      {"chs", {"文", "件", "管", "理", "nas"}},
      {"krn", {"파", "일", "관", "리", "a"}},
      {"none", {"é", "e", "ox", "文", "ล", "Ж"}},
  };
  return scripts;
}

Json::Value RandomDocument(Texts& texts, const std::string& id) {
  const std::string title = texts.Text(3);
  const std::string desc = texts.Text(6);
  const std::string keywords = texts.Text(6);
  const std::string owner = texts.Below(2) == 0 ? "owner" : "";
  Json::Value document = test::Document(id, title, desc, keywords, owner);
  if (texts.Below(3) == 0) document["note"] = texts.Text(3);
  return document;
}

DocumentTerms TermsOf(const Xapian::Document& document) {
  DocumentTerms terms;
  for (auto term = document.termlist_begin(); term != document.termlist_end(); ++term) {
    terms[*term] = term.get_wdf();
  }
  return terms;
}

std::map<Xapian::docid, double> WeightsOf(const Xapian::Database& database, const Plan& plan) {
  std::map<Xapian::docid, double> weights;
  static MatcherNotes notes;  // as they are left by other searches, of other databases too
  for (const Hit& hit : Matcher(database, notes).Find(plan)) {
    EXPECT_TRUE(weights.emplace(hit.document, hit.worth).second) << "found twice";
  }
  return weights;
}

// One script's documents, and the plans of one query as the search for it goes on.
class Comparison {
 public:
  Comparison(const Script& script, std::uint32_t seed, bool find_absent)
      : texts_(script.syllables, seed), index_(script.language) {
    for (int i = 0; i < 20; ++i) index_.Add(RandomDocument(texts_, std::to_string(i)));
    if (find_absent) FindAbsent(fields_, index_.Database());
    const Xapian::Database& database = index_.Database();
    for (Xapian::docid id = 1; id <= database.get_doccount(); ++id) {
      terms_[id] = TermsOf(database.get_document(id));
    }
    vocabulary_ = std::make_unique<Vocabulary>(index_.Database(), fields_);
  }

  // Returns how many hits were compared.
  std::size_t CompareOne() {
    const std::string query = texts_.Text(4);
    Analyzer& analyzer = index_.GetAnalyzer();
    Plan plan = MakePlan(fields_, analyzer, query);
    MarkCommonWords(plan, fields_, analyzer, index_.Database());
    if (plan.IsEmpty()) return 0;
    std::size_t hits = Compare(plan, query);
    AddMarkless(plan, fields_, analyzer);
    hits += Compare(plan, query + " without marks");
    AddContaining(plan, fields_, analyzer, *vocabulary_);
    hits += Compare(plan, query + " contained");
    AddNearly(plan, fields_, analyzer, *vocabulary_);
    return hits + Compare(plan, query + " nearly");
  }

 private:
  std::size_t Compare(const Plan& plan, const std::string& name) const {
    const std::map<Xapian::docid, double> weights = WeightsOf(index_.Database(), plan);
    for (const auto& [id, terms] : terms_) {
      const auto hit = weights.find(id);
      const Assessment assessment = Assess(plan, terms);
      const double weight = hit == weights.end() ? 0 : hit->second;
      EXPECT_NEAR(assessment.worth, weight, 1e-9) << '"' << name << "\" in " << id;
      EXPECT_EQ(assessment.Reasons().empty(), hit == weights.end()) << name;
    }
    return weights.size();
  }

  Texts texts_;
  MemoryIndex index_;
  std::vector<Field> fields_ = SearchedFields(index_.GetMapping());
  std::unique_ptr<Vocabulary> vocabulary_;
  std::map<Xapian::docid, DocumentTerms> terms_;
};

TEST(MatcherTest, EachDocumentGetsTheWorthThatAssessSays) {
  std::uint32_t seed = 1;
  for (const Script& script : Scripts()) {
    std::size_t hits = 0;
    for (const bool find_absent : {false, true}) {
      Comparison comparison(script, seed++, find_absent);
      for (int i = 0; i < 15 && !testing::Test::HasFailure(); ++i) hits += comparison.CompareOne();
    }
    EXPECT_GT(hits, 100U) << script.language << ": too little to compare";
  }
}

// A page of hits is a part of one list, and the total that of the list.
TEST(MatcherTest, TheFirstHitsAreTheFirstOfAll) {
  std::uint32_t seed = 100;
  for (const Script& script : Scripts()) {
    Texts texts(script.syllables, seed++);
    MemoryIndex index(script.language);
    for (int i = 0; i < 40; ++i) index.Add(RandomDocument(texts, std::to_string(i)));
    for (int i = 0; i < 25; ++i) {
      const std::string query = texts.Text(3);
      Strings all = index.Find(query);
      const std::size_t total = all.size();
      all.resize(std::min<std::size_t>(all.size(), 3));
      const SearchRequest request{query, 0, 3, false};
      EXPECT_EQ(index.Find(request), all) << script.language << " \"" << query << '"';
      EXPECT_EQ(index.Search(request).total, total) << script.language << " \"" << query << '"';
    }
  }
}

class FirstOfTest : public testing::Test {
 protected:
  FirstOfTest() {
    for (const char* title : {"Delta", "Alpha", "Echo", "Charlie", "Bravo"}) {
      index_.Add(title, title);
    }
  }

  std::vector<Xapian::docid> First(std::vector<Hit> hits, std::size_t count) {
    std::vector<Xapian::docid> documents;
    for (const Hit& hit : FirstOf(index_.Database(), std::move(hits), count)) {
      documents.push_back(hit.document);
    }
    return documents;
  }

  MemoryIndex index_;
};

TEST_F(FirstOfTest, TheBestComeFirst) {
  EXPECT_EQ(First({{1, 3}, {2, 1}, {3, 5}, {4, 2}}, 3), (std::vector<Xapian::docid>{3, 1, 4}));
}

TEST_F(FirstOfTest, WhereTheyAreWorthTheSameTheirTitlesDecide) {
  EXPECT_EQ(First({{1, 2}, {2, 2}, {3, 2}, {4, 2}, {5, 2}}, 3),
            (std::vector<Xapian::docid>{2, 5, 4}));
}

TEST_F(FirstOfTest, TitlesDecideAmongTheLastOfThemToo) {
  EXPECT_EQ(First({{3, 9}, {1, 2}, {4, 2}, {2, 2}, {5, 1}}, 2), (std::vector<Xapian::docid>{3, 2}));
}

TEST_F(FirstOfTest, ThereAreNoMoreThanThereAre) {
  EXPECT_EQ(First({{1, 1}, {2, 2}}, 1000), (std::vector<Xapian::docid>{2, 1}));
  EXPECT_EQ(First({{1, 1}}, 0), std::vector<Xapian::docid>{});
  EXPECT_EQ(First({}, 5), std::vector<Xapian::docid>{});
}

TEST(MatcherTest, AnEmptyPlanFindsNothing) {
  MemoryIndex index;
  index.Add("files", "Files");
  MatcherNotes notes;
  EXPECT_TRUE(Matcher(index.Database(), notes).Find(Plan()).empty());
  EXPECT_EQ(Assess(Plan(), {{"A", 1}}).worth, 0);
}

}  // namespace
}  // namespace searchd
