// Processes: how much memory one holds, and work done in one of its own.
#pragma once

#include <json/value.h>
#include <sys/types.h>

#include <functional>

#include "host/sdk/unique_fd.h"

namespace bench {

// In megabytes. Pages of files (programs, libraries, ICU's tables) are counted apart from what a
// process holds by itself: the kernel takes them back when it likes.
struct Memory {
  double own = 0;
  double files = 0;
  double peak = 0;  // of both together

  double Resident() const { return own + files; }
};

// Reads the memory of processes. Opened before a device root is entered, which has no /proc.
class ProcessList {
 public:
  ProcessList();
  Memory MemoryOf(pid_t process) const;

 private:
  host::sdk::UniqueFd proc_;
};

// Does the work in a process forked for it, so that it neither finds nor leaves memory in use, and
// returns its result. No other thread may run. Throws when the work has thrown or the process has
// died.
Json::Value InOwnProcess(const std::function<Json::Value()>& work);

}  // namespace bench
