// The memory of the program and of every library in it, in a test's hands: whoever links this has
// an operator new of its own, which the calls of shared libraries resolve to as well.
#pragma once

namespace test {

enum class Shortage {
  kOnce,     // one allocation fails, those after it succeed
  kForGood,  // it and every one after it fail
};

// From now on, and until EndShortage, the n-th allocation of this thread fails, counted from 1;
// with 0 none does. To be called by one thread only.
void BeginShortage(long n, Shortage shortage);

// Returns how many allocations there were since BeginShortage, those that failed too.
long EndShortage();

// How many blocks this thread has taken and not given back.
long BlocksHeld();

}  // namespace test
