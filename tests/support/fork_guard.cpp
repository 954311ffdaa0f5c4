#include "tests/support/fork_guard.h"

#include <pthread.h>

#include <new>

namespace test {
namespace {

std::mutex& Mutex() {
  static std::mutex mutex;
  static const int registered = pthread_atfork([] { Mutex().lock(); }, [] { Mutex().unlock(); },
                                               // It is another thread's in the eyes of the child.
                                               [] { new (&Mutex()) std::mutex; });
  static_cast<void>(registered);
  return mutex;
}

}  // namespace

ForkGuard HoldForks() { return ForkGuard(Mutex()); }

}  // namespace test
