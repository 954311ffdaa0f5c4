#include "bench/quality/items.h"

#include <algorithm>
#include <utility>

#include "appindex/elastic_control.h"
#include "appindex/error.h"
#include "appindex/index_mgr_internal.h"
#include "appindex/utils_internal.h"

namespace bench::quality {
namespace {

using velkor::appindex::StringPool;

void AddOnce(std::vector<std::string>& texts, std::string text) {
  if (std::find(texts.begin(), texts.end(), text) == texts.end()) texts.push_back(std::move(text));
}

// Only what the document holds: a malformed keyword is left out, one of no weight too.
void AppendKeywords(Item& item, StringPool& pool, const std::string& lang,
                    const Json::Value& keywords) {
  const std::string indexed = item.document["keywords"].asString();
  for (const Json::Value& keyword : keywords) {
    const Json::Value& ref = keyword.isObject() ? keyword["text"] : keyword;
    if (!ref.isString()) continue;
    const std::string text = pool.GetString(lang, ref.asString());
    if (!text.empty() && indexed.find(text) != std::string::npos) AddOnce(item.keywords, text);
  }
}

Item MakeItem(StringPool& pool, const std::string& lang, const Json::Value& record) {
  using velkor::appindex::kEnglish;
  Item item;
  item.document = velkor::appindex::MakeDocument(pool, lang, record);  // selects the texts too
  item.id = item.document["id"].asString();
  item.title = item.document["title"].asString();
  item.english_title = pool.GetString(kEnglish, record["title"].asString());
  AppendKeywords(item, pool, lang, record["keywords"]);
  AppendKeywords(item, pool, kEnglish, record["keywords"]);
  return item;
}

}  // namespace

std::vector<Json::Value> FindRecords() {
  std::vector<Json::Value> records;
  for (const std::string& conf_path : velkor::appindex::FindIndexConf()) {
    for (const Json::Value& record : velkor::appindex::FindIndexables(conf_path)) {
      records.push_back(record);
    }
  }
  return records;
}

std::vector<Item> ItemsOf(StringPool& pool, const std::string& lang,
                          const std::vector<Json::Value>& records) {
  std::vector<Item> items;
  for (const Json::Value& record : records) {
    Item item = MakeItem(pool, lang, record);
    const auto same = std::find_if(items.begin(), items.end(),
                                   [&](const Item& other) { return other.id == item.id; });
    if (same == items.end()) {
      items.push_back(std::move(item));
    } else {
      *same = std::move(item);
    }
  }
  return items;
}

void FillIndex(const std::string& lang, const std::vector<Item>& items) {
  namespace elastic = velkor::appindex::elastic;
  try {
    elastic::AppIndexDelete(lang);
  } catch (const velkor::Error& error) {
    if (error.code != velkor::Error::kDaemonIndexMissing) throw;
  }
  elastic::AppIndexCreate(lang);
  for (const Item& item : items) elastic::IndexUpsert(lang, item.document);
  elastic::IndexCommit(lang);
}

}  // namespace bench::quality
