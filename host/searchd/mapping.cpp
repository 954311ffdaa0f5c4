#include "host/searchd/mapping.h"

#include "host/searchd/request_error.h"

namespace searchd {
namespace {

// A property's name is part of each of its terms, and those are short.
constexpr std::size_t kMaxNameBytes = 64;
constexpr Json::ArrayIndex kMaxProperties = 256;

[[noreturn]] void Reject(const std::string& member, const std::string& cause) {
  throw RequestError(Code::kRejected, "\"" + member + "\" " + cause);
}

void SetFlag(bool& flag, const Json::Value& value, const std::string& member) {
  if (!value.isBool()) Reject(member, "must be true or false");
  flag = value.asBool();
}

void CheckType(const Json::Value& value, const std::string& member) {
  if (value != "string" && value != "text") Reject(member, "must be \"string\" or \"text\"");
}

AnalyzerKind ParseAnalyzer(const Json::Value& value, const std::string& member) {
  if (value == "keyword") return AnalyzerKind::kKeyword;
  if (value == "tovostandard") return AnalyzerKind::kStandard;
  if (value == "white space") return AnalyzerKind::kWhiteSpace;
  Reject(member, "must be \"keyword\", \"tovostandard\" or \"white space\"");
}

void SetPreprocess(FieldRule& rule, const Json::Value& steps, const std::string& member) {
  if (!steps.isArray()) Reject(member, "must be an array of steps");
  rule.lower_case = false;
  rule.ngram = false;
  for (const Json::Value& step : steps) {
    if (step == "tolower" && !rule.ngram) {
      rule.lower_case = true;
    } else if (step == "ngram") {
      rule.ngram = true;
    } else {
      Reject(member, "may hold \"tolower\" and, after it, \"ngram\"");
    }
  }
}

FieldRule ParseRule(FieldRule rule, const Json::Value& members, const std::string& where) {
  if (!members.isObject()) Reject(where, "must be an object");
  for (auto it = members.begin(); it != members.end(); ++it) {
    const std::string name = it.name();
    const std::string member = where + "." + name;
    if (name == "type") {
      CheckType(*it, member);
    } else if (name == "analyzer") {
      rule.analyzer = ParseAnalyzer(*it, member);
    } else if (name == "required") {
      SetFlag(rule.required, *it, member);
    } else if (name == "stored") {
      SetFlag(rule.stored, *it, member);
    } else if (name == "_all") {
      SetFlag(rule.in_all, *it, member);
    } else if (name == "preprocess") {
      SetPreprocess(rule, *it, member);
    } else {
      Reject(member, "is not known");
    }
  }
  return rule;
}

std::string ParseKeyField(const Json::Value& value) {
  if (!value.isString() || value.asString().empty()) {
    Reject("mappings.property_id", "must be the name of the key member");
  }
  return value.asString();
}

}  // namespace

Mapping Mapping::Parse(const Json::Value& mappings) {
  if (!mappings.isObject()) Reject("mappings", "must be an object");
  for (const std::string& name : mappings.getMemberNames()) {
    if (name != "property_id" && name != "default" && name != "properties") {
      Reject("mappings." + name, "is not known");
    }
  }

  Mapping mapping;
  mapping.key_field_ = ParseKeyField(mappings["property_id"]);
  if (mappings.isMember("default")) {
    mapping.default_rule_ = ParseRule({}, mappings["default"], "mappings.default");
  }
  if (!mappings.isMember("properties")) return mapping;

  const Json::Value& properties = mappings["properties"];
  if (!properties.isObject()) Reject("mappings.properties", "must be an object");
  if (properties.size() > kMaxProperties) {
    Reject("mappings.properties",
           "must have at most " + std::to_string(kMaxProperties) + " members");
  }
  for (auto it = properties.begin(); it != properties.end(); ++it) {
    const std::string member = "mappings.properties." + it.name();
    if (it.name().empty() || it.name().size() > kMaxNameBytes) {
      Reject(member, "must have a name of 1 to " + std::to_string(kMaxNameBytes) + " bytes");
    }
    mapping.fields_.emplace(it.name(), ParseRule(mapping.default_rule_, *it, member));
  }
  return mapping;
}

const FieldRule& Mapping::RuleOf(const std::string& member) const {
  const auto found = fields_.find(member);
  return found == fields_.end() ? default_rule_ : found->second;
}

}  // namespace searchd
