// Internal seams of the module index_mgr: reading a descriptor, finding descriptors, and making one
// search document.
#pragma once

#include <json/value.h>

#include <optional>
#include <set>
#include <string>
#include <utility>

#include "appindex/string_pool.h"

namespace velkor::appindex {

constexpr char kIndexMgr[] = "index_mgr";  // the module's name in log lines
constexpr char kIndexConf[] = "index.conf";

// The directories whose entries are the applications.
inline const std::set<std::string> kAppRoots = {"/var/packages/",
                                                "/usr/tovo/tovoman/webman/modules/"};

// One descriptor, read as often as it is asked for, since a package may be changed meanwhile. What
// the file holds is parsed and filtered again only when that is not what it held the last time.
class Descriptor {
 public:
  explicit Descriptor(std::string conf_path) : conf_path_(std::move(conf_path)) {}

  // Reads the file and gives the array of its indexable records, those that the device filters let
  // pass, in file order: each an object with "path", "id", "title", "desc", "keywords",
  // "stringset" and "owner". A file that cannot be read or parsed is logged and gives none; so is a
  // module whose id cannot be made into text. Throws only what IsPassFilter throws. The reference
  // is to what the next call changes.
  const Json::Value& FindIndexables();

 private:
  void Forget();
  void Parse(std::string text);

  const std::string conf_path_;
  std::optional<std::string> text_;  // that gave records_ without a complaint
  Json::Value records_;
};

// The records of a descriptor that is read once.
inline Json::Value FindIndexables(const std::string& conf_path) {
  return Descriptor(conf_path).FindIndexables();
}

// Finds the first descriptor in `find_dir` (ending in "/") or up to five levels below it,
// depth-first in the order in which the file system lists directories. `depth` is 0 at the start.
// Puts its path into `conf_path` and returns true, or returns false. Throws Error 502, logged, when
// a directory cannot be opened.
bool FindIndexConfByAppRoot(std::string& conf_path, const std::string& find_dir, unsigned depth);

// The descriptors of all applications, at most one of each. Throws as FindIndexConfByAppRoot does.
std::set<std::string> FindIndexConf();

// Makes the search document of one record in one language. Switches the pool's texts root to the
// record's. A keyword of the wrong shape is logged and left out; what the JSON library cannot make
// into text throws its own exception.
Json::Value MakeDocument(StringPool& pool, const std::string& lang, const Json::Value& record);

}  // namespace velkor::appindex
