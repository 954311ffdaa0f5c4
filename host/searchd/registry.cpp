#include "host/searchd/registry.h"

#include <sys/stat.h>

#include <cerrno>
#include <cstdio>
#include <optional>

#include "host/sdk/regular_file.h"
#include "host/searchd/durable_file.h"
#include "host/searchd/index_directory.h"
#include "host/searchd/json_text.h"
#include "host/searchd/request_error.h"

namespace searchd {
namespace {

constexpr int kFormat = 1;
// More than the entries of all indexes that there may be.
constexpr std::size_t kMaxBytes = std::size_t{64} * 1024 * 1024;

// Throws RequestError for a text that is not a registry.
std::vector<IndexDefinition> Parse(const std::string& text) {
  const Json::Value registry = ParseJson(text);
  if (!registry.isObject() || registry["format"] != kFormat || !registry["indexes"].isArray()) {
    throw RequestError(Code::kRejected, "not a registry of format " + std::to_string(kFormat));
  }
  std::vector<IndexDefinition> indexes;
  for (const Json::Value& entry : registry["indexes"]) {
    if (!entry.isObject() || !entry["id"].isString() || !entry["path"].isString()) {
      throw RequestError(Code::kRejected, "an entry is not that of an index");
    }
    Mapping::Parse(entry["mappings"]);
    indexes.push_back(
        {entry["id"].asString(), CheckedIndexPath(entry["path"].asString()), entry["mappings"]});
  }
  return indexes;
}

// Whether a file that cannot be read now may be read another time, whatever it holds.
bool MayPass(int error) {
  return error == EIO || error == EMFILE || error == ENFILE || error == ENOMEM || error == EINTR ||
         error == EACCES;
}

// `name`, with a number added if there is something of that name.
std::string FreeName(const std::string& name) {
  struct stat status {};
  std::string free = name;
  for (int i = 2; lstat(free.c_str(), &status) == 0; ++i) free = name + "." + std::to_string(i);
  return free;
}

}  // namespace

std::string RegistryEntry(const IndexDefinition& index) {
  Json::Value entry(Json::objectValue);
  entry["id"] = index.id;
  entry["path"] = index.path;
  entry["mappings"] = index.mappings;
  return JsonText(entry);
}

std::vector<IndexDefinition> Registry::Load(std::string& damage) const {
  damage.clear();
  const std::optional<std::string> text = host::sdk::ReadRegularFile(file_, kMaxBytes);
  if (!text && errno == ENOENT) return {};
  if (!text && MayPass(errno)) throw RequestError(Code::kStorage, WithErrno(file_, errno));
  try {
    if (!text) throw RequestError(Code::kStorage, WithErrno("it cannot be read", errno));
    return Parse(*text);
  } catch (const RequestError& e) {
    damage = file_ + ": " + e.what();
  }
  const std::string aside = FreeName(file_ + ".damaged");
  if (std::rename(file_.c_str(), aside.c_str()) != 0) {
    throw RequestError(Code::kStorage, WithErrno("cannot set aside " + damage, errno));
  }
  return {};
}

void Registry::Save(const std::vector<std::string>& entries) const {
  std::string text = "{\"format\":" + std::to_string(kFormat) + ",\"indexes\":[";
  const char* separator = "\n";
  for (const std::string& entry : entries) {
    text.append(separator).append(entry);
    separator = ",\n";
  }
  ReplaceFile(file_, text + "\n]}\n");
}

}  // namespace searchd
