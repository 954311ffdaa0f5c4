// What a lock finds at its path, without taking it.
#pragma once

#include <string>

namespace tool {

// How the kernel protects what another user has made in a directory such as /tmp from being opened
// by who would make it if it were missing: its settings fs.protected_regular and
// fs.protected_fifos. 0: not at all.
struct Protection {
  int regular = 0;
  int fifos = 0;
};

// That of this system, by `proc`, an open descriptor of /proc. None where it cannot be read.
Protection ReadProtection(int proc);

// What comes of opening a lock file as the library does, for reading, and of making it.
struct LockPath {
  enum State {
    kOpens,
    kFails,      // with `error`
    kProtected,  // fails, because the kernel protects what `owner` has made
    kWaits,      // a FIFO: until somebody opens it for writing
  };
  State state = kOpens;
  int error = 0;
  unsigned owner = 0;
};

// What would come of it for the effective user. Opens and makes nothing.
LockPath LookAtLock(const std::string& path, const Protection& protection);

// Why it does not open, in words; empty where it opens.
std::string WhyNotOpened(const LockPath& lock);

}  // namespace tool
