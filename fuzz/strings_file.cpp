// A file of translated texts: what the host reads of it, and how the library and the linter answer
// from it.
#include <json/value.h>

#include <string>

#include "appindex/string_pool.h"
#include "device/tovo_webui.h"
#include "fuzz/memory_files.h"
#include "fuzz/target.h"
#include "tool/lint/texts.h"

namespace fuzz {
namespace {

constexpr char kRoot[] = "/texts/";
constexpr char kFile[] = "/texts/ger/strings";

Json::Value Parse(const std::string& content) {
  MemoryFiles()[kFile] = content;
  return TOVO::PMX::LocalizedStringParser::ParseTexts("/texts/ger");
}

std::string Quoted(const std::string& text) {
  std::string quoted = "\"";
  for (const char c : text) {
    if (c == '"' || c == '\\') quoted += '\\';
    quoted += c == '\n' ? "\\n" : std::string(1, c);
  }
  return quoted + '"';
}

std::string Written(const Json::Value& sections) {
  std::string content;
  for (const std::string& section : sections.getMemberNames()) {
    content += "[" + section + "]\n";
    for (const std::string& key : sections[section].getMemberNames()) {
      content += key + "=" + Quoted(sections[section][key].asString()) + "\n";
    }
  }
  return content;
}

void IsTextsOrNothing(const Json::Value& sections) {
  Require(sections.isNull() || sections.isObject(), "a file gives sections or nothing");
  for (auto section = sections.begin(); section != sections.end(); ++section) {
    Require(!section.name().empty(), "a section has a name");
    Require(section->isObject() && !section->empty(), "a section holds texts");
    for (auto text = section->begin(); text != section->end(); ++text) {
      Require(!text.name().empty(), "a text has a key");
      Require(text->isString(), "a text is a text");
    }
  }
}

void AnswersAsItStands(const Json::Value& sections) {
  const velkor::appindex::LanguagePack pack(kRoot);
  const tool::lint::Texts linted(kRoot);
  Require(linted.HasLanguage("ger") == !sections.empty(), "the linter sees the same languages");
  for (auto section = sections.begin(); section != sections.end(); ++section) {
    for (auto text = section->begin(); text != section->end(); ++text) {
      Require(pack.GetString("ger", section.name(), text.name()) == text->asString(),
              "the library answers with the text");
    }
    // No key holds "=", which ends it.
    Require(pack.GetString("ger", section.name(), "=").empty(), "a missing key is an empty text");
    Require(pack.GetString("fre", section.name(), "=") == section.name() + ":=",
            "a language without texts and without English shows the reference");
  }
}

}  // namespace

void Try(const std::string& input) {
  const Json::Value sections = Parse(input);
  IsTextsOrNothing(sections);
  AnswersAsItStands(sections);
  Require(Parse(Written(sections)) == sections, "texts that are written and read are the same");
}

}  // namespace fuzz
