// The schema that an index is created with: how each member of a document is analysed.
#pragma once

#include <json/value.h>

#include <map>
#include <string>

namespace searchd {

enum class AnalyzerKind {
  kKeyword,     // the whole text is one term
  kStandard,    // words as the language knows them
  kWhiteSpace,  // what stands between white space
};

struct FieldRule {
  AnalyzerKind analyzer = AnalyzerKind::kStandard;
  bool required = false;
  bool stored = true;
  bool in_all = true;       // searched when no field is named
  bool lower_case = false;  // preprocess step "tolower"
  bool ngram = false;       // preprocess step "ngram": any part of a word is found
};

class Mapping {
 public:
  // Reads a "mappings" object; throws RequestError(kRejected) naming the member that is wrong.
  static Mapping Parse(const Json::Value& mappings);

  // The member whose value is a document's key.
  const std::string& KeyField() const { return key_field_; }
  // The rule of members that "properties" does not name.
  const FieldRule& DefaultRule() const { return default_rule_; }
  // The members that "properties" names.
  const std::map<std::string, FieldRule>& Fields() const { return fields_; }
  const FieldRule& RuleOf(const std::string& member) const;

 private:
  std::string key_field_;
  FieldRule default_rule_;
  std::map<std::string, FieldRule> fields_;
};

}  // namespace searchd
