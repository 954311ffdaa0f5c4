#include "host/sdk/fail.h"

#include <cerrno>

namespace host::sdk {
namespace {

thread_local int last_error = 0;

}  // namespace

int Fail(int error) {
  last_error = error;
  errno = error;
  return -1;
}

int LastError() { return last_error; }

}  // namespace host::sdk
