#include "host/searchd/document.h"

#include <set>

#include "host/searchd/json_text.h"
#include "host/searchd/ranking.h"
#include "host/searchd/request_error.h"
#include "host/searchd/terms.h"

namespace searchd {
namespace {

[[noreturn]] void Reject(const std::string& member, const std::string& cause) {
  throw RequestError(Code::kRejected, "document member \"" + member + "\" " + cause);
}

// Adds the terms of one document, member by member.
class TermAdder {
 public:
  TermAdder(Xapian::Document& document, Analyzer& analyzer)
      : document_(document), analyzer_(analyzer) {}

  void AddMember(const std::string& name, bool named, const FieldRule& rule,
                 const std::string& text) {
    const std::string prefix = named ? FieldPrefix(name) : UnnamedFieldsPrefix();
    const Role role = RoleOf(name, rule);
    for (const Word& word : analyzer_.Words(rule, text)) {
      if (rule.ngram) {
        for (const std::string& gram : IndexGrams(word.plain)) AddOnce(WordTerm(prefix, gram));
        continue;
      }
      AddWord(prefix, word.raw, role);
      if (word.plain != word.raw) AddWord(prefix, word.plain, role);
    }
    if (role == Role::kTitle && rule.in_all) {
      AddOnce(WholeTitleTerm(analyzer_.WholeText(text)));
    }
  }

 private:
  // Repeating a keyword makes it weigh more; repeating a word elsewhere says nothing.
  void AddWord(const std::string& prefix, const std::string& word, Role role) {
    const std::string term = WordTerm(prefix, word);
    if (role == Role::kKeywords) {
      document_.add_term(term);
    } else {
      AddOnce(term);
    }
  }

  void AddOnce(const std::string& term) {
    if (added_.insert(term).second) document_.add_term(term);
  }

  Xapian::Document& document_;
  Analyzer& analyzer_;
  std::set<std::string> added_;
};

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
    adder.AddMember(name, mapping.Fields().count(name) != 0, rule, it->asString());
    if (rule.stored) stored[name] = *it;
  }
  document.set_data(JsonText(stored));
  document.add_value(kOrderSlot, analyzer.SortKey(data.get("title", "").asString()) + document_id);
  return document;
}

}  // namespace searchd
