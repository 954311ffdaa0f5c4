#include "host/searchd/catalog.h"

#include <syslog.h>

#include <utility>

#include "host/searchd/index_directory.h"
#include "host/searchd/request_error.h"

namespace searchd {
namespace {

// Whether one of two directories is the other or lies in it.
bool Overlap(const std::string& a, const std::string& b) {
  const std::string& shorter = a.size() < b.size() ? a : b;
  const std::string& longer = a.size() < b.size() ? b : a;
  return (longer + "/").compare(0, shorter.size() + 1, shorter + "/") == 0;
}

}  // namespace

Catalog::Catalog(const std::string& registry_file) : registry_(registry_file) {
  for (IndexDefinition& definition : registry_.Load(registry_damage_)) {
    const std::string id = definition.id;
    const std::string entry = RegistryEntry(definition);
    auto check = DatabaseCheck::Start(definition.path);
    auto index = std::make_shared<Index>(std::move(definition), std::move(check));
    indexes_.emplace(id, Known{std::move(index), entry});
  }
  if (!registry_damage_.empty()) {
    syslog(LOG_ERR, "the registry was damaged and set aside, no index is known: %s",
           registry_damage_.c_str());
  }
}

void Catalog::Create(IndexDefinition definition) {
  const std::lock_guard change_lock(change_mutex_);
  CheckNew(definition);
  const std::string id = definition.id;
  const std::string path = definition.path;
  const std::string entry = RegistryEntry(definition);
  std::vector<std::string> entries = EntriesWithout(id);
  entries.push_back(entry);
  auto index = std::make_shared<Index>(std::move(definition), std::make_unique<DatabaseCheck>());

  PrepareIndexDirectory(path);
  try {
    registry_.Save(entries);
  } catch (const RequestError&) {
    RemoveIndexDirectory(path);
    throw;
  }
  const std::lock_guard lock(mutex_);
  indexes_.emplace(id, Known{std::move(index), entry});
}

void Catalog::Delete(const std::string& id) {
  const std::lock_guard change_lock(change_mutex_);
  const std::shared_ptr<Index> index = Find(id);
  // Forgotten before its files go: a crash between the two leaves files that a new index at this
  // path clears away, never an index without files.
  registry_.Save(EntriesWithout(id));
  {
    const std::lock_guard lock(mutex_);
    indexes_.erase(id);
  }
  index->Close();
  RemoveIndexDirectory(index->Definition().path);
}

std::shared_ptr<Index> Catalog::Find(const std::string& id) const {
  const std::lock_guard lock(mutex_);
  const auto found = indexes_.find(id);
  if (found != indexes_.end()) return found->second.index;
  std::string message = "no such index: " + id;
  if (!registry_damage_.empty())
    message += " (a damaged registry was set aside: " + registry_damage_ + ")";
  throw RequestError(Code::kNoSuchIndex, message);
}

std::vector<std::shared_ptr<Index>> Catalog::All() const {
  const std::lock_guard lock(mutex_);
  std::vector<std::shared_ptr<Index>> all;
  for (const auto& [id, known] : indexes_) all.push_back(known.index);
  return all;
}

std::shared_ptr<Index> Catalog::FindWithWork() const {
  const std::lock_guard lock(mutex_);
  for (const auto& [id, known] : indexes_) {
    if (known.index->HasWork()) return known.index;
  }
  return nullptr;
}

void Catalog::CheckNew(const IndexDefinition& definition) const {
  const std::lock_guard lock(mutex_);
  if (definition.id.empty() || definition.id.size() > kMaxIndexIdBytes) {
    throw RequestError(Code::kRejected,
                       "\"id\" must have 1 to " + std::to_string(kMaxIndexIdBytes) + " bytes");
  }
  if (indexes_.count(definition.id) != 0) {
    throw RequestError(Code::kIndexExists, "index exists: " + definition.id);
  }
  if (indexes_.size() >= kMaxIndexes) {
    throw RequestError(Code::kRejected, "there are " + std::to_string(kMaxIndexes) +
                                            " indexes, the most there may be");
  }
  for (const auto& [id, known] : indexes_) {
    if (!Overlap(known.index->Definition().path, definition.path)) continue;
    throw RequestError(Code::kRejected, "\"path\" is that of index " + id +
                                            ", in it or around it: " + definition.path);
  }
}

std::vector<std::string> Catalog::EntriesWithout(const std::string& id) const {
  const std::lock_guard lock(mutex_);
  std::vector<std::string> entries;
  for (const auto& [other, known] : indexes_) {
    if (other != id) entries.push_back(known.entry);
  }
  return entries;
}

}  // namespace searchd
