/// @file
/// A lock between the threads of one process.
#pragma once

#include <pthread.h>

#include "appindex/export.h"

namespace velkor {

/// A POSIX mutex with default attributes: not recursive, no error checking.
class TEISEIGATRO_EXPORT Mutex {
 public:
  Mutex();
  ~Mutex();
  Mutex(const Mutex&) = delete;             ///< not copied
  Mutex& operator=(const Mutex&) = delete;  ///< not copied

  /// Waits until the mutex is free and takes it, for ever when this thread holds it already. True
  /// when it is taken. Never throws.
  bool Lock();
  /// Takes the mutex if it is free. False at once when any thread holds it. Never throws.
  bool TryLock();
  /// Frees the mutex, which this thread must hold. True when that worked. Never throws.
  bool Unlock();

 private:
  pthread_mutex_t mutex_;
};

/// Holds a Mutex from construction to destruction. Never throws: a lock or an unlock that fails is
/// logged and otherwise ignored. The mutex must outlive the object.
class TEISEIGATRO_EXPORT LockMutex {
 public:
  /// Waits until `mutex` is free and takes it.
  explicit LockMutex(Mutex& mutex);
  ~LockMutex();
  LockMutex(const LockMutex&) = delete;             ///< not copied
  LockMutex& operator=(const LockMutex&) = delete;  ///< not copied

 private:
  Mutex& mutex_;
};

}  // namespace velkor
