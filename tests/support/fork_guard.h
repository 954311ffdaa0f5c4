// Forks beside threads of a test.
#pragma once

#include <mutex>

namespace test {

// Held by a test's own thread while it allocates memory or frees some: no thread forks meanwhile.
// The child of a fork has only the thread that forked; where the allocator does not expect forks,
// as AddressSanitizer's, a lock of it that another thread held at that moment stays locked for
// ever.
using ForkGuard = std::unique_lock<std::mutex>;
ForkGuard HoldForks();

}  // namespace test
