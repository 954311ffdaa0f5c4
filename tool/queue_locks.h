// The locks of the work queue.
#pragma once

#include <string>
#include <vector>

#include "tool/lock_holders.h"
#include "tool/trial.h"

namespace tool {

struct Lock {
  std::string path;
  std::vector<LockHolder> holders;
  Problem problem =
      {};  // why who works the queue does not get so far as to take it, and what follows
};

// That of the queue's workers and that of the queue itself, as they are now for the effective user.
// Takes, opens and makes nothing. `proc` is an open descriptor of /proc.
std::vector<Lock> ReadLocks(int proc);

}  // namespace tool
