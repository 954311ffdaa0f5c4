#include "tests/support/controlled_time.h"

#include <unistd.h>

#include <cstdlib>

namespace test {

ControlledTime& Time() {
  static ControlledTime time;
  return time;
}

}  // namespace test

// Visible to the shared library, whose calls are bound to the first definition that the program
// has.
#define VISIBLE __attribute__((visibility("default")))

extern "C" {

VISIBLE unsigned sleep(unsigned seconds) {
  test::Time().sleeps.push_back(seconds);
  if (test::Time().on_sleep) test::Time().on_sleep(seconds);
  return 0;
}

VISIBLE int usleep(useconds_t microseconds) {
  test::Time().usleeps.push_back(microseconds);
  if (test::Time().on_usleep) test::Time().on_usleep(microseconds);
  return 0;
}

VISIBLE int rand() noexcept {
  if (test::Time().rands.empty()) return 0;
  const int value = test::Time().rands.front();
  test::Time().rands.pop_front();
  return value;
}

}  // extern "C"
