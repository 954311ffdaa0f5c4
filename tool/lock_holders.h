// Who holds a lock.
#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

namespace tool {

struct LockHolder {
  pid_t pid;
  std::string program;  // empty when it cannot be told
};

// The processes that hold a flock(2) lock on the file at `path`, as the kernel lists them below
// `proc`, an open descriptor of /proc. Empty where there is no such file, or no list.
std::vector<LockHolder> LockHolders(int proc, const std::string& path);

// Those of `locks`, a text as /proc/locks has it, on the file of this device and inode.
std::vector<pid_t> HoldersIn(const std::string& locks, dev_t device, ino_t inode);

}  // namespace tool
