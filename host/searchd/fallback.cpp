#include "host/searchd/fallback.h"

#include <algorithm>
#include <array>
#include <functional>
#include <set>
#include <utility>

#include "host/searchd/edit_distance.h"
#include "host/searchd/folding.h"
#include "host/searchd/terms.h"

namespace searchd {
namespace {

// In shorter words one edit makes any word of any other. One letter may have been left out.
constexpr std::size_t kLettersForTypo = 5;
constexpr std::size_t kDenseLettersForTypo = 3;

// What was typed, and what it may have been meant for.
class Typed {
 public:
  explicit Typed(const std::string& text) : letters_(Letters(text)) {
    const auto dense = [](char32_t c) { return IsDense(static_cast<UChar32>(c)); };
    least_ = std::any_of(letters_.begin(), letters_.end(), dense) ? kDenseLettersForTypo
                                                                  : kLettersForTypo;
  }

  bool Begins(const std::u32string& text) const {
    return text.compare(0, letters_.size(), letters_) == 0;
  }
  bool IsIn(const std::u32string& text) const {
    return text.find(letters_) != std::u32string::npos;
  }
  // The same but for one edit.
  bool IsNearly(const std::u32string& text) const {
    return letters_.size() + 1 >= least_ && text.size() >= least_ &&
           IsWithinOneEdit(text, letters_);
  }
  bool NearlyBegins(const std::u32string& text) const {
    return letters_.size() >= least_ && BeginsWithinOneEdit(text, letters_);
  }
  bool MayBeIn(const std::u32string& text) const { return MayContainWithinOneEdit(text, letters_); }
  bool IsNearlyIn(const std::u32string& text) const {
    return letters_.size() >= least_ && ContainsWithinOneEdit(text, letters_);
  }

  const std::u32string& GetLetters() const { return letters_; }

 private:
  std::u32string letters_;
  std::size_t least_;
};

std::size_t CountWays(const Plan& plan) {
  std::size_t count = plan.whole.size();
  for (const Reading* reading : {&plan.parts, &plan.words}) {
    for (const Clause& clause : *reading) count += clause.ways.size();
  }
  return count;
}

bool HasWords(const Field& field) {
  return !field.rule.ngram && field.rule.analyzer != AnalyzerKind::kKeyword;
}

void AddWay(std::vector<Way>& ways, const Field& field, How how, double worth, Match match) {
  if (worth > 0) ways.push_back({field.member, field.role, how, worth, {std::move(match)}});
}

void AddWays(std::vector<Way>& ways, const Field& field, How how,
             const std::vector<Vocabulary::Found>& found) {
  for (const Vocabulary::Found& text : found) {
    AddWay(ways, field, how, text.worth, {text.term, false});
  }
}

// Calls `add` with each clause of a reading and each field of words, and the clause's text as it
// stands in that field's terms.
void ForEachWord(Reading& reading, const std::vector<Field>& fields, Analyzer& analyzer,
                 const std::function<void(Clause&, std::size_t, const Word&)>& add) {
  for (Clause& clause : reading) {
    for (std::size_t i = 0; i < fields.size(); ++i) {
      if (!HasWords(fields[i])) continue;
      const std::vector<Word> words = analyzer.Words(fields[i].rule, clause.text);
      if (words.size() == 1 && !words[0].bare.empty()) add(clause, i, words[0]);
    }
  }
}

// Stems of which the typed word may become another form with one of the usual endings, for words
// that are not in the index.
std::vector<std::string> StemsWithEndings(const Field& field, const Analyzer& analyzer,
                                          const std::string& word) {
  constexpr std::array<const char*, 16> kEndings = {"s",  "es", "e",  "n",   "en",  "er", "r", "k",
                                                    "ok", "ek", "ar", "lar", "ler", "ы",  "и", "й"};
  if (field.role == Role::kBody) return {};
  std::set<std::string> terms;
  for (const char* ending : kEndings) {
    for (const std::string& stem : analyzer.Stems(analyzer.WholeText(word + ending))) {
      for (std::string& term : StemTerms(field, stem)) terms.insert(std::move(term));
    }
  }
  return {terms.begin(), terms.end()};
}

void AddNearWords(Reading& reading, const std::vector<Field>& fields, Analyzer& analyzer,
                  const Vocabulary& vocabulary) {
  ForEachWord(reading, fields, analyzer, [&](Clause& clause, std::size_t i, const Word& word) {
    const Typed typed(word.plain);
    const Field& field = fields[i];
    const bool last = &clause == &reading.back();
    const auto worth = [&](const std::u32string& text) {
      if (typed.IsNearly(text)) return kWithTypo * WorthOf(field.role, How::kWord);
      if (!last || !typed.NearlyBegins(text)) return 0.0;
      return kWithTypo * WorthOf(field.role, How::kBeginning);
    };
    AddWays(clause.ways, field, How::kTypo,
            vocabulary.FindWords(i, {typed.GetLetters(), true, worth}));
    if (!last) return;
    for (const std::string& stem : StemsWithEndings(field, analyzer, word.raw)) {
      AddWay(clause.ways, field, How::kTypo, kUnfinishedWorth, {stem, false});
    }
  });
}

// Titles that are nearly, begin nearly or hold nearly what was typed, and those that begin with it
// or hold it when spaces do not count.
void AddNearTitles(std::vector<Way>& ways, const Field& field, const Typed& typed,
                   const Vocabulary& vocabulary) {
  const auto worth = [&](const std::u32string& text) {
    if (!typed.MayBeIn(text)) return 0.0;
    if (typed.Begins(text)) return WorthOf(field.role, How::kBeginning);
    if (typed.IsNearly(text)) return kWithTypo * WorthOf(field.role, How::kWholeText);
    if (typed.NearlyBegins(text)) return kWithTypo * WorthOf(field.role, How::kBeginning);
    if (!typed.IsIn(text) && !typed.IsNearlyIn(text)) return 0.0;
    return kWithTypo * WorthOf(field.role, How::kInside);
  };
  AddWays(ways, field, How::kTypo, vocabulary.FindTitles({typed.GetLetters(), true, worth}));
}

}  // namespace

bool AddMarkless(Plan& plan, const std::vector<Field>& fields, Analyzer& analyzer) {
  const std::size_t before = CountWays(plan);
  ForEachWord(plan.parts, fields, analyzer, [&](Clause& clause, std::size_t i, const Word& word) {
    const Field& field = fields[i];
    for (const Space space : {Space::kWords, Space::kPlainWords, Space::kBareWords}) {
      if (word.bare == word.plain && space != Space::kBareWords) continue;
      if (field.absent.count(space) != 0) continue;
      const std::string prefix = FieldPrefix(field.member, space);
      AddWay(clause.ways, field, How::kWord, kWithoutMarks * WorthOf(field.role, How::kWord),
             {WordTerm(prefix, word.bare), false});
      if (&clause != &plan.parts.back()) continue;
      AddWay(clause.ways, field, How::kBeginning,
             kWithoutMarks * WorthOf(field.role, How::kBeginning),
             {WordTermBeginning(prefix, word.bare), true});
    }
  });
  const Word whole = analyzer.WholeText(plan.text);
  for (const Field& field : fields) {
    if (whole.bare.empty()) break;
    if (field.role != Role::kTitle || field.absent.count(Space::kBareWords) != 0) continue;
    for (const char* prefix : {kTitlePrefix, kPlainTitlePrefix, kBareTitlePrefix}) {
      AddWay(plan.whole, field, How::kWholeText,
             kWithoutMarks * WorthOf(field.role, How::kWholeText),
             {WordTerm(prefix, whole.bare), false});
      AddWay(plan.whole, field, How::kWholeBeginning,
             kWithoutMarks * WorthOf(field.role, How::kWholeBeginning),
             {WordTermBeginning(prefix, whole.bare), true});
    }
  }
  return CountWays(plan) > before;
}

bool AddContaining(Plan& plan, const std::vector<Field>& fields, Analyzer& analyzer,
                   const Vocabulary& vocabulary) {
  const std::size_t before = CountWays(plan);
  ForEachWord(plan.parts, fields, analyzer, [&](Clause& clause, std::size_t i, const Word& word) {
    const Typed typed(word.plain);
    const auto worth = [&](const std::u32string& text) {
      return typed.IsIn(text) ? WorthOf(fields[i].role, How::kInside) : 0;
    };
    AddWays(clause.ways, fields[i], How::kInside,
            vocabulary.FindWords(i, {typed.GetLetters(), false, worth}));
  });
  return CountWays(plan) > before;
}

bool AddNearly(Plan& plan, const std::vector<Field>& fields, Analyzer& analyzer,
               const Vocabulary& vocabulary) {
  const std::size_t before = CountWays(plan);
  AddNearWords(plan.parts, fields, analyzer, vocabulary);
  AddNearWords(plan.words, fields, analyzer, vocabulary);
  const std::string skeleton = analyzer.Skeleton(plan.text);
  for (const Field& field : fields) {
    if (skeleton.empty() || field.role != Role::kTitle) continue;
    AddNearTitles(plan.whole, field, Typed(skeleton), vocabulary);
  }
  return CountWays(plan) > before;
}

}  // namespace searchd
