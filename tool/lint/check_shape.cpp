// The rules of the schema. A test compares the two on many descriptors: change them together.
#include <cmath>

#include "tool/lint/checks.h"

namespace tool::lint {
namespace {

constexpr int kLeastWeight = 1;
constexpr int kMostWeight = 5;

struct MemberRule {
  const char* name;
  void (*check)(Report& report, const Node& value, const char* name);
  const char* missing_tag = nullptr;  // set for a member that must be there
};

const char* TypeName(const Json::Value& value) {
  switch (value.type()) {
    case Json::nullValue:
      return "null";
    case Json::intValue:
    case Json::uintValue:
    case Json::realValue:
      return "a number";
    case Json::stringValue:
      return "a text";
    case Json::booleanValue:
      return "true or false";
    case Json::arrayValue:
      return "a list";
    case Json::objectValue:
      return "an object";
  }
  return "something else";
}

void ReportType(Report& report, const Node& at, const std::string& what, const char* wanted) {
  report.Add("wrong-type", at, what + " must be " + wanted + ", not " + TypeName(*at.value));
}

void CheckMembers(Report& report, const Node& object, const char* what,
                  const std::vector<MemberRule>& rules) {
  for (const std::string& name : object.value->getMemberNames()) {
    const Node member = object.Member(name);
    const MemberRule* known = nullptr;
    for (const MemberRule& rule : rules) {
      if (name == rule.name) known = &rule;
    }
    if (known != nullptr) {
      known->check(report, member, known->name);
    } else {
      report.Add("unknown-member", member,
                 Quoted(name) + " means nothing in " + what + " and is ignored");
    }
  }
  for (const MemberRule& rule : rules) {
    if (rule.missing_tag != nullptr && !object.Has(rule.name)) {
      report.Add(rule.missing_tag, object, std::string(what) + " has no \"" + rule.name + "\"");
    }
  }
}

void CheckText(Report& report, const Node& value, const char* name) {
  if (!value.value->isString()) ReportType(report, value, Quoted(name), "a text");
}

void CheckNonEmptyText(Report& report, const Node& value, const char* name) {
  CheckText(report, value, name);
  if (value.value->isString() && value.value->asString().empty()) {
    report.Add("empty-member", value, Quoted(name) + " is empty");
  }
}

// Calls `check` for each element of what must be a list.
void CheckList(Report& report, const Node& list, const char* name,
               void (*check)(Report&, const Node&)) {
  if (!list.value->isArray()) {
    ReportType(report, list, Quoted(name), "a list");
    return;
  }
  for (Json::ArrayIndex i = 0; i < list.value->size(); ++i) check(report, list.Element(i));
}

void CheckName(Report& report, const Node& name) {
  if (!name.value->isString()) ReportType(report, name, "a name in a filter", "a text");
}

void CheckNames(Report& report, const Node& names, const char* name) {
  CheckList(report, names, name, CheckName);
}

void CheckFilter(Report& report, const Node& filter, const char* name) {
  if (!filter.value->isObject()) {
    ReportType(report, filter, Quoted(name), "an object");
    return;
  }
  static const std::vector<MemberRule> rules = {{"model", CheckNames}, {"platform", CheckNames}};
  CheckMembers(report, filter, "a filter", rules);
}

void CheckWeight(Report& report, const Node& weight, const char* name) {
  const Json::Value& value = *weight.value;
  if (!value.isNumeric() || std::floor(value.asDouble()) != value.asDouble()) {
    ReportType(report, weight, Quoted(name), "a whole number from 1 to 5");
    return;
  }
  if (!value.isInt()) {
    report.Add("weight-range", weight, "a weight of more than 31 bits counts as 1");
  } else if (value.asDouble() < kLeastWeight) {
    report.Add("weight-range", weight, "a weight below 1 leaves the keyword out");
  } else if (value.asDouble() > kMostWeight) {
    report.Add("weight-range", weight, "a weight above 5 has no more effect than 5");
  }
}

void CheckKeyword(Report& report, const Node& keyword) {
  if (keyword.value->isObject()) {
    static const std::vector<MemberRule> rules = {{"text", CheckNonEmptyText, "missing-member"},
                                                  {"weight", CheckWeight}};
    CheckMembers(report, keyword, "a keyword", rules);
  } else if (keyword.value->isString()) {
    CheckNonEmptyText(report, keyword, "keyword");
  } else {
    ReportType(report, keyword, "a keyword", "a text or an object with \"text\"");
  }
}

void CheckKeywords(Report& report, const Node& keywords, const char* name) {
  CheckList(report, keywords, name, CheckKeyword);
}

void CheckModule(Report& report, const Node& module) {
  if (!module.value->isObject()) {
    ReportType(report, module, "a module", "an object");
    return;
  }
  static const std::vector<MemberRule> rules = {
      {"params", CheckNonEmptyText, "params-missing"},
      {"title", CheckNonEmptyText, "missing-member"},
      {"desc", CheckText},
      {"keywords", CheckKeywords},
      {"enable", CheckFilter},
      {"disable", CheckFilter},
  };
  CheckMembers(report, module, "a module", rules);
}

void CheckModules(Report& report, const Node& modules, const char* name) {
  CheckList(report, modules, name, CheckModule);
}

void CheckEntry(Report& report, const Node& entry) {
  if (!entry.value->isObject()) {
    ReportType(report, entry, "an entry", "an object");
    return;
  }
  static const std::vector<MemberRule> rules = {
      {"$schema", CheckText},
      {"app", CheckNonEmptyText, "missing-member"},
      {"title", CheckNonEmptyText, "missing-member"},
      {"desc", CheckText},
      {"keywords", CheckKeywords},
      {"stringset", CheckNonEmptyText},
      {"enable", CheckFilter},
      {"disable", CheckFilter},
      {"modules", CheckModules},
  };
  CheckMembers(report, entry, "an entry", rules);
}

}  // namespace

void CheckShape(Report& report, const Json::Value& root) {
  const Node top{&root, ""};
  if (root.isObject()) {
    CheckEntry(report, top);
  } else if (!root.isArray()) {
    ReportType(report, top, "a descriptor", "an entry or a list of entries");
  } else if (root.empty()) {
    report.Add("no-entries", top, "the list has no entries: there is nothing to be found");
  }
  if (root.isArray()) {
    for (Json::ArrayIndex i = 0; i < root.size(); ++i) CheckEntry(report, top.Element(i));
  }
}

void CheckDescriptions(Report& report, const Json::Value& root) {
  for (const Item& item : ItemsOf(root)) {
    const Json::Value& desc = (*item.node.value)["desc"];
    if (desc.isNull() || (desc.isString() && desc.asString().empty())) {
      report.Add("description-missing", item.node,
                 std::string(item.is_module ? "the module" : "the entry") +
                     " has no \"desc\": a hit shows its title alone");
    }
  }
}

}  // namespace tool::lint
