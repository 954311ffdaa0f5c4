#include "appindex/utilities/lock_mutex.h"

#include "common/check.h"

namespace velkor {

Mutex::Mutex() : mutex_() { pthread_mutex_init(&mutex_, nullptr); }

Mutex::~Mutex() { pthread_mutex_destroy(&mutex_); }

bool Mutex::Lock() { return pthread_mutex_lock(&mutex_) == 0; }

bool Mutex::TryLock() { return pthread_mutex_trylock(&mutex_) == 0; }

bool Mutex::Unlock() { return pthread_mutex_unlock(&mutex_) == 0; }

LockMutex::LockMutex(Mutex& mutex) : mutex_(mutex) {
  LogFailure(mutex_.Lock(), {"lock_mutex", 10, "LockMutex"}, "!mutex_.Lock()");
}

LockMutex::~LockMutex() {
  LogFailure(mutex_.Unlock(), {"lock_mutex", 15, "~LockMutex"}, "!mutex_.Unlock()");
}

}  // namespace velkor
