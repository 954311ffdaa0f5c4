// Which indexes exist: a JSON file, replaced as a whole with each change.
#pragma once

#include <string>
#include <vector>

#include "host/searchd/index.h"

namespace searchd {

// The text of an index in the registry.
std::string RegistryEntry(const IndexDefinition& index);

class Registry {
 public:
  explicit Registry(std::string file) : file_(std::move(file)) {}

  // The registered indexes; none when there is no file. What is there but cannot be read as a
  // registry is moved aside, to the same name with ".damaged" added, or ".damaged.2" and so on if
  // that is taken, and there are none; `damage` then says what was wrong. Throws
  // RequestError(kStorage) when it cannot be moved, and for a file that may hold a registry but
  // cannot be read now, for want of memory for instance: nothing is forgotten then.
  std::vector<IndexDefinition> Load(std::string& damage) const;

  // Replaces the file, durably, by one with these entries: after a crash it holds either them or
  // what it held before. Throws RequestError(kStorage) and leaves the file as it was.
  void Save(const std::vector<std::string>& entries) const;

 private:
  const std::string file_;
};

}  // namespace searchd
