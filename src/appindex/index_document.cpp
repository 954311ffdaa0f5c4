// Search documents: one record in one language.
#include <algorithm>

#include "appindex/error.h"
#include "appindex/index_mgr_internal.h"
#include "appindex/utilities/json_helpers.h"
#include "appindex/utils_internal.h"
#include "common/check.h"
#include "common/json_strict.h"

namespace velkor::appindex {
namespace {

constexpr int kMaxWeight = 5;

// Longer than any message to the search daemon. Weights and long texts can make a small descriptor
// ask for more than there is memory; what is left out could not be sent.
constexpr std::size_t kMaxKeywordBytes = std::size_t{16} * 1024 * 1024;

struct Keyword {
  std::string ref;
  int weight = 1;
};

Keyword ReadKeyword(const Json::Value& element) {
  Keyword keyword;
  if (!element.isObject()) {
    keyword.ref = element.asString();
    return keyword;
  }
  GetJsonValue(keyword.ref, element, "text", true);
  GetStrictInt(keyword.weight, element, "weight", false);
  return keyword;
}

// The keyword in the user's language and in English; its weight is how often the pair is repeated.
void AppendKeyword(std::string& text, StringPool& pool, const std::string& lang,
                   const Keyword& keyword) {
  if (text.size() > kMaxKeywordBytes) return;
  const std::string pair =
      pool.GetString(lang, keyword.ref) + " " + pool.GetString(kEnglish, keyword.ref) + " ";
  for (int i = 0; i < std::min(keyword.weight, kMaxWeight); ++i) text += pair;
}

std::string MakeKeywordText(StringPool& pool, const std::string& lang,
                            const Json::Value& keywords) {
  std::string text;
  for (const Json::Value& element : keywords) {
    try {
      AppendKeyword(text, pool, lang, ReadKeyword(element));
    } catch (const Error&) {
      LogFailureText({kIndexMgr, 225, "Add"}, "Malformed keywords: " + toString(keywords));
    }
  }
  return text;
}

void SelectTextsRoot(StringPool& pool, const Json::Value& record) {
  const std::string conf_path = record["path"].asString();
  const Json::Value& stringset = record["stringset"];
  if (stringset.isString()) {
    pool.SetTextsRootByStringSet(conf_path, stringset.asString());
  } else {
    pool.SetTextsRootByConfPath(conf_path);
  }
}

}  // namespace

Json::Value MakeDocument(StringPool& pool, const std::string& lang, const Json::Value& record) {
  SelectTextsRoot(pool, record);
  const std::string keyword_text = MakeKeywordText(pool, lang, record["keywords"]);
  const std::string title_ref = record["title"].asString();

  Json::Value doc(Json::objectValue);
  doc["id"] = record["id"];
  doc["owner"] = record["owner"];
  doc["title"] = pool.GetString(lang, title_ref);
  doc["desc"] = pool.GetString(lang, record["desc"].asString());
  doc["keywords"] = pool.GetString(kEnglish, title_ref) + " " + keyword_text;
  doc["search_title"] = doc["title"];
  return doc;
}

}  // namespace velkor::appindex
