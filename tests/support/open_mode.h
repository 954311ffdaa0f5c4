// For test programs that define open and its like themselves.
#pragma once

#include <fcntl.h>
#include <sys/types.h>

#include <cstdarg>

namespace test {

// The mode among what follows `flags` in such a call; 0 for one that makes no file.
inline mode_t OpenMode(int flags, va_list arguments) {
  return (flags & O_CREAT) != 0 ? va_arg(arguments, mode_t) : 0;
}

}  // namespace test
