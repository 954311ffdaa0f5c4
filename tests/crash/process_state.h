// What a library must leave as it found it in the process that calls it.
#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

namespace test {

struct ProcessState {
  std::vector<int> descriptors;  // that are open
  std::vector<uid_t> users;      // real, effective and saved
  std::vector<gid_t> groups;     // the same, and the supplementary ones
  mode_t mask = 0;
  std::vector<ino_t> directory;      // the working one
  std::vector<const void*> signals;  // what handles each

  // Of the calling process, now. The system log is closed for it: its descriptor is the C library's
  // own.
  static ProcessState Now();

  // What of it is otherwise in `after`, but for descriptors that are open only there; empty when
  // all is the same.
  std::string Changes(const ProcessState& after) const;
  // Those descriptors; empty when there are none.
  std::string Kept(const ProcessState& after) const;
};

}  // namespace test
