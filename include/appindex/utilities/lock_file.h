/// @file
/// A lock between processes.
#pragma once

#include <string>

#include "appindex/export.h"

namespace velkor {

/// Holds an advisory flock(2) lock on a file from construction to destruction. The file is created
/// empty, mode 0644 less the umask, when it is missing, and is never removed.
///
/// The lock belongs to the object, not to the process: a second LockFile on the same path in the
/// same process is excluded too.
class TEISEIGATRO_EXPORT LockFile {
 public:
  /// Returns with the lock held; `exclusive` false asks for one that other shared holders may
  /// share. While it is held elsewhere, tries 64 times with random pauses of 0 to 0.9 s (57.6 s at
  /// most), which take from the process's rand() without seeding it. The file is opened with the
  /// effective user's rights. Throws Error 506 when the file cannot be opened ("open failed,
  /// path="; the cause is in the log line, the thrown text always ends in that of error 0), when
  /// locking fails (the system's text, not logged) or after the last try ("Exceed max retry,
  /// path=", not logged).
  LockFile(const std::string& path, bool exclusive);

  /// Releases the lock at once and closes the file; never throws.
  ~LockFile();
  LockFile(const LockFile&) = delete;             ///< not copied
  LockFile& operator=(const LockFile&) = delete;  ///< not copied

 private:
  int fd_;  // -1 whenever no lock is held
  std::string path_;
};

}  // namespace velkor
