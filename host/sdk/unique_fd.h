// The owner of a file descriptor.
#pragma once

#include <unistd.h>

#include "host/sdk/keep_errno.h"

namespace host::sdk {

// Closes its descriptor when it goes out of scope and leaves errno as it was, so that a failure can
// be reported after the clean-up.
class UniqueFd {
 public:
  explicit UniqueFd(int fd) : fd_(fd) {}
  ~UniqueFd() {
    if (fd_ < 0) return;
    const KeepErrno keep;
    close(fd_);
  }
  UniqueFd(const UniqueFd&) = delete;
  UniqueFd& operator=(const UniqueFd&) = delete;

  bool IsOpen() const { return fd_ >= 0; }
  int Get() const { return fd_; }

  // Gives the descriptor away.
  int Release() {
    const int fd = fd_;
    fd_ = -1;
    return fd;
  }

 private:
  int fd_;
};

}  // namespace host::sdk
