// Who holds a lock.
#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

namespace tool {

struct LockHolder {
  pid_t pid;
  std::string program;     // empty when it cannot be told
  bool has_ended = false;  // it took the lock, and whom it has left it to cannot be seen
};

// The processes that hold a flock(2) lock on the file at `path`, as the kernel lists them below
// `proc`, an open descriptor of /proc. Where the one that took it has ended, as the program flock
// of a shell has, those that have the file open and do not wait for it. Empty where there is no
// such file, or no list.
std::vector<LockHolder> LockHolders(int proc, const std::string& path);

// Those that hold it, and those that wait for it, of `locks`, a text as /proc/locks has it, on the
// file of this device and inode.
std::vector<pid_t> HoldersIn(const std::string& locks, dev_t device, ino_t inode);
std::vector<pid_t> WaitersIn(const std::string& locks, dev_t device, ino_t inode);

}  // namespace tool
