// A lock between processes.
#pragma once

#include <string>

#include "appindex/export.h"

namespace velkor {

// Holds an advisory flock(2) lock on a file from construction to destruction. The file is created
// empty, mode 0644 less the umask, when it is missing, and is never removed.
//
// The lock belongs to the object, not to the process: a second LockFile on the same path in the
// same process is excluded too.
class TEISEIGATRO_EXPORT LockFile {
 public:
  // Returns with the lock held; `exclusive` false asks for one that other shared holders may share.
  // While it is held elsewhere, tries 64 times with random pauses of 0 to 0.9 s (57.6 s at most).
  // Throws Error 506 when the file cannot be opened ("open failed, path=", logged too), when
  // locking fails (the system's text) or after the last try ("Exceed max retry, path=").
  LockFile(const std::string& path, bool exclusive);

  // Releases the lock at once and closes the file; never throws.
  ~LockFile();
  LockFile(const LockFile&) = delete;
  LockFile& operator=(const LockFile&) = delete;

 private:
  int fd_;  // -1 whenever no lock is held
  std::string path_;
};

}  // namespace velkor
