// What the search daemon would refuse, found in the documents that the library makes.
#include <utility>

#include "appindex/device_identity.h"
#include "appindex/index_mgr_internal.h"
#include "appindex/utils_internal.h"
#include "common/check.h"
#include "tool/lint/checks.h"
#include "tool/refusal.h"

namespace tool::lint {
namespace {

namespace index = velkor::appindex;

constexpr char kNoTexts[] = "/dev/null/";  // no file is below it

// As the library's reader of descriptors makes it. The texts root is named outright, because the
// package need not be where packages are installed.
Json::Value RecordOf(const Item& item, std::string texts_root) {
  if (texts_root.empty()) texts_root = kNoTexts;
  Json::Value record(Json::objectValue);
  record["path"] = texts_root + index::kIndexConf;
  record["stringset"] = ".";
  record["id"] = IdOf(item);
  record["owner"] = "";  // the entry's id, which is looked at there
  for (const char* member : {"title", "desc", "keywords"}) {
    record[member] = (*item.node.value)[member];
  }
  return record;
}

// The English title comes before the keywords, and is looked at by itself.
void DropTitle(Json::Value& document, const std::string& english_title) {
  document["keywords"] = document["keywords"].asString().substr(english_title.size());
}

// Where in the descriptor what is refused stands.
Node PlaceOf(const Item& item, const std::string& member) {
  if (member == "id") return item.node.Member(item.is_module ? "params" : "app");
  return item.node.Has(member) ? item.node.Member(member) : item.node;
}

struct Found {
  Refusal refusal;
  std::vector<std::string> langs;
};
using FoundByMember = std::map<std::pair<std::string, Refusal::Kind>, Found>;

// Those of one kind.
void Collect(FoundByMember& found, const std::string& lang, const Json::Value& document,
             Refusal::Kind kind) {
  for (const Refusal& refusal : RefusalsOf(document)) {
    if (refusal.member == "search_title" || refusal.kind != kind) continue;  // it is the title
    Found& known = found[{refusal.member, kind}];
    known.refusal = refusal;
    known.langs.push_back(lang);
  }
}

FoundByMember FindRefusals(const Item& item, index::StringPool& pool, const std::string& root) {
  FoundByMember found;
  const Json::Value record = RecordOf(item, root);
  const velkor::MutedLog muted;
  const std::string english_title =
      index::MakeDocument(pool, index::kEnglish, record)["title"].asString();
  for (const std::string& lang : index::GetSupportedLangs()) {
    Json::Value document = index::MakeDocument(pool, lang, record);
    Collect(found, lang, document, Refusal::kTooLong);
    DropTitle(document, english_title);
    Collect(found, lang, document, Refusal::kNul);
  }
  return found;
}

void ReportFound(Report& report, const Item& item, const Found& found) {
  const auto& [refusal, langs] = found;
  const bool in_all = langs.size() == index::GetSupportedLangs().size();
  const std::string what =
      refusal.member.empty() ? "the texts together" : "the " + refusal.member + " of the document";
  report.Add(refusal.kind == Refusal::kNul ? "nul-character" : "text-too-long",
             PlaceOf(item, refusal.member),
             what + (in_all ? " " : " in " + Listed(langs) + " ") + CauseOf(refusal) +
                 ": the search daemon refuses it",
             in_all ? std::vector<std::string>() : langs);
}

}  // namespace

void CheckDocuments(Report& report, const Package& package, const ParsedDescriptor& descriptor,
                    index::StringPool& pool) {
  for (const Item& item : ItemsOf(descriptor.root)) {
    try {
      const std::string root = TextsRootOf(package, descriptor, item);
      for (const auto& [key, found] : FindRefusals(item, pool, root)) {
        ReportFound(report, item, found);
      }
    } catch (const Json::Exception&) {
      // A value of a wrong type, which the shape's check has found.
    }
  }
}

}  // namespace tool::lint
