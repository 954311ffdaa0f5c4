// How much memory the program holds: whoever links this has malloc and its like of its own, which
// the calls of shared libraries resolve to as well. For a program of one thread.
#pragma once

#include <cstddef>

namespace bench {

// What is allocated now, in bytes as the allocator gives them out.
std::size_t HeapNow();

// The most that has been allocated at once since the last call of BeginPeak.
std::size_t HeapPeak();
void BeginPeak();

}  // namespace bench
