#include "tool/lint/output.h"

#include "tool/lint/package.h"
#include "tool/output.h"

namespace tool::lint {
namespace {

std::string Place(const Finding& finding) {
  std::string place = DisplayPath(finding.file);
  if (finding.position.line > 0) {
    place +=
        ":" + std::to_string(finding.position.line) + ":" + std::to_string(finding.position.column);
  }
  return place;
}

void Replace(std::string& text, const std::string& what, const std::string& by) {
  for (std::size_t at = text.find(what); at != std::string::npos;
       at = text.find(what, at + by.size())) {
    text.replace(at, what.size(), by);
  }
}

std::string Escaped(std::string text) {
  Replace(text, "%", "%25");
  Replace(text, "\r", "%0D");
  Replace(text, "\n", "%0A");
  return text;
}

std::string EscapedProperty(std::string text) {
  text = Escaped(std::move(text));
  Replace(text, ":", "%3A");
  Replace(text, ",", "%2C");
  return text;
}

const char* StateName(TextState state) {
  switch (state) {
    case TextState::kPresent:
      return "present";
    case TextState::kNoLanguage:
      return "no-language";
    case TextState::kNoSection:
      return "no-section";
    case TextState::kNoKey:
      return "missing";
    case TextState::kEmpty:
      return "empty";
  }
  return "present";
}

Json::Value ToJson(const Finding& finding) {
  Json::Value json(Json::objectValue);
  json["tag"] = finding.tag;
  json["severity"] = SeverityName(finding.severity);
  json["file"] = DisplayPath(finding.file);
  json["line"] = Json::UInt64(finding.position.line);
  json["column"] = Json::UInt64(finding.position.column);
  json["pointer"] = finding.pointer;
  json["message"] = finding.message;
  json["languages"] = Json::Value(Json::arrayValue);
  for (const std::string& lang : finding.languages) json["languages"].append(lang);
  return json;
}

Json::Value ToJson(const TextTable& table) {
  Json::Value json(Json::objectValue);
  json["file"] = DisplayPath(table.file);
  json["root"] = DisplayPath(table.root);
  json["references"] = Json::Value(Json::objectValue);
  for (const TextRow& row : table.rows) {
    Json::Value& states = json["references"][row.reference];
    for (const auto& [lang, state] : row.states) {
      states[lang] = row.untranslated.count(lang) > 0 ? "untranslated" : StateName(state);
    }
  }
  return json;
}

}  // namespace

Counts Count(const std::vector<Finding>& findings) {
  Counts counts;
  for (const Finding& finding : findings) {
    if (finding.severity == Severity::kError) ++counts.errors;
    if (finding.severity == Severity::kWarning) ++counts.warnings;
    if (finding.severity == Severity::kNote) ++counts.notes;
  }
  return counts;
}

void WriteText(std::ostream& out, const Outcome& outcome, bool emphasise) {
  for (const Finding& finding : outcome.findings) {
    const Look look = finding.severity == Severity::kNote ? Look::kFaint : Look::kBold;
    out << OneLine(Place(finding)) << ": "
        << Styled(SeverityName(finding.severity), look, emphasise) << ": "
        << OneLine(finding.message) << " [" << finding.tag << "]\n";
  }
}

void WriteAnnotations(std::ostream& out, const Outcome& outcome) {
  for (const Finding& finding : outcome.findings) {
    const bool is_note = finding.severity == Severity::kNote;
    out << "::" << (is_note ? "notice" : SeverityName(finding.severity))
        << " file=" << EscapedProperty(DisplayPath(finding.file));
    if (finding.position.line > 0) {
      out << ",line=" << finding.position.line << ",col=" << finding.position.column;
    }
    out << ",title=" << EscapedProperty(finding.tag) << "::" << Escaped(finding.message) << "\n";
  }
}

Json::Value ToJson(const Outcome& outcome) {
  Json::Value json(Json::objectValue);
  for (const char* list : {"checked", "findings", "texts"}) {
    json[list] = Json::Value(Json::arrayValue);
  }
  for (const std::string& file : outcome.checked) json["checked"].append(DisplayPath(file));
  for (const Finding& finding : outcome.findings) json["findings"].append(ToJson(finding));
  for (const TextTable& table : outcome.tables) json["texts"].append(ToJson(table));
  const Counts counts = Count(outcome.findings);
  json["errors"] = Json::UInt64(counts.errors);
  json["warnings"] = Json::UInt64(counts.warnings);
  json["notes"] = Json::UInt64(counts.notes);
  return json;
}

Json::Value ToJson(const Tag& tag) {
  Json::Value json(Json::objectValue);
  json["tag"] = tag.name;
  json["severity"] = SeverityName(tag.severity);
  json["schema"] = tag.in_schema;
  json["summary"] = tag.summary;
  json["explanation"] = tag.explanation;
  return json;
}

}  // namespace tool::lint
