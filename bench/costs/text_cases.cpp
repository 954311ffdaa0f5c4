#include <appindex/device_identity.h>
#include <appindex/string_pool.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <map>
#include <optional>
#include <unordered_map>

#include "bench/costs/cases.h"
#include "bench/costs/content.h"
#include "common/file_io.h"

namespace bench {
namespace {

constexpr char kConfPath[] = "/var/packages/Texts/index.conf";
constexpr long kReferences = 100;

std::string RootName(long texts) { return "texts" + std::to_string(texts); }
std::string RootPath(long texts) { return "/var/packages/Texts/" + RootName(texts) + "/"; }

// What the descriptors of an application refer to: a hundred texts, all over the section.
std::vector<std::string> Keys(long texts) {
  constexpr long kStride = 7919;  // a prime: meets keys far apart
  std::vector<std::string> keys;
  for (long n = 0; n < kReferences; ++n) keys.push_back(TextKey(n * kStride % texts));
  return keys;
}

Case LookUpCase(long texts) {
  const auto pool = std::make_shared<velkor::appindex::StringPool>();
  const auto ordered =
      std::make_shared<std::map<std::string, std::map<std::string, std::string>>>();
  for (long n = 0; n < texts; ++n) (*ordered)["section"][TextKey(n)] = "The text of " + TextKey(n);
  const std::vector<std::string> keys = Keys(texts);
  std::vector<std::string> references;
  for (const std::string& key : keys) references.push_back("section:" + key);
  const std::string section = "section";
  pool->SetTextsRootByStringSet(kConfPath, RootName(texts));
  return {"lookup", texts, kReferences,
          [pool, references] {
            for (const std::string& reference : references) {
              if (pool->GetString("enu", reference).empty()) std::abort();
            }
          },
          [ordered, keys, section] {
            for (const std::string& key : keys) {
              const std::string text = ordered->find(section)->second.find(key)->second;
              if (text.empty()) std::abort();
            }
          }};
}

// What a pack of texts consists of when it is loaded.
using Texts = std::unordered_map<std::string, std::optional<std::string>>;
using Table = std::map<std::string, std::unordered_map<std::string, std::optional<Texts>>>;

Case LoadCase(long texts) {
  const auto& langs = velkor::appindex::GetSupportedLangs();
  const auto assignments = std::make_shared<std::vector<std::pair<std::string, std::string>>>();
  for (long n = 0; n < texts; ++n) {
    assignments->emplace_back(TextKey(n), "The text of " + TextKey(n));
  }
  Case load{
      "load", texts, static_cast<double>(langs.size()) * static_cast<double>(texts),
      [texts] { velkor::appindex::LanguagePack pack(RootPath(texts)); },
      [texts, assignments, &langs] {
        Table table;
        for (const std::string& lang : langs) {
          std::string content;
          if (!velkor::ReadRegularFile(RootPath(texts) + lang + "/strings", SIZE_MAX, content)) {
            std::abort();
          }
          Texts& section = table[lang]["section"].emplace();
          for (const auto& [key, text] : *assignments) section[key] = text;
        }
      }};
  load.rounds = 9;
  return load;
}

}  // namespace

Cases TextCases() {
  Cases cases;
  for (const long texts : {10, 100, 1000, 10000}) {
    WriteTexts(RootPath(texts), texts);
    cases.push_back(LookUpCase(texts));
    cases.push_back(LoadCase(texts));
  }
  return cases;
}

}  // namespace bench
