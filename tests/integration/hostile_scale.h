// How far the tests with hostile input go.
#pragma once

#include <cstdlib>

namespace test {

// Whether this is the long run of scripts/hostile, which has minutes, and not the one of every day,
// which has a second.
inline bool IsLongRun() { return std::getenv("TEISEIGATRO_HOSTILE_LONG") != nullptr; }

template <typename Number>
Number Scaled(Number every_day, Number long_run) {
  return IsLongRun() ? long_run : every_day;
}

}  // namespace test
