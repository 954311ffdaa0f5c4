// What is checked. Each function looks at one side of a descriptor and reports what it finds there.
#pragma once

#include <json/value.h>

#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "appindex/string_pool.h"
#include "tool/lint/package.h"
#include "tool/lint/report.h"
#include "tool/lint/texts.h"

namespace tool::lint {

// The devices' names, as far as somebody has listed them.
struct KnownNames {
  std::optional<std::set<std::string>> models;
  std::optional<std::set<std::string>> platforms;
};

// The types and ranges of all members, and that those are there which must be: exactly what the
// schema of index.conf says.
void CheckShape(Report& report, const Json::Value& root);

// Members that a schema cannot require of everybody.
void CheckDescriptions(Report& report, const Json::Value& root);

// Device filters: names that no device has, and combinations that no device passes.
void CheckFilters(Report& report, const Json::Value& root, const KnownNames& known);

// Whether there is a device whose filters let all of these items pass; with names in `known`, one
// of those devices.
bool SomeDevicePasses(const std::vector<const Item*>& items, const KnownNames& known);

// The ids that descriptors have used so far.
class IdRegistry {
 public:
  explicit IdRegistry(const KnownNames& known) : known_(known) {}

  // Reports the ids of this descriptor that were used before by an item that the same device may
  // show. `root` must stay valid.
  void Check(Report& report, const std::string& file, const Json::Value& root);

 private:
  struct Use {
    std::string file;
    Item item;
  };

  const KnownNames& known_;
  std::map<std::string, std::vector<Use>> uses_;
};

// How the texts of one reference stand in each language.
struct TextRow {
  std::string reference;
  std::map<std::string, TextState> states;  // by language
  std::set<std::string> untranslated;       // languages that show the English text
  bool HasGaps() const;
};

// The texts of one descriptor that come from one directory of texts.
struct TextTable {
  std::string file;
  std::string root;           // that directory; ends in "/"
  std::vector<TextRow> rows;  // one for each reference, in the order of the descriptor
};

// The texts that the descriptor refers to, language by language: a table for each directory of
// texts that its entries use.
std::vector<TextTable> CheckTexts(Report& report, const Package& package,
                                  const ParsedDescriptor& descriptor, TextsCache& cache);

// Keywords that add nothing to the title.
void CheckKeywords(Report& report, const Package& package, const ParsedDescriptor& descriptor,
                   TextsCache& cache);

// Documents that the search daemon refuses, which makes adding the package fail.
void CheckDocuments(Report& report, const Package& package, const ParsedDescriptor& descriptor,
                    velkor::appindex::StringPool& pool);

// Where the package keeps its descriptors.
void CheckPackage(std::vector<Finding>& findings, const Package& package);

// The directories of texts, as far as the descriptor uses them.
void CheckTextsRoot(Report& report, const Package& package, const ParsedDescriptor& descriptor);

}  // namespace tool::lint
