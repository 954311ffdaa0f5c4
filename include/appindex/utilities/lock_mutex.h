// A lock between the threads of one process.
#pragma once

#include <pthread.h>

#include "appindex/export.h"

namespace velkor {

// A POSIX mutex with default attributes: not recursive, no error checking.
class TEISEIGATRO_EXPORT Mutex {
 public:
  Mutex();
  ~Mutex();
  Mutex(const Mutex&) = delete;
  Mutex& operator=(const Mutex&) = delete;

  // Each returns true when the call succeeded; none throws. Lock blocks until the mutex is free and
  // deadlocks when this thread holds it; TryLock returns false at once when any thread holds it.
  bool Lock();
  bool TryLock();
  bool Unlock();

 private:
  pthread_mutex_t mutex_;
};

// Holds a Mutex from construction to destruction. Never throws: a lock or an unlock that fails is
// logged and otherwise ignored. The mutex must outlive the object.
class TEISEIGATRO_EXPORT LockMutex {
 public:
  explicit LockMutex(Mutex& mutex);
  ~LockMutex();
  LockMutex(const LockMutex&) = delete;
  LockMutex& operator=(const LockMutex&) = delete;

 private:
  Mutex& mutex_;
};

}  // namespace velkor
