// The steps at which a process that calls the library can be ended.
#pragma once

namespace test {

// From now on this process is killed when it comes to its n-th step, counted from 1. A step is a
// pause, a connection to the daemon, and each locking, renaming or removing of a file: everything
// that others see is done by one of them, so the n-th step finds the n-1 before it done and nothing
// more. For a process of one thread.
void DieAtStep(int n);

}  // namespace test
