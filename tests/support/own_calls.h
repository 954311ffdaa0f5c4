// For test programs that define functions of the C library themselves.
#pragma once

#include <dlfcn.h>
#include <fcntl.h>
#include <sys/types.h>

#include <cstdarg>

namespace test {

// The C library's own function of that name.
template <typename Function>
Function* Real(const char* name) {
  return reinterpret_cast<Function*>(dlsym(RTLD_NEXT, name));
}

// The mode among what follows `flags` in a call of open or its like; 0 for one that makes no file.
inline mode_t OpenMode(int flags, va_list arguments) {
  return (flags & O_CREAT) != 0 ? va_arg(arguments, mode_t) : 0;
}

}  // namespace test
