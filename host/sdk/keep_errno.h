// Keeping errno free of errors that are none.
#pragma once

#include <cerrno>

namespace host::sdk {

// Puts errno back when it goes out of scope: for steps whose failures are told in another way or
// are expected. What a caller logs later then does not end in a reason of ours.
class KeepErrno {
 public:
  KeepErrno() : kept_(errno) {}
  ~KeepErrno() { errno = kept_; }
  KeepErrno(const KeepErrno&) = delete;
  KeepErrno& operator=(const KeepErrno&) = delete;

 private:
  int kept_;
};

}  // namespace host::sdk
