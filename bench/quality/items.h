// What a device root has to offer in one language, and the daemon's index filled with it.
#pragma once

#include <json/value.h>

#include <string>
#include <vector>

#include "appindex/string_pool.h"

namespace bench::quality {

struct Item {
  std::string id;
  std::string title;
  std::string english_title;
  std::vector<std::string> keywords;  // in the language, then in English, each text once
  Json::Value document;
};

// The records of every descriptor on the device.
std::vector<Json::Value> FindRecords();

// The records as items in language `lang`. Of records with the same id the last one holds, as in
// the index.
std::vector<Item> ItemsOf(velkor::appindex::StringPool& pool, const std::string& lang,
                          const std::vector<Json::Value>& records);

// Makes the index of language `lang` anew, with exactly these items, committed. Throws
// velkor::Error as the library's calls do.
void FillIndex(const std::string& lang, const std::vector<Item>& items);

}  // namespace bench::quality
