// The owner of a file descriptor.
#pragma once

#include <unistd.h>

#include <cerrno>

namespace velkor {

// Closes its descriptor when it goes out of scope, leaving errno as it was.
class UniqueFd {
 public:
  explicit UniqueFd(int fd) : fd_(fd) {}
  ~UniqueFd() {
    if (fd_ < 0) return;
    const int kept = errno;
    close(fd_);
    errno = kept;
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

  // Closes now and returns whether that succeeded: for files whose content must have arrived.
  bool Close() {
    const int fd = fd_;
    fd_ = -1;
    return close(fd) == 0;
  }

 private:
  int fd_;
};

}  // namespace velkor
