// Directories that a search has gone through without finding anything.
#pragma once

#include <sys/stat.h>

#include <map>
#include <utility>

#include "common/dir_reader.h"

namespace velkor {

// Of one search that goes a limited number of levels down and follows links. Links may lead to one
// directory again and again, by as many ways as the number of links to the power of the levels.
// Until the first link nothing is remembered: without one, a search comes to no directory twice.
class SearchedDirs {
 public:
  // The search is about to enter a directory by what may be a link.
  void FollowLink() { may_return_ = true; }

  // Whether the directory has been gone through from this level, or from one further up: there is
  // nothing to be found then.
  bool Has(const DirReader& dir, int level) const {
    if (levels_.empty()) return false;
    const auto found = levels_.find(IdOf(dir));
    return found != levels_.end() && found->second <= level;
  }

  // The directory has been gone through from this level, and from no level further up.
  void Add(const DirReader& dir, int level) {
    if (may_return_) levels_[IdOf(dir)] = level;
  }

 private:
  using Id = std::pair<dev_t, ino_t>;

  static Id IdOf(const DirReader& dir) {
    struct stat info {};
    fstat(dir.Fd(), &info);  // of an open directory: does not fail
    return {info.st_dev, info.st_ino};
  }

  bool may_return_ = false;
  std::map<Id, int> levels_;
};

}  // namespace velkor
