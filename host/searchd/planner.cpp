#include "host/searchd/planner.h"

#include <unicode/uchar.h>
#include <unicode/unistr.h>
#include <unicode/utf8.h>

#include <algorithm>
#include <utility>

#include "host/searchd/common_words.h"

namespace searchd {
namespace {

bool CutCharacters(std::string& text) {
  std::size_t characters = 0;
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (U8_IS_TRAIL(static_cast<uint8_t>(text[i]))) continue;
    if (++characters <= kMaxQueryCharacters) continue;
    text.resize(i);
    return true;
  }
  return false;
}

bool EndsInSpace(const std::string& text) {
  const icu::UnicodeString unicode = icu::UnicodeString::fromUTF8(text);
  return !unicode.isEmpty() && u_isUWhiteSpace(unicode[unicode.length() - 1]) != 0;
}

class Planner {
 public:
  Planner(const std::vector<Field>& fields, Analyzer& analyzer)
      : fields_(fields), analyzer_(analyzer) {}

  // The ways to find one of the parts of a text.
  Clause MakeClause(const std::string& part, bool last) {
    Clause clause{part, false, {}};
    for (const Field& field : fields_) {
      if (field.rule.analyzer == AnalyzerKind::kKeyword) continue;
      const std::vector<Word> words = analyzer_.Words(field.rule, part);
      if (field.rule.ngram) {
        for (const Word& word : words) AddInside(clause.ways, field, {word}, {});
        continue;
      }
      AddWords(clause.ways, field, words, last);
      if (field.rule.analyzer == AnalyzerKind::kStandard) {
        AddUnjoinedWords(clause.ways, field, words, last);
        AddRuns(clause.ways, field, words, analyzer_.WholeText(part));
      }
    }
    return clause;
  }

  // The ways to find one of the words that the language knows.
  Clause MakeWordClause(const std::string& word, bool last) {
    Clause clause{word, false, {}};
    for (const Field& field : fields_) {
      if (field.rule.ngram || field.rule.analyzer != AnalyzerKind::kStandard) continue;
      const std::vector<Word> words = analyzer_.Words(field.rule, word);
      AddWords(clause.ways, field, words, last);
      AddUnjoinedWords(clause.ways, field, words, last);
    }
    return clause;
  }

  // The ways to find a text as a whole.
  std::vector<Way> MakeWhole(const std::string& text) {
    std::vector<Way> ways;
    for (const Field& field : fields_) {
      if (field.rule.ngram) continue;
      if (field.rule.analyzer == AnalyzerKind::kKeyword) {
        AddWords(ways, field, analyzer_.Words(field.rule, text), false);
        continue;
      }
      if (field.role == Role::kTitle) AddTitle(ways, field, text);
      if (field.role == Role::kKeywords) AddName(ways, field, text);
      if (field.rule.analyzer == AnalyzerKind::kStandard) AddPhrase(ways, field, text);
    }
    return ways;
  }

 private:
  // A form of typed words, where to look for it, and how much of the worth that leaves.
  struct Form {
    std::string Word::*text;
    bool plain_terms;
    double factor;
  };

  // What is spelt as it was typed comes first.
  static std::vector<Form> Forms(const std::vector<Word>& words, bool has_plain_terms) {
    std::vector<Form> forms = {{&Word::raw, false, 1}};
    if (has_plain_terms) forms.push_back({&Word::plain, true, kWithoutAccents});
    const auto differ = [](const Word& word) { return word.plain != word.raw; };
    if (std::any_of(words.begin(), words.end(), differ)) {
      forms.push_back({&Word::plain, false, kWithoutAccents});
    }
    return forms;
  }

  static bool Has(const Field& field, Space space) { return field.absent.count(space) == 0; }

  static void Add(std::vector<Way>& ways, const Field& field, How how, double worth,
                  std::vector<Match> matches) {
    if (worth <= 0 || matches.empty()) return;
    ways.push_back({field.member, field.role, how, worth, std::move(matches)});
  }

  // A short word that an apostrophe joins to the next says little.
  void AddUnjoinedWords(std::vector<Way>& ways, const Field& field, std::vector<Word> words,
                        bool last) {
    bool any = false;
    for (Word& word : words) {
      const std::string behind = BehindApostrophe(word.raw);
      if (behind.empty()) continue;
      word = analyzer_.WholeText(behind);
      any = true;
    }
    if (any) AddWords(ways, field, words, last, kUnjoined);
  }

  void AddWords(std::vector<Way>& ways, const Field& field, const std::vector<Word>& words,
                bool last, double factor = 1) {
    if (words.empty() || !Has(field, Space::kWords)) return;
    for (Form form : Forms(words, Has(field, Space::kPlainWords))) {
      form.factor *= factor;
      AddForm(ways, field, words, form, last);
    }
    if (words.size() > 1) return;
    for (const std::string& stem : analyzer_.Stems(words[0])) {
      for (const std::string& term : StemTerms(field, stem)) {
        Add(ways, field, How::kStem, WorthOf(field.role, How::kStem), {{term}});
      }
    }
  }

  static void AddForm(std::vector<Way>& ways, const Field& field, const std::vector<Word>& words,
                      const Form& form, bool last) {
    const std::string prefix =
        FieldPrefix(field.member, form.plain_terms ? Space::kPlainWords : Space::kWords);
    const std::string beginning_prefix =
        FieldPrefix(field.member, form.plain_terms ? Space::kPlainBeginnings : Space::kBeginnings);
    const double factor = form.factor * (words.size() > 1 ? kApart : 1);
    std::vector<Match> matches;
    for (const Word& word : words) matches.push_back({WordTerm(prefix, word.*form.text)});
    Add(ways, field, How::kWord, factor * WorthOf(field.role, How::kWord), matches);
    if (!last) return;
    matches.back() = Beginning(prefix, beginning_prefix, words.back().*form.text);
    Add(ways, field, How::kBeginning, factor * WorthOf(field.role, How::kBeginning), matches);
  }

  // Where the dictionary may not part what was typed as it parted the text.
  static void AddRuns(std::vector<Way>& ways, const Field& field, const std::vector<Word>& words,
                      const Word& part) {
    const std::vector<Word> runs = DenseRuns(part);
    std::vector<Word> others;
    for (const Word& word : words) {
      if (DenseRuns(word.raw).empty()) others.push_back(word);
    }
    if (!runs.empty()) AddInside(ways, field, runs, others);
  }

  // All of `parts` inside the field's texts, and all of `words` among its words.
  static void AddInside(std::vector<Way>& ways, const Field& field, const std::vector<Word>& parts,
                        const std::vector<Word>& words) {
    if (!Has(field, Space::kGrams)) return;
    for (const Form& form : Forms(parts, Has(field, Space::kPlainGrams))) {
      std::vector<Match> matches;
      for (const Word& part : parts) AddGrams(matches, field, part.*form.text, form.plain_terms);
      for (const Word& word : words) {
        matches.push_back({WordTerm(FieldPrefix(field.member, Space::kWords), word.raw)});
      }
      Add(ways, field, How::kInside, form.factor * WorthOf(field.role, How::kInside),
          std::move(matches));
    }
  }

  static void AddGrams(std::vector<Match>& matches, const Field& field, const std::string& part,
                       bool plain_terms) {
    const bool by_parts = IsFoundByParts(field.role);
    const std::size_t characters = CountCharacters(part);
    if (characters == 0) return;
    const Space space = plain_terms ? Space::kPlainGrams : Space::kGrams;
    if (by_parts && characters <= kShortGram) {
      const bool says_something = characters > 1 || !DenseCharacters(part).empty();
      if (says_something) matches.push_back({WordTerm(FieldPrefix(field.member, space), part)});
      return;
    }
    if (characters == 1) return;
    const Space long_space = plain_terms ? Space::kPlainLongGrams : Space::kLongGrams;
    const std::string prefix = FieldPrefix(field.member, by_parts ? long_space : space);
    const std::size_t most = by_parts ? kLongGram : kTextGram;
    for (const std::string& gram : QueryGrams(part, most)) {
      matches.push_back({WordTermBeginning(prefix, gram), characters < most});
    }
  }

  // What begins with `text`.
  static Match Beginning(const std::string& prefix, const std::string& beginning_prefix,
                         const std::string& text) {
    if (CountCharacters(text) <= kMaxBeginning) return {WordTerm(beginning_prefix, text)};
    return {WordTermBeginning(prefix, text), true};
  }

  void AddTitle(std::vector<Way>& ways, const Field& field, const std::string& text) {
    const Word whole = analyzer_.WholeText(text);
    // A space behind the last word says that the word is complete, and that another one follows.
    const std::string end = EndsInSpace(text) ? " " : "";
    for (const Form& form : Forms({whole}, true)) {
      AddWhole(ways, field,
               form.plain_terms ? Whole{kPlainTitlePrefix, kPlainTitleBeginningPrefix}
                                : Whole{kTitlePrefix, kTitleBeginningPrefix},
               whole.*form.text, end, form.factor);
    }
    const std::string skeleton = analyzer_.Skeleton(text);
    if (skeleton.empty()) return;
    Add(ways, field, How::kWholeText, kSkeletonWorth, {{WordTerm(kSkeletonPrefix, skeleton)}});
  }

  struct Whole {
    const char* prefix;
    const char* beginning_prefix;
  };

  static void AddWhole(std::vector<Way>& ways, const Field& field, const Whole& whole,
                       const std::string& text, const std::string& end, double factor) {
    if (text.empty()) return;
    const double worth = end.empty() ? WorthOf(field.role, How::kWholeText) : kBeforeSpaceWorth;
    Add(ways, field, How::kWholeText, factor * worth, {{WordTerm(whole.prefix, text)}});
    Add(ways, field, How::kWholeBeginning, factor * WorthOf(field.role, How::kWholeBeginning),
        {Beginning(whole.prefix, whole.beginning_prefix, text + end)});
  }

  void AddName(std::vector<Way>& ways, const Field& field, const std::string& text) {
    const std::string name = analyzer_.WholeText(text).plain;
    if (name.empty()) return;
    Add(ways, field, How::kWholeText, kNameWorth, {{WordTerm(kNamePrefix, name)}});
    Add(ways, field, How::kWholeBeginning, kNameBeginningWorth,
        {Beginning(kNamePrefix, kNameBeginningPrefix, name)});
  }

  void AddPhrase(std::vector<Way>& ways, const Field& field, const std::string& text) {
    const std::vector<Word> words = analyzer_.Words(field.rule, text);
    if (words.size() < 2 || words.size() > kMaxQueryWords || !Has(field, Space::kPairs)) return;
    const std::string prefix = FieldPrefix(field.member, Space::kPairs);
    std::vector<Match> matches;
    for (std::size_t i = 1; i < words.size(); ++i) {
      matches.push_back({WordTerm(prefix, Pair(words[i - 1].plain, words[i].plain))});
    }
    Add(ways, field, How::kWord, PhraseWorth(field.role), matches);
    matches.back() = {
        WordTermBeginning(prefix, Pair(words[words.size() - 2].plain, words.back().plain)), true};
    Add(ways, field, How::kBeginning, kWithoutAccents * PhraseWorth(field.role), matches);
  }

  const std::vector<Field>& fields_;
  Analyzer& analyzer_;
};

using ClauseMaker = Clause (Planner::*)(const std::string& part, bool last);

Reading Read(Planner& planner, ClauseMaker make, const std::vector<std::string>& parts) {
  Reading reading;
  for (std::size_t i = 0; i < parts.size(); ++i) {
    Clause clause = (planner.*make)(parts[i], i + 1 == parts.size());
    if (!clause.ways.empty()) reading.push_back(std::move(clause));
  }
  return reading;
}

}  // namespace

std::vector<std::string> StemTerms(const Field& field, const std::string& stem) {
  std::vector<std::string> terms;
  for (const Space space : {Space::kStems, Space::kWords}) {
    if (field.absent.count(space) != 0) continue;
    terms.push_back(WordTerm(FieldPrefix(field.member, space), stem));
  }
  return terms;
}

std::vector<Field> SearchedFields(const Mapping& mapping) {
  std::vector<Field> fields;
  const auto add = [&](const std::string& member, const FieldRule& rule) {
    if (rule.in_all) fields.push_back({member, rule, RoleOf(member, rule)});
  };
  for (const auto& [member, rule] : mapping.Fields()) add(member, rule);
  add("", mapping.DefaultRule());
  return fields;
}

void FindAbsent(std::vector<Field>& fields, const Xapian::Database& database) {
  for (Field& field : fields) {
    field.absent.clear();
    for (const Space space : kSpaces) {
      const std::string prefix = FieldPrefix(field.member, space);
      if (database.allterms_begin(prefix) == database.allterms_end(prefix)) {
        field.absent.insert(space);
      }
    }
  }
}

void AddUnfinishedForms(Plan& plan, const std::vector<Field>& fields, Analyzer& analyzer,
                        const Xapian::Database& database) {
  constexpr std::size_t kLeastCharacters = 4;
  constexpr int kMostWords = 20;
  if (plan.parts.empty()) return;
  Clause& last = plan.parts.back();
  const std::string word = analyzer.WholeText(last.text).raw;
  if (CountCharacters(word) < kLeastCharacters) return;
  for (const Field& field : fields) {
    if (field.role == Role::kBody) continue;
    const std::string prefix = FieldPrefix(field.member, Space::kWords);
    const std::string beginning = WordTermBeginning(prefix, word);
    std::set<std::string> stems;
    auto term = database.allterms_begin(beginning);
    for (int i = 0; i < kMostWords && term != database.allterms_end(beginning); ++i, ++term) {
      const Word known = analyzer.WholeText((*term).substr(prefix.size()));
      for (std::string& stem : analyzer.Stems(known)) stems.insert(std::move(stem));
    }
    for (const std::string& stem : stems) {
      for (const std::string& found : StemTerms(field, stem)) {
        last.ways.push_back({field.member, field.role, How::kStem, kUnfinishedWorth, {{found}}});
      }
    }
  }
}

Plan MakePlan(const std::vector<Field>& fields, Analyzer& analyzer, const std::string& text) {
  Plan plan;
  plan.text = text;
  plan.cut = CutCharacters(plan.text);
  std::vector<std::string> parts = SplitWhiteSpace(plan.text);
  std::vector<std::string> words;
  for (const std::string& part : PartCommonWords(plan.text)) {
    if (IsCommonWord(analyzer, part)) {
      words.push_back(part);
      continue;
    }
    for (const Word& word : analyzer.Words(FieldRule(), part)) words.push_back(word.raw);
  }
  plan.cut = plan.cut || parts.size() > kMaxQueryWords;
  if (parts.size() > kMaxQueryWords) parts.resize(kMaxQueryWords);
  if (words.size() > kMaxQueryWords) words.resize(kMaxQueryWords);

  Planner planner(fields, analyzer);
  plan.whole = planner.MakeWhole(plan.text);
  plan.parts = Read(planner, &Planner::MakeClause, parts);
  if (words.size() != parts.size()) {
    plan.words = Read(planner, &Planner::MakeWordClause, words);
  }
  return plan;
}

}  // namespace searchd
