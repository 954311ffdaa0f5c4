// The indexes of the daemon. What is created and deleted holds at once; the registry file, which
// says what there is after a restart, follows with Save.
#pragma once

#include <atomic>
#include <map>
#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <vector>

#include "host/searchd/index.h"
#include "host/searchd/registry.h"

namespace searchd {

constexpr std::size_t kMaxIndexes = 256;
constexpr std::size_t kMaxIndexIdBytes = 200;

// Any thread may call. Failures are RequestError.
class Catalog {
 public:
  // Loads the registry and starts to check the indexes. A damaged one is known all the same, and
  // fails when it is used.
  Catalog(const std::string& registry_file, CheckProcess& checks);

  void Create(const IndexDefinition& definition);

  // Also deletes a damaged index. Its files go with Save, so that a crash before leaves it whole.
  void Delete(const std::string& id);

  // Makes what was created and deleted durable.
  void Save();

  // Whether Save would find something new to do. SaveIfNeeded tries once, and logs a failure.
  bool NeedsSave() const { return save_soon_; }
  void SaveIfNeeded();

  // Has every index let go of its files, and checks them before they are opened again.
  void Reopen();

  std::shared_ptr<Index> Find(const std::string& id) const;

  // In the order of the ids.
  std::vector<std::shared_ptr<Index>> All() const;

  // Whether there is an index in which the next change is likely to wait for others.
  bool IsCrowded() const { return crowded_indexes_ > 0; }

  // An index that has work to do; null if there is none.
  std::shared_ptr<Index> FindWithWork() const;

 private:
  struct Known {
    std::shared_ptr<Index> index;
    std::string entry;  // in the registry
  };

  void CheckNew(const IndexDefinition& definition) const;
  bool ReusePath(const IndexDefinition& definition);
  void MarkChanged();
  void SaveLocked();
  std::vector<std::string> Entries() const;
  bool IsLost(const std::string& id) const;

  const Registry registry_;
  CheckProcess& checks_;
  std::atomic<int> crowded_indexes_ = 0;
  std::string registry_damage_;  // what was wrong with a registry that was set aside

  std::mutex change_mutex_;  // held by whatever changes which indexes there are; taken first
  bool unsaved_ = false;
  std::vector<IndexDefinition> deleted_;  // whose files are still there
  std::atomic<bool> save_soon_ = false;

  mutable std::mutex mutex_;  // guards what follows
  std::map<std::string, Known> indexes_;
  std::set<std::string> settled_;  // created or deleted since the registry was set aside
};

}  // namespace searchd
