#include "host/searchd/document.h"

#include "host/searchd/json_text.h"
#include "host/searchd/ranking.h"
#include "host/searchd/request_error.h"
#include "host/searchd/terms.h"

namespace searchd {
namespace {

[[noreturn]] void Reject(const std::string& member, const std::string& cause) {
  throw RequestError(Code::kRejected, "document member \"" + member + "\" " + cause);
}

// How many of the first words of the keywords may be an application's name.
constexpr std::size_t kMaxNameWords = 6;

// Adds the terms of one document, member by member. Only how often a keyword stands there counts:
// repeating a word elsewhere says nothing.
class TermAdder {
 public:
  TermAdder(Xapian::Document& document, Analyzer& analyzer)
      : document_(document), analyzer_(analyzer) {}

  // `has_grams` says that another member gives all n-grams of the same text.
  void AddMember(const std::string& member, const FieldRule& rule, const std::string& name,
                 const std::string& text, bool has_grams) {
    if (!rule.in_all) return;
    const std::vector<Word> words = analyzer_.Words(rule, text);
    const Role role = RoleOf(name, rule);
    if (rule.ngram) {
      for (const Word& word : words) AddGrams(member, role, word.raw, word.plain);
      return;
    }
    for (const Word& word : words) {
      AddWord(member, role, word);
      const std::string behind = BehindApostrophe(word.raw);
      if (behind.empty() || rule.analyzer != AnalyzerKind::kStandard) continue;
      for (const Word& other : analyzer_.Words(rule, behind)) AddWord(member, role, other);
    }
    if (rule.analyzer == AnalyzerKind::kStandard) AddStandard(member, role, words, text, has_grams);
    if (role == Role::kTitle) AddTitle(text);
    if (role == Role::kKeywords) AddName(text);
  }

 private:
  void AddWord(const std::string& member, Role role, const Word& word) {
    const Xapian::termcount count = role == Role::kKeywords ? 1 : 0;
    const auto add = [&](Space space, const std::string& form) {
      document_.add_term(WordTerm(FieldPrefix(member, space), form), count);
    };
    add(Space::kWords, word.raw);
    for (const std::string& beginning : Beginnings(word.raw)) add(Space::kBeginnings, beginning);
    if (word.bare != word.plain) add(Space::kBareWords, word.bare);
    if (word.plain == word.raw) return;
    add(Space::kPlainWords, word.plain);
    for (const std::string& beginning : Beginnings(word.plain)) {
      add(Space::kPlainBeginnings, beginning);
    }
  }

  void AddStandard(const std::string& member, Role role, const std::vector<Word>& words,
                   const std::string& text, bool has_grams) {
    for (std::size_t i = 0; i < words.size(); ++i) {
      for (const std::string& stem : analyzer_.Stems(words[i])) {
        if (stem != words[i].raw) Add(FieldPrefix(member, Space::kStems), stem);
      }
      if (i == 0 || PhraseWorth(role) == 0) continue;
      Add(FieldPrefix(member, Space::kPairs), Pair(words[i - 1].plain, words[i].plain));
    }
    if (has_grams) return;
    for (const Word& run : DenseRuns(analyzer_.WholeText(text))) {
      AddGrams(member, role, run.raw, run.plain);
    }
  }

  void AddGrams(const std::string& member, Role role, const std::string& raw,
                const std::string& plain) {
    AddGrams(member, role, raw, Space::kGrams, Space::kLongGrams);
    if (plain != raw) AddGrams(member, role, plain, Space::kPlainGrams, Space::kPlainLongGrams);
  }

  void AddGrams(const std::string& member, Role role, const std::string& word, Space space,
                Space long_space) {
    const auto add = [&](Space where, const std::vector<std::string>& grams) {
      for (const std::string& gram : grams) Add(FieldPrefix(member, where), gram);
    };
    if (!IsFoundByParts(role)) {
      add(space, Grams(word, kShortGram, kTextGram));
      return;
    }
    add(space, DenseCharacters(word));
    add(space, Grams(word, kShortGram, kShortGram));
    add(long_space, Grams(word, kShortGram + 1, kLongGram));
  }

  void AddTitle(const std::string& text) {
    const Word whole = analyzer_.WholeText(text);
    AddWhole(kTitlePrefix, kTitleBeginningPrefix, whole.raw);
    if (whole.plain != whole.raw) {
      AddWhole(kPlainTitlePrefix, kPlainTitleBeginningPrefix, whole.plain);
    }
    if (whole.bare != whole.plain) Add(kBareTitlePrefix, whole.bare);
    Add(kSkeletonPrefix, analyzer_.Skeleton(text));
  }

  void AddName(const std::string& text) {
    std::string name;
    std::size_t words = 0;
    for (const std::string& part : SplitWhiteSpace(text)) {
      if (++words > kMaxNameWords) return;
      name += part + ' ';
      AddWhole(kNamePrefix, kNameBeginningPrefix, analyzer_.WholeText(name).plain);
    }
  }

  void AddWhole(const std::string& prefix, const std::string& beginning_prefix,
                const std::string& text) {
    Add(prefix, text);
    for (const std::string& beginning : Beginnings(text)) Add(beginning_prefix, beginning);
  }

  void Add(const std::string& prefix, const std::string& word) {
    document_.add_boolean_term(WordTerm(prefix, word));
  }

  Xapian::Document& document_;
  Analyzer& analyzer_;
};

// Whether a member that is there to be found by any part of it holds this text.
bool IsTextForParts(const Mapping& mapping, const Json::Value& data, const std::string& text) {
  for (auto it = data.begin(); it != data.end(); ++it) {
    const FieldRule& rule = mapping.RuleOf(it.name());
    if (rule.ngram && rule.in_all && *it == text) return true;
  }
  return false;
}

// A part of an application names it as its owner.
bool IsApplication(const Mapping& mapping, const Json::Value& data) {
  return mapping.Fields().count("owner") != 0 && data.get("owner", "").asString().empty();
}

}  // namespace

void CheckDocument(const Mapping& mapping, const std::string& document_id,
                   const Json::Value& data) {
  if (document_id.size() > kMaxDocumentIdBytes) {
    throw RequestError(Code::kRejected, "\"doc_id\" is longer than " +
                                            std::to_string(kMaxDocumentIdBytes) + " bytes");
  }
  if (!data.isObject()) throw RequestError(Code::kRejected, "\"data\" must be an object");
  if (data.size() > kMaxDocumentMembers) {
    throw RequestError(Code::kRejected, "the document has more than " +
                                            std::to_string(kMaxDocumentMembers) + " members");
  }
  for (auto it = data.begin(); it != data.end(); ++it) {
    if (!it->isString()) Reject(it.name(), "must be a string");
    if (it->asString().size() > kMaxFieldBytes) {
      Reject(it.name(), "is longer than " + std::to_string(kMaxFieldBytes) + " bytes");
    }
  }
  for (const auto& [name, rule] : mapping.Fields()) {
    if (rule.required && !data.isMember(name)) Reject(name, "is required");
  }
  if (!data.isMember(mapping.KeyField())) Reject(mapping.KeyField(), "is required");
  if (data[mapping.KeyField()] != document_id) {
    Reject(mapping.KeyField(), "is not the \"doc_id\" of the request");
  }
}

Xapian::Document BuildDocument(const Mapping& mapping, Analyzer& analyzer,
                               const std::string& document_id, const Json::Value& data) {
  Xapian::Document document;
  document.add_boolean_term(KeyTerm(document_id));
  TermAdder adder(document, analyzer);
  Json::Value stored(Json::objectValue);
  for (auto it = data.begin(); it != data.end(); ++it) {
    const std::string name = it.name();
    const FieldRule& rule = mapping.RuleOf(name);
    const bool named = mapping.Fields().count(name) != 0;
    adder.AddMember(named ? name : "", rule, name, it->asString(),
                    IsTextForParts(mapping, data, it->asString()));
    if (rule.stored && IsShownInHits(name)) stored[name] = *it;
  }
  if (IsApplication(mapping, data)) document.add_boolean_term(kApplicationTerm);
  document.set_data(JsonText(stored));
  document.add_value(kOrderSlot, analyzer.SortKey(data.get("title", "").asString()) + document_id);
  return document;
}

}  // namespace searchd
