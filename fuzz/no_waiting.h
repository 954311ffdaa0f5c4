// A target that links no_waiting.cpp never waits: neither for a time nor for a disk, and not for
// the system log either.
#pragma once

#include <functional>

namespace fuzz {

// Called in place of each sleep of the thread that tries inputs, with its seconds. May be empty.
extern std::function<void(unsigned seconds)> on_sleep;

}  // namespace fuzz
