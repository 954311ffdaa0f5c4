// The indexes of the daemon: the registry and the open indexes, kept in step.
#pragma once

#include <map>
#include <memory>
#include <mutex>
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
  // fails when it is used. To be made before any thread is started.
  explicit Catalog(const std::string& registry_file);

  void Create(IndexDefinition definition);

  // Also deletes a damaged index.
  void Delete(const std::string& id);

  std::shared_ptr<Index> Find(const std::string& id) const;

  // In the order of the ids.
  std::vector<std::shared_ptr<Index>> All() const;

  // An index that has work to do; null if there is none.
  std::shared_ptr<Index> FindWithWork() const;

 private:
  struct Known {
    std::shared_ptr<Index> index;
    std::string entry;  // in the registry
  };

  void CheckNew(const IndexDefinition& definition) const;
  std::vector<std::string> EntriesWithout(const std::string& id) const;

  const Registry registry_;
  std::string registry_damage_;

  std::mutex change_mutex_;   // held while the registry file changes; taken before mutex_
  mutable std::mutex mutex_;  // guards indexes_
  std::map<std::string, Known> indexes_;
};

}  // namespace searchd
