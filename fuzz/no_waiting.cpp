#include "fuzz/no_waiting.h"

#include <syslog.h>
#include <unistd.h>

#include <cstdarg>
#include <cstdio>
#include <ctime>

namespace fuzz {

std::function<void(unsigned seconds)> on_sleep;

}  // namespace fuzz

// Visible to the shared libraries, whose calls are bound to the first definition that there is.
#define VISIBLE __attribute__((visibility("default")))

extern "C" {

VISIBLE unsigned sleep(unsigned seconds) {
  if (getpid() != gettid()) {  // libFuzzer's own thread, which looks at the memory now and then
    const timespec time{static_cast<time_t>(seconds), 0};
    nanosleep(&time, nullptr);
  } else if (fuzz::on_sleep) {
    fuzz::on_sleep(seconds);
  }
  return 0;
}

VISIBLE int usleep(useconds_t /*microseconds*/) { return 0; }

VISIBLE int fsync(int /*fd*/) { return 0; }

VISIBLE int fdatasync(int /*fd*/) { return 0; }

// The line is made all the same, so that a wrong one shows.
VISIBLE void syslog(int /*priority*/, const char* format, ...) {
  va_list arguments;
  va_start(arguments, format);
  std::vsnprintf(nullptr, 0, format, arguments);
  va_end(arguments);
}

}  // extern "C"
