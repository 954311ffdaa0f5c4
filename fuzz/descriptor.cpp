// A descriptor: its records, the documents of each in several languages, the requests that they are
// sent with, and what the daemon and the linter say to them.
#include <json/value.h>
#include <xapian.h>

#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "appindex/elastic_control.h"
#include "appindex/elastic_control_internal.h"
#include "appindex/error.h"
#include "appindex/index_mgr_internal.h"
#include "appindex/utilities/file_utils.h"
#include "appindex/utils_internal.h"
#include "fuzz/memory_files.h"
#include "fuzz/target.h"
#include "host/searchd/analyzer.h"
#include "host/searchd/document.h"
#include "host/searchd/json_text.h"
#include "host/searchd/language.h"
#include "host/searchd/mapping.h"
#include "host/searchd/request_error.h"
#include "tool/lint/checks.h"

namespace fuzz {
namespace {

namespace index = velkor::appindex;
namespace lint = tool::lint;

constexpr char kDescriptor[] = "/usr/tovo/tovoman/webman/modules/Fuzz/index.conf";
constexpr char kOwnTexts[] = "/usr/tovo/tovoman/webman/modules/Fuzz/words/";
constexpr char kBuiltInTexts[] = "/usr/tovo/tovoman/webman/texts/";

// The last one has no texts.
constexpr const char* kLanguages[] = {"enu", "ger", "jpn"};

void PutTexts(const std::string& root) {
  MemoryFiles()[root + "enu/strings"] =
      "[app]\ntitle=\"Photo Album\"\ndesc=\"Photos by date\"\nkw=\"picture\"\nempty=\"\"\n";
  MemoryFiles()[root + "ger/strings"] =
      "[app]\ntitle=\"Fotoalbum\"\ndesc=\"Fotos \\\"nach\\\" "
      "Datum\"\nkw=\"Bild\"\n[x]\na=\"\xFF\"\n";
}

// Nothing where Add would fail, after which the rest of the descriptor is not looked at.
std::optional<std::string> RequestOf(index::StringPool& pool, const std::string& lang,
                                     const Json::Value& record) {
  try {
    return index::elastic::UpsertRequest(lang, index::MakeDocument(pool, lang, record));
  } catch (const velkor::Error& error) {
    Require(error.code == velkor::Error::kJsonError, "an id that is no text is error 120");
  } catch (const Json::Exception&) {
    // What cannot be made into text.
  }
  return std::nullopt;
}

// Whether the daemon accepts the request; what it accepts it has to index.
bool DaemonTakes(const std::string& lang, const std::string& request) {
  static const searchd::Mapping mapping =
      searchd::Mapping::Parse(index::elastic::GetAppIndexMappings());
  Json::Value data;
  try {
    data = searchd::ParseJson(request)["data"];
    searchd::CheckDocument(mapping, data["doc_id"].asString(), data["data"]);
  } catch (const searchd::RequestError&) {
    return false;
  }
  searchd::Analyzer analyzer(searchd::LanguageOfIndex(index::elastic::GetAppIndexID(lang)));
  const Xapian::Document built =
      searchd::BuildDocument(mapping, analyzer, data["doc_id"].asString(), data["data"]);
  Require(searchd::ParseJson(built.get_data()).isObject(), "what is stored of a document is JSON");
  return true;
}

void IsRecord(const Json::Value& record) {
  for (const char* member : {"path", "id", "title", "desc", "keywords", "stringset", "owner"}) {
    Require(record.isMember(member), "a record has all its members");
  }
  Require(record["path"] == kDescriptor, "a record knows where it comes from");
}

// Returns whether Add carries it out.
bool MakesDocuments(const Json::Value& records) {
  index::StringPool pool;
  for (const char* lang : kLanguages) {
    for (const Json::Value& record : records) {
      const std::optional<std::string> request = RequestOf(pool, lang, record);
      if (!request || !DaemonTakes(lang, *request)) return false;
    }
  }
  return true;
}

bool HasError(const std::vector<lint::Finding>& findings) {
  for (const lint::Finding& finding : findings) {
    if (finding.severity == lint::Severity::kError) return true;
  }
  return false;
}

// Whether the linter finds an error, looking at the descriptor alone.
bool IsFaulty(const std::string& text) {
  lint::ParsedDescriptor descriptor{kDescriptor, lint::SourceText(text), Json::Value()};
  if (lint::ParseJson(descriptor.source, descriptor.root)) return true;
  std::vector<lint::Finding> findings;
  lint::Report report(descriptor, findings);
  const lint::KnownNames known{};
  lint::CheckShape(report, descriptor.root);
  lint::CheckDescriptions(report, descriptor.root);
  lint::CheckFilters(report, descriptor.root, known);
  lint::IdRegistry(known).Check(report, kDescriptor, descriptor.root);
  return HasError(findings);
}

// Whether it finds one in the documents, which takes more time.
bool HasFaultyDocuments(const std::string& text) {
  lint::ParsedDescriptor descriptor{kDescriptor, lint::SourceText(text), Json::Value()};
  lint::ParseJson(descriptor.source, descriptor.root);
  lint::Package package;
  package.dir = velkor::Dirname(kDescriptor) + "/";
  package.is_built_in = true;
  package.texts = kBuiltInTexts;
  std::vector<lint::Finding> findings;
  lint::Report report(descriptor, findings);
  index::StringPool pool;
  lint::CheckDocuments(report, package, descriptor, pool);
  return HasError(findings);
}

}  // namespace

void Prepare() {
  PutTexts(kBuiltInTexts);
  PutTexts(kOwnTexts);
}

void Try(const std::string& input) {
  MemoryFiles()[kDescriptor] = input;
  const index::AssumedDevice device("M420", "helios");
  index::Descriptor descriptor(kDescriptor);
  const Json::Value records = descriptor.FindIndexables();
  Require(records.isArray(), "a descriptor gives a list");
  Require(descriptor.FindIndexables() == records, "a descriptor that is read again is the same");
  for (const Json::Value& record : records) IsRecord(record);
  const bool is_faulty = IsFaulty(input);
  Require(MakesDocuments(records) || is_faulty || HasFaultyDocuments(input),
          "the linter finds what makes Add fail");
}

}  // namespace fuzz
