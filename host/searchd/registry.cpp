#include "host/searchd/registry.h"

#include <cerrno>
#include <cstdio>
#include <fstream>
#include <iterator>

#include "host/searchd/durable_file.h"
#include "host/searchd/index_directory.h"
#include "host/searchd/json_text.h"
#include "host/searchd/request_error.h"

namespace searchd {
namespace {

constexpr int kFormat = 1;

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
  errno = 0;
  std::ifstream in(file_, std::ios::binary);
  if (!in) {
    if (errno == ENOENT) return {};
    throw RequestError(Code::kStorage, WithErrno(file_, errno));
  }
  const std::string text{std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
  try {
    return Parse(text);
  } catch (const RequestError& e) {
    damage = file_ + ": " + e.what();
  }
  if (std::rename(file_.c_str(), (file_ + ".damaged").c_str()) != 0) {
    throw RequestError(Code::kStorage, WithErrno(file_, errno));
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
