// Time in a test's hands: a program that links this has sleep, usleep and rand of its own, which
// the library's calls resolve to. Nothing ever waits.
#pragma once

#include <deque>
#include <functional>
#include <vector>

namespace test {

struct ControlledTime {
  std::vector<unsigned> sleeps;   // seconds, one element a call
  std::vector<unsigned> usleeps;  // microseconds, one element a call
  std::deque<int> rands;          // what the next calls of rand give; 0 when there are no more
  // Called in place of waiting, after the call was recorded.
  std::function<void(unsigned)> on_sleep;
  std::function<void(unsigned)> on_usleep;
};

// The one object, used by the thread that calls the library.
ControlledTime& Time();

}  // namespace test
