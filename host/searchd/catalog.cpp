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

// Where it fails, the check of the index finds it damaged.
void TryToFinishEmptying(const std::string& path) {
  try {
    FinishEmptying(path);
  } catch (const RequestError& e) {
    syslog(LOG_ERR, "storage failure: %s", e.what());
  }
}

}  // namespace

Catalog::Catalog(const std::string& registry_file, CheckProcess& checks)
    : registry_(registry_file), checks_(checks) {
  for (IndexDefinition& definition : registry_.Load(registry_damage_)) {
    const std::string id = definition.id;
    const std::string entry = RegistryEntry(definition);
    TryToFinishEmptying(definition.path);
    auto index = std::make_shared<Index>(std::move(definition), checks_,
                                         DatabaseCheck::Files::kFound, crowded_indexes_);
    indexes_.emplace(id, Known{std::move(index), entry});
  }
  if (!registry_damage_.empty()) {
    syslog(LOG_ERR, "the registry was damaged and set aside, no index is known: %s",
           registry_damage_.c_str());
  }
}

void Catalog::Create(const IndexDefinition& definition) {
  const std::lock_guard change_lock(change_mutex_);
  CheckNew(definition);
  const std::string id = definition.id;
  const std::string entry = RegistryEntry(definition);
  auto index =
      std::make_shared<Index>(definition, checks_, DatabaseCheck::Files::kMade, crowded_indexes_);
  const bool known = ReusePath(definition);
  PrepareIndexDirectory(definition.path, known);
  {
    const std::lock_guard lock(mutex_);
    indexes_.emplace(id, Known{std::move(index), entry});
    settled_.insert(id);
  }
  MarkChanged();
}

void Catalog::Delete(const std::string& id) {
  const std::lock_guard change_lock(change_mutex_);
  {
    const std::lock_guard lock(mutex_);
    if (IsLost(id)) {
      settled_.insert(id);
      return;
    }
  }
  const std::shared_ptr<Index> index = Find(id);
  {
    const std::lock_guard lock(mutex_);
    indexes_.erase(id);
    settled_.insert(id);
  }
  index->Close();
  deleted_.push_back(index->Definition());
  MarkChanged();
}

void Catalog::Save() {
  const std::lock_guard change_lock(change_mutex_);
  SaveLocked();
}

void Catalog::SaveIfNeeded() {
  if (!save_soon_.exchange(false)) return;
  try {
    Save();
  } catch (const RequestError& e) {
    syslog(LOG_ERR, "storage failure: %s", e.what());
  }
}

// The files of a deleted index go last: a crash before that leaves files that a new index at this
// path clears away, never an index without files.
void Catalog::SaveLocked() {
  if (!unsaved_) return;
  registry_.Save(Entries());
  unsaved_ = false;
  save_soon_ = false;
  for (const IndexDefinition& definition : deleted_) {
    try {
      RemoveIndexDirectory(definition.path);
    } catch (const RequestError& e) {
      syslog(LOG_WARNING, "files of a deleted index stay: %s", e.what());
    }
  }
  deleted_.clear();
}

void Catalog::MarkChanged() {
  unsaved_ = true;
  save_soon_ = true;
}

// Lets an index have the directory of one that was deleted. If that was the same one, a crash may
// leave it empty; another one has to be forgotten for good first. Returns whether it was that one,
// whose files are still there.
bool Catalog::ReusePath(const IndexDefinition& definition) {
  for (auto deleted = deleted_.begin(); deleted != deleted_.end(); ++deleted) {
    if (!Overlap(deleted->path, definition.path)) continue;
    if (deleted->path == definition.path && deleted->id == definition.id) {
      deleted_.erase(deleted);
      return true;
    }
    SaveLocked();
    break;
  }
  return false;
}

void Catalog::Reopen() {
  for (const auto& index : All()) index->Reopen();
}

std::shared_ptr<Index> Catalog::Find(const std::string& id) const {
  const std::lock_guard lock(mutex_);
  const auto found = indexes_.find(id);
  if (found != indexes_.end()) return found->second.index;
  if (IsLost(id)) {
    throw KnownDamage("nothing is known of index " + id +
                      ", the registry was damaged and set aside: " + registry_damage_);
  }
  throw RequestError(Code::kNoSuchIndex, "no such index: " + id);
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

std::vector<std::string> Catalog::Entries() const {
  const std::lock_guard lock(mutex_);
  std::vector<std::string> entries;
  for (const auto& [id, known] : indexes_) entries.push_back(known.entry);
  return entries;
}

// Whether an index that is not known may have been in a registry that was set aside.
bool Catalog::IsLost(const std::string& id) const {
  return !registry_damage_.empty() && indexes_.count(id) == 0 && settled_.count(id) == 0;
}

}  // namespace searchd
