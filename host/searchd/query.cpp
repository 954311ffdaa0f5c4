#include "host/searchd/query.h"

#include <unicode/utf8.h>

#include <map>
#include <utility>
#include <vector>

#include "host/searchd/ranking.h"
#include "host/searchd/terms.h"

namespace searchd {
namespace {

using Xapian::Query;

struct Field {
  std::string prefix;
  Role role;
};

Query Scaled(const Query& query, double factor) {
  return query.empty() ? query : Query(Query::OP_SCALE_WEIGHT, query, factor);
}

Query Best(const std::vector<Query>& queries) {
  return Query(Query::OP_MAX, queries.begin(), queries.end());
}

Query All(const std::vector<Query>& queries) {
  return Query(Query::OP_AND, queries.begin(), queries.end());
}

// Finds the parts of a query in the members that are searched. Members that are cut into words
// alike are asked together, so that the words of one text may be found in several members.
class QueryBuilder {
 public:
  QueryBuilder(const Mapping& mapping, Analyzer& analyzer) : analyzer_(analyzer) {
    for (const auto& [name, rule] : mapping.Fields()) AddField(rule, FieldPrefix(name), name);
    AddField(mapping.DefaultRule(), UnnamedFieldsPrefix(), "");
  }

  // The query for one text without white space.
  Query ForPart(const std::string& part, bool last) {
    std::vector<Query> ways;
    for (const Group& group : groups_) {
      if (group.rule.ngram) {
        AddWay(ways, Inside(group, part));
      } else if (group.rule.analyzer != AnalyzerKind::kKeyword) {
        AddWay(ways, Words(group, part, last));
        if (last) AddWay(ways, Unbroken(group, part));
      }
    }
    return ways.empty() ? Query() : Best(ways);
  }

  // The query for documents that the whole text names.
  Query ForWhole(const std::string& text) {
    std::vector<Query> ways;
    const std::string whole = analyzer_.WholeText(text);
    if (has_title_ && !whole.empty()) {
      const std::string term = WholeTitleTerm(whole);
      ways.push_back(Scaled(Query(term), kWholeTitle));
      ways.push_back(Scaled(Query(Query::OP_WILDCARD, term), kTitleBeginning));
    }
    for (const Group& group : groups_) {
      if (group.rule.ngram || group.rule.analyzer != AnalyzerKind::kKeyword) continue;
      AddWay(ways, Words(group, text, false));
    }
    return ways.empty() ? Query() : Best(ways);
  }

 private:
  struct Group {
    FieldRule rule;
    std::vector<Field> fields;
  };

  static void AddWay(std::vector<Query>& ways, const Query& way) {
    if (!way.empty()) ways.push_back(way);
  }

  void AddField(const FieldRule& rule, const std::string& prefix, const std::string& name) {
    if (!rule.in_all) return;
    const Field field{prefix, RoleOf(name, rule)};
    if (field.role == Role::kTitle) has_title_ = true;
    for (Group& group : groups_) {
      if (group.rule.analyzer == rule.analyzer && group.rule.lower_case == rule.lower_case &&
          group.rule.ngram == rule.ngram) {
        group.fields.push_back(field);
        return;
      }
    }
    groups_.push_back({rule, {field}});
  }

  Query Words(const Group& group, const std::string& text, bool last) {
    const std::vector<Word> words = analyzer_.Words(group.rule, text);
    if (words.empty()) return {};
    std::vector<Query> queries;
    for (std::size_t i = 0; i < words.size(); ++i) {
      queries.push_back(AnyField(group, words[i], last && i + 1 == words.size()));
    }
    return Scaled(All(queries), 1.0 / static_cast<double>(queries.size()));
  }

  // Half a word may look like several in a script without spaces, where the dictionary tells what
  // is a word: also asks for words that begin with all of it.
  Query Unbroken(const Group& group, const std::string& text) {
    const std::vector<Word> words = analyzer_.Words(group.rule, text);
    if (words.size() < 2) return {};
    std::string whole;
    for (const Word& word : words) whole += word.raw;
    std::vector<Query> ways;
    for (const Field& field : group.fields) {
      ways.push_back(Scaled(Query(Query::OP_WILDCARD, WordTermBeginning(field.prefix, whole)),
                            BeginningWorth(field.role)));
    }
    return Best(ways);
  }

  static Query AnyField(const Group& group, const Word& word, bool beginning) {
    std::vector<Query> ways;
    for (const Field& field : group.fields) {
      AddForm(ways, field, word.raw, beginning);
      if (word.plain != word.raw) AddForm(ways, field, word.plain, beginning);
    }
    return Best(ways);
  }

  static void AddForm(std::vector<Query>& ways, const Field& field, const std::string& form,
                      bool beginning) {
    ways.push_back(Scaled(Query(WordTerm(field.prefix, form)), WordWorth(field.role)));
    if (!beginning) return;
    ways.push_back(Scaled(Query(Query::OP_WILDCARD, WordTermBeginning(field.prefix, form)),
                          BeginningWorth(field.role)));
  }

  Query Inside(const Group& group, const std::string& text) {
    std::vector<std::string> grams;
    for (const Word& word : analyzer_.Words(group.rule, text)) {
      for (std::string& gram : QueryGrams(word.plain)) grams.push_back(std::move(gram));
    }
    if (grams.empty()) return {};
    std::vector<Query> ways;
    for (const Field& field : group.fields) {
      std::vector<Query> terms;
      for (const std::string& gram : grams) terms.emplace_back(WordTerm(field.prefix, gram));
      ways.push_back(Scaled(All(terms), WordWorth(field.role) / static_cast<double>(terms.size())));
    }
    return Best(ways);
  }

  Analyzer& analyzer_;
  std::vector<Group> groups_;
  bool has_title_ = false;
};

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

}  // namespace

ParsedQuery ParseQuery(const Mapping& mapping, Analyzer& analyzer, const std::string& text) {
  ParsedQuery parsed;
  std::string looked_at = text;
  parsed.cut = CutCharacters(looked_at);
  std::vector<std::string> parts = SplitWhiteSpace(looked_at);
  if (parts.size() > kMaxQueryWords) {
    parts.resize(kMaxQueryWords);
    parsed.cut = true;
  }

  QueryBuilder builder(mapping, analyzer);
  std::vector<Query> words;
  for (std::size_t i = 0; i < parts.size(); ++i) {
    Query query = builder.ForPart(parts[i], i + 1 == parts.size());
    if (!query.empty()) words.push_back(std::move(query));
  }
  std::vector<Query> ways;
  if (!words.empty()) ways.push_back(Scaled(All(words), 1.0 / static_cast<double>(words.size())));
  const Query whole = builder.ForWhole(looked_at);
  if (!whole.empty()) ways.push_back(whole);
  if (!ways.empty()) parsed.query = Best(ways);
  return parsed;
}

}  // namespace searchd
