// What a person types, with the language of the index and the page that is asked for.
//
// The first byte of an input chooses the index, the second how many hits are passed over, the third
// how many are wanted; the rest is the query.
#include <json/value.h>

#include <algorithm>
#include <cstddef>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "appindex/utilities/json_helpers.h"
#include "fuzz/target.h"
#include "host/searchd/json_text.h"
#include "tests/unit/searchd/memory_index.h"
#include "tool/emphasis.h"

namespace fuzz {
namespace {

constexpr std::size_t kHeadBytes = 3;
constexpr unsigned kMostOnPage = 8;

constexpr const char* kLanguages[] = {"enu", "ger", "fre", "jpn", "chs", "krn", "tha", "trk"};
constexpr std::size_t kLanguageCount = sizeof(kLanguages) / sizeof(kLanguages[0]);

constexpr const char* kTitles[] = {
    "Photo Album",  "Photo Frame",    "Fotoalbum",        "Übersicht",      "L'album photo",
    "Œuvres d'été", "写真アルバム",   "フォト・ビューア", "照片管理器",     "사진 앨범",
    "อัลบั้มรูปภาพ",    "Işık İletişimi", "IPv6 & DNS",       "C++ (compiler)", "A.B.C. 3.14",
    "The Backup",   "Backup Backup",  "emoji 🎵 music",    "ﬁle ﬂow ½",      "x"};

std::unique_ptr<searchd::MemoryIndex> MakeIndex(const std::string& language) {
  auto index = std::make_unique<searchd::MemoryIndex>(language);
  int number = 0;
  for (const char* title : kTitles) {
    const std::string id = "App" + std::to_string(++number);
    index->Add(id, title, std::string(title) + " photo media files", "Keeps pictures and music.");
    index->Add(id + "?page=1", std::string(title) + " settings", "", title, id);
  }
  return index;
}

searchd::MemoryIndex& IndexOf(unsigned char choice) {
  static std::map<std::size_t, std::unique_ptr<searchd::MemoryIndex>> indexes;
  const std::size_t number = choice % kLanguageCount;
  auto& index = indexes[number];
  if (!index) index = MakeIndex(kLanguages[number]);
  return *index;
}

// As the query of a client arrives in the daemon: UTF-8 without NUL.
std::string AsItArrives(std::string query) {
  std::replace(query.begin(), query.end(), '\0', ' ');
  return searchd::ParseJson(velkor::toString(Json::Value(query))).asString();
}

void IsInOrder(const searchd::Found& found) {
  Require(found.total == found.hits.size(), "all hits are counted");
  Require(found.hits.empty() == found.matched.empty(), "hits are found by one of the steps");
  double before = found.hits.empty() ? 0 : found.hits[0]["score"].asDouble();
  for (const Json::Value& hit : found.hits) {
    const double score = hit["score"].asDouble();
    Require(score > 0 && score <= before, "what is worth more comes first");
    before = score;
  }
}

// The page is that part of all hits that it says it is, explained or not.
void IsPageOf(const searchd::Found& all, searchd::Found page, unsigned offset, unsigned limit) {
  Require(page.total == all.total && page.matched == all.matched && page.cut == all.cut,
          "a page says of the search what all hits say");
  Json::Value expected(Json::arrayValue);
  for (unsigned at = offset; at < all.hits.size() && at < offset + limit; ++at) {
    expected.append(all.hits[at]);
  }
  for (Json::Value& hit : page.hits) {
    Require(hit["explain"].isArray() && !hit["explain"].empty(), "a hit is explained");
    hit.removeMember("explain");
  }
  Require(page.hits == expected, "a page holds the hits from its first to its last");
}

std::string WithoutEmphasis(std::string text) {
  for (std::size_t at = 0; (at = text.find('\033', at)) != std::string::npos;) {
    text.erase(at, text.find('m', at) - at + 1);
  }
  return text;
}

// With what was typed and with what was found instead.
void CanBeShown(const Json::Value& hit, const std::string& query) {
  std::vector<tool::Sought> sought = {{query, tool::Likeness::kSame}};
  for (const Json::Value& reason : hit["explain"]) {
    sought.push_back({reason["text"].asString(), tool::Likeness::kForm});
    sought.push_back({reason["text"].asString(), tool::Likeness::kSlip});
  }
  const std::string title = hit["title"].asString();
  Require(WithoutEmphasis(tool::Emphasised(title, sought)) == title,
          "emphasis leaves the text as it is");
}

}  // namespace

void Try(const std::string& input) {
  if (input.size() < kHeadBytes) return;
  searchd::MemoryIndex& index = IndexOf(static_cast<unsigned char>(input[0]));
  const unsigned offset = static_cast<unsigned char>(input[1]) % kMostOnPage;
  const unsigned limit = static_cast<unsigned char>(input[2]) % kMostOnPage;
  const std::string query = AsItArrives(input.substr(kHeadBytes));

  const searchd::Found all = index.Search(query);
  IsInOrder(all);
  const searchd::Found page = index.Search({query, offset, limit, true});
  IsPageOf(all, page, offset, limit);
  if (!page.hits.empty()) CanBeShown(page.hits[0], query);  // as it takes far the most time
}

}  // namespace fuzz
