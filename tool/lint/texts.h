// The texts of one texts root, and how they answer a reference.
#pragma once

#include <json/value.h>

#include <map>
#include <string>
#include <vector>

namespace tool::lint {

enum class TextState {
  kPresent,
  kNoLanguage,  // the language has no texts at all: the English ones serve
  kNoSection,   // shown as "section:key"
  kNoKey,       // shown as nothing
  kEmpty,       // likewise
};

// A reference "section:key" of a descriptor.
struct Reference {
  std::string section;
  std::string key;

  // Whether a text is a reference and not literal: it has a colon.
  static bool Is(const std::string& text) { return text.find(':') != std::string::npos; }
  explicit Reference(const std::string& text);
};

class Texts {
 public:
  // Loads every language below `root`, which ends in "/", as the library does; nothing below an
  // empty one.
  explicit Texts(const std::string& root);

  bool HasLanguage(const std::string& lang) const { return langs_.count(lang) > 0; }
  bool HasSection(const std::string& lang, const std::string& section) const;
  std::vector<std::string> Sections() const;  // of all languages

  // What the language itself has for a reference, without the English that may serve for it.
  TextState StateOf(const std::string& lang, const Reference& reference) const;

  // The text, empty unless the state is kPresent.
  std::string TextOf(const std::string& lang, const Reference& reference) const;

 private:
  std::map<std::string, Json::Value> langs_;  // those that have texts
};

// Texts roots, each loaded once.
class TextsCache {
 public:
  // An empty root has no texts. Valid as long as the cache.
  const Texts& Of(const std::string& root) { return texts_.try_emplace(root, root).first->second; }

 private:
  std::map<std::string, Texts> texts_;
};

}  // namespace tool::lint
