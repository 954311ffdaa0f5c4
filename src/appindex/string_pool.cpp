#include "appindex/string_pool.h"

#include <cxxabi.h>

#include <vector>

#include "appindex/device_identity.h"
#include "appindex/error.h"
#include "appindex/string_pool_internal.h"
#include "appindex/utilities/file_utils.h"
#include "appindex/utilities/json_helpers.h"
#include "appindex/utils_internal.h"
#include "common/check.h"
#include "common/dir_reader.h"
#include "common/pattern.h"
#include "common/searched_dirs.h"
#include "device/tovo_webui.h"

namespace velkor::appindex {
namespace {

constexpr char kBuiltInTextsRoot[] = "/usr/tovo/tovoman/webman/texts/";
constexpr char kTextsDir[] = "texts";
constexpr int kMaxSearchDepth = 5;

template <typename Texts>
void FillTexts(Texts& texts, const Json::Value& section) {
  texts.reserve(section.size());
  for (auto text = section.begin(); text != section.end(); ++text) {
    auto& entry = texts[text.name()];
    if (isJsonType<std::string>(*text)) entry = text->asString();
  }
}

template <typename Sections>
void FillSections(Sections& sections, const Json::Value& strings) {
  for (auto section = strings.begin(); section != strings.end(); ++section) {
    auto& entry = sections[section.name()];
    // Null counts as a section without keys.
    if (section->isObject() || section->isNull()) FillTexts(entry.emplace(), *section);
  }
}

std::string PackageTextsRoot(const std::string& conf_path) {
  std::vector<std::string> package;
  if (!SearchPattern("^(/var/packages/[^/]*)", conf_path, package)) {
    throw Error(Error::kGeneralError, "Malformed conf path: " + conf_path);
  }
  std::string root;
  if (!FindPkgTextRoot(root, package[0] + "/", 0)) {
    throw Error(Error::kTextsRootError, "Cannot find text root: " + conf_path);
  }
  return root;
}

bool FindTextRootIn(std::string& out, const std::string& find_dir, int depth,
                    SearchedDirs& searched) {
  DirReader dir(find_dir);
  CheckOrThrow(dir.IsOpen(), {"string_pool", 42, "FindPkgTextRoot"},
               "nullptr == (dir = opendir(find_dir.c_str()))", Error::kGeneralError,
               [&find_dir] { return "opendir failed, path=" + find_dir; });
  if (searched.Has(dir, depth)) return false;
  std::string name;
  while (dir.Next(name)) {
    const std::string child = find_dir + name + "/";
    if (!IsDirExist(child, true)) continue;
    if (name == kTextsDir) {
      out = child;
      return true;
    }
    if (depth >= kMaxSearchDepth) continue;
    if (dir.MayBeLink()) searched.FollowLink();
    if (FindTextRootIn(out, child, depth + 1, searched)) return true;
  }
  searched.Add(dir, depth);
  return false;
}

}  // namespace

bool FindPkgTextRoot(std::string& out, const std::string& find_dir, int depth) {
  SearchedDirs searched;
  return FindTextRootIn(out, find_dir, depth, searched);
}

LanguagePack::LanguagePack(const std::string& texts_root) {
  for (const std::string& lang : GetSupportedLangs()) {
    const Json::Value strings = TOVO::PMX::LocalizedStringParser::ParseTexts(texts_root + lang);
    if (strings.size() == 0) continue;  // a scalar too, which empty() would not tell
    Sections& sections = langs_[lang];
    if (strings.isObject()) FillSections(sections, strings);
  }
}

std::string LanguagePack::GetString(const std::string& lang, const std::string& section,
                                    const std::string& key) const {
  const auto placeholder = [&] { return section + ":" + key; };
  auto sections = langs_.find(lang);
  if (sections == langs_.end()) sections = langs_.find(kEnglish);
  if (sections == langs_.end()) return placeholder();
  const auto texts = sections->second.find(section);
  if (texts == sections->second.end() || !texts->second) return placeholder();
  const auto text = texts->second->find(key);
  if (text == texts->second->end()) return "";
  return text->second ? *text->second : placeholder();
}

StringPool::StringPool() : texts_root_(kBuiltInTextsRoot) {}

void StringPool::SetTextsRootByConfPath(const std::string& conf_path) {
  const auto found = roots_.find(conf_path);
  if (found != roots_.end()) {
    texts_root_ = found->second;
    return;
  }
  try {
    texts_root_ = PackageTextsRoot(conf_path);
  } catch (const abi::__forced_unwind&) {
    throw;  // the thread is being cancelled
  } catch (...) {
    // Built-in modules lie outside "/var/packages/": for them this is the ordinary way.
    texts_root_ = kBuiltInTextsRoot;
  }
  roots_.emplace(conf_path, texts_root_);
}

void StringPool::SetTextsRootByStringSet(const std::string& conf_path,
                                         const std::string& stringset) {
  texts_root_ = Dirname(conf_path) + "/" + stringset + "/";
}

std::shared_ptr<LanguagePack> StringPool::GetLangPack(const std::string& texts_root) {
  const auto found = packs_.find(texts_root);
  if (found != packs_.end()) return found->second;
  auto pack = std::make_shared<LanguagePack>(texts_root);
  packs_.emplace(texts_root, pack);
  return pack;
}

std::string StringPool::GetString(const std::string& lang, const std::string& section,
                                  const std::string& key) {
  if (pack_ == nullptr || pack_root_ != texts_root_) {
    const LanguagePack* pack = GetLangPack(texts_root_).get();
    pack_root_ = texts_root_;
    pack_ = pack;
  }
  return pack_->GetString(lang, section, key);
}

std::string StringPool::GetString(const std::string& lang, const std::string& ref) {
  const std::string::size_type colon = ref.find(':');
  if (colon == std::string::npos) return ref;
  return GetString(lang, ref.substr(0, colon), ref.substr(colon + 1));
}

}  // namespace velkor::appindex
