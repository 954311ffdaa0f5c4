#include "tool/lint/texts.h"

#include <set>

#include "appindex/device_identity.h"
#include "device/tovo_webui.h"

namespace tool::lint {

Reference::Reference(const std::string& text)
    : section(text.substr(0, text.find(':'))), key(text.substr(text.find(':') + 1)) {}

Texts::Texts(const std::string& root) {
  if (root.empty()) return;
  for (const std::string& lang : velkor::appindex::GetSupportedLangs()) {
    Json::Value strings = TOVO::PMX::LocalizedStringParser::ParseTexts(root + lang);
    if (strings.isObject() && !strings.empty()) langs_[lang] = std::move(strings);
  }
}

bool Texts::HasSection(const std::string& lang, const std::string& section) const {
  const auto strings = langs_.find(lang);
  return strings != langs_.end() && strings->second[section].isObject();
}

std::vector<std::string> Texts::Sections() const {
  std::set<std::string> sections;
  for (const auto& [lang, strings] : langs_) {
    for (const std::string& section : strings.getMemberNames()) sections.insert(section);
  }
  return {sections.begin(), sections.end()};
}

TextState Texts::StateOf(const std::string& lang, const Reference& reference) const {
  if (!HasLanguage(lang)) return TextState::kNoLanguage;
  if (!HasSection(lang, reference.section)) return TextState::kNoSection;
  const Json::Value& section = langs_.at(lang)[reference.section];
  if (!section.isMember(reference.key)) return TextState::kNoKey;
  return section[reference.key].asString().empty() ? TextState::kEmpty : TextState::kPresent;
}

std::string Texts::TextOf(const std::string& lang, const Reference& reference) const {
  if (StateOf(lang, reference) != TextState::kPresent) return "";
  return langs_.at(lang)[reference.section][reference.key].asString();
}

}  // namespace tool::lint
