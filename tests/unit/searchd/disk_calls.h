// The calls by which the code under test, Xapian included, changes the disk: the test program
// defines them itself.
#pragma once

#include <sys/types.h>

#include <set>
#include <string>
#include <utility>

// For a process of one thread at a time.
struct DiskCalls {
  int die_at = 0;      // the n-th call from now on, counted from 1, kills the process instead
  int sync_error = 0;  // what syncing fails with; 0: it does not

  using File = std::pair<dev_t, ino_t>;
  // Files that were written and directories that a file was renamed into: all of them, and those
  // that were not synced since.
  std::set<File> changed;
  std::set<File> unsynced;

  bool IsChanged(const std::string& path) const { return changed.count(FileAt(path)) != 0; }
  bool IsUnsynced(const std::string& path) const { return unsynced.count(FileAt(path)) != 0; }

  static File FileAt(const std::string& path);
};

extern DiskCalls disk_calls;
