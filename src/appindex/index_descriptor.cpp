// Descriptors: where they lie and what they declare.
#include <utility>

#include "appindex/device_identity.h"
#include "appindex/index_mgr_internal.h"
#include "appindex/utilities/file_utils.h"
#include "appindex/utilities/json_helpers.h"
#include "common/check.h"
#include "common/dir_reader.h"
#include "common/file_io.h"
#include "common/searched_dirs.h"

namespace velkor::appindex {
namespace {

constexpr unsigned kMaxSearchDepth = 5;
constexpr char kModuleIdSeparator[] = "?";

constexpr char kNoApplication[] = "Docuvault";

void LogMalformed(const std::string& conf_path) {
  LogFailureText({kIndexMgr, 36, "FindIndexables"}, "Malformed index.conf: " + conf_path);
}

bool IsForThisDevice(const Json::Value& item) {
  return IsPassFilter(item["enable"], true) && IsPassFilter(item["disable"], false);
}

// The member of a record, whose name is not copied.
template <std::size_t size>
Json::Value& Member(Json::Value& record, const char (&name)[size]) {
  return record[Json::StaticString(name)];
}

// What an entry and a module have in common. The texts and keywords are taken out of `item`.
Json::Value MakeRecord(const std::string& conf_path, Json::Value& item, const Json::Value& entry) {
  Json::Value record(Json::objectValue);
  Member(record, "path") = conf_path;
  Member(record, "title").swap(Member(item, "title"));
  Member(record, "desc").swap(Member(item, "desc"));
  Member(record, "keywords").swap(Member(item, "keywords"));
  Member(record, "stringset") = entry["stringset"];
  return record;
}

// Returns whether there was nothing to complain about.
bool AppendModule(Json::Value& records, const std::string& conf_path, Json::Value& module,
                  const Json::Value& entry) {
  if (!module.isObject() || !IsForThisDevice(module)) return true;
  const Json::Value& app = entry["app"];
  const Json::Value& params = module["params"];
  if (!isJsonType<std::string>(app) || !isJsonType<std::string>(params)) {
    LogMalformed(conf_path);
    return false;
  }
  Json::Value record = MakeRecord(conf_path, module, entry);
  Member(record, "id") = app.asString() + kModuleIdSeparator + params.asString();
  Member(record, "owner") = app;
  records.append(std::move(record));
  return true;
}

bool AppendEntry(Json::Value& records, const std::string& conf_path, Json::Value& entry) {
  if (!entry.isObject() || !IsForThisDevice(entry)) return true;
  Json::Value record = MakeRecord(conf_path, entry, entry);
  Member(record, "id") = entry["app"];
  Member(record, "owner") = "";
  records.append(std::move(record));
  bool complete = true;
  for (Json::Value& module : entry["modules"]) {
    complete = AppendModule(records, conf_path, module, entry) && complete;
  }
  return complete;
}

}  // namespace

const Json::Value& Descriptor::FindIndexables() {
  std::string text;
  if (!ReadRegularFile(conf_path_, kMaxJsonFileBytes, text)) {
    Forget();
    LogMalformed(conf_path_);
  } else if (text != text_) {
    Parse(std::move(text));
  }
  return records_;
}

void Descriptor::Forget() {
  text_.reset();
  records_ = Json::Value(Json::arrayValue);
}

// What was complained about is parsed and complained about anew each time.
void Descriptor::Parse(std::string text) {
  Forget();
  Json::Value root;
  if (!fromString(root, text)) {
    LogMalformed(conf_path_);
    return;
  }
  bool complete = true;
  if (root.isObject()) {
    complete = AppendEntry(records_, conf_path_, root);
  } else {
    for (Json::Value& entry : root) {
      complete = AppendEntry(records_, conf_path_, entry) && complete;
    }
  }
  if (complete) text_ = std::move(text);
}

namespace {

bool FindIndexConfIn(std::string& conf_path, const std::string& find_dir, unsigned depth,
                     SearchedDirs& searched) {
  DirReader dir(find_dir);
  CheckOrThrow(dir.IsOpen(), {kIndexMgr, 100, "FindIndexConfByAppRoot"},
               "nullptr == (dir = opendir(find_dir.c_str()))", Error::kGeneralError,
               [&find_dir] { return "opendir failed, path=" + find_dir; });
  const int level = static_cast<int>(depth);
  if (searched.Has(dir, level)) return false;
  std::string name;
  while (dir.Next(name)) {
    const std::string child = find_dir + name;
    if (name == kIndexConf) {
      conf_path = child;
      return true;
    }
    if (depth >= kMaxSearchDepth || !IsDirExist(child, true)) continue;
    if (dir.MayBeLink()) searched.FollowLink();
    if (FindIndexConfIn(conf_path, child + "/", depth + 1, searched)) return true;
  }
  searched.Add(dir, level);
  return false;
}

}  // namespace

bool FindIndexConfByAppRoot(std::string& conf_path, const std::string& find_dir, unsigned depth) {
  SearchedDirs searched;
  return FindIndexConfIn(conf_path, find_dir, depth, searched);
}

std::set<std::string> FindIndexConf() {
  std::set<std::string> conf_paths;
  for (const std::string& root : kAppRoots) {
    DirReader dir(root);
    CheckOrThrow(dir.IsOpen(), {kIndexMgr, 130, "FindIndexConf"},
                 "nullptr == (dir = opendir(root.c_str()))", Error::kGeneralError,
                 [&root] { return "opendir failed, path=" + root; });
    std::string name;
    while (dir.Next(name)) {
      if (name == kNoApplication) continue;
      const std::string app_dir = root + name + "/";
      std::string conf_path;
      if (IsDirExist(app_dir, false) && FindIndexConfByAppRoot(conf_path, app_dir, 0)) {
        conf_paths.insert(conf_path);
      }
    }
  }
  return conf_paths;
}

}  // namespace velkor::appindex
