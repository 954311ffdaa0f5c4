// Who is told that a LockFile waits.
#pragma once

#include <chrono>

namespace velkor {

// Called by the constructor of LockFile before each pause between two attempts, with nothing open
// or held; what it throws leaves the constructor. Null, as at the beginning: nobody is told. Not to
// be changed while another thread takes a lock.
extern void (*on_lock_pause)(std::chrono::milliseconds pause);

}  // namespace velkor
