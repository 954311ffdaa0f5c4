/// @file
/// The translated texts of applications.
///
/// A texts root is a directory, written with a "/" at its end, that holds one directory per
/// language code. Objects of these classes take no lock: a StringPool is used by one thread at a
/// time. A LanguagePack never changes and may be shared.
#pragma once

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <unordered_map>

#include "appindex/export.h"

namespace velkor::appindex {

/// The texts of one texts root in every language.
class TEISEIGATRO_EXPORT LanguagePack {
 public:
  /// Loads every supported language that has texts below `texts_root` (ending in "/"). Blocks on
  /// the files. Lets an exception of the device's parser through.
  explicit LanguagePack(const std::string& texts_root);

  /// The text of `key` in `section`, in language `lang`. Where the language has no texts at all,
  /// the English ones serve. Where the language (or English in its place) has texts but not that
  /// section, or nothing there can be made into text, the answer is "section:key" itself; where it
  /// has the section but not the key, the answer is empty. Throws nothing but what memory
  /// exhaustion throws.
  std::string GetString(const std::string& lang, const std::string& section,
                        const std::string& key) const;

 private:
  // By key; nothing where the value cannot be made into text.
  using Texts = std::unordered_map<std::string, std::optional<std::string>>;
  // By section; nothing where it cannot hold texts.
  using Sections = std::unordered_map<std::string, std::optional<Texts>>;

  std::map<std::string, Sections> langs_;  // by language code; only those that have texts
};

/// Resolves the string references of descriptors. Set the texts root for a descriptor first, with
/// one of the two SetTextsRoot operations, then ask for its texts.
class TEISEIGATRO_EXPORT StringPool {
 public:
  /// The texts root is that of the built-in modules, "/usr/tovo/tovoman/webman/texts/".
  StringPool();

  /// Sets the texts root for the descriptor `conf_path`: the first directory named "texts" found
  /// below its package, or the built-in modules' root when there is none, when the search fails or
  /// when the descriptor does not lie in "/var/packages/". What was found for a path is kept and
  /// never searched again. Blocks on the directories. Does not throw; a directory that cannot be
  /// read is logged.
  void SetTextsRootByConfPath(const std::string& conf_path);

  /// Sets the texts root to the directory `stringset` beside the descriptor `conf_path`, unchecked.
  void SetTextsRootByStringSet(const std::string& conf_path, const std::string& stringset);

  /// The pack of a texts root, loaded on first use and kept for the life of the pool. Lets an
  /// exception of the device's parser through, and keeps nothing then.
  std::shared_ptr<LanguagePack> GetLangPack(const std::string& texts_root);

  /// LanguagePack::GetString of the current texts root's pack.
  std::string GetString(const std::string& lang, const std::string& section,
                        const std::string& key);

  /// The text that a reference "section:key" stands for; the key may hold more colons. A text
  /// without a colon stands for itself in every language.
  std::string GetString(const std::string& lang, const std::string& ref);

 private:
  std::map<std::string, std::string> roots_;                    // by descriptor path
  std::map<std::string, std::shared_ptr<LanguagePack>> packs_;  // by texts root
  std::string texts_root_;
  const LanguagePack* pack_ = nullptr;  // the one that was asked last, of packs_
  std::string pack_root_;
};

}  // namespace velkor::appindex
