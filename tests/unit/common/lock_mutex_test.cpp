#include "appindex/utilities/lock_mutex.h"

#include <gmock/gmock.h>
#include <pthread.h>

#include <cerrno>
#include <functional>
#include <memory>
#include <thread>
#include <type_traits>

#include "tests/support/device_root_test.h"

// ThreadSanitizer would end the program at the failures that these tests provoke. Nothing else
// calls this.
extern "C" __attribute__((visibility("default"))) const char* __tsan_default_options() {
  return "report_mutex_bugs=0";
}

namespace {

using test::FailureLine;
using testing::ElementsAre;
using testing::IsEmpty;
using velkor::LockMutex;
using velkor::Mutex;

static_assert(!std::is_copy_constructible_v<Mutex> && !std::is_copy_assignable_v<Mutex>);
static_assert(!std::is_copy_constructible_v<LockMutex> && !std::is_copy_assignable_v<LockMutex>);
static_assert(std::is_nothrow_destructible_v<LockMutex>);

void InAnotherThread(const std::function<void()>& work) { std::thread(work).join(); }

bool IsHeld(Mutex& mutex) {
  bool taken = false;
  InAnotherThread([&] {
    taken = mutex.TryLock();
    if (taken) mutex.Unlock();
  });
  return !taken;
}

// The POSIX mutex inside, made anew with attributes under which calls can fail.
pthread_mutex_t* Remake(Mutex& mutex, const std::function<void(pthread_mutexattr_t*)>& configure) {
  static_assert(std::is_standard_layout_v<Mutex> && sizeof(Mutex) == sizeof(pthread_mutex_t));
  auto* const inside = reinterpret_cast<pthread_mutex_t*>(&mutex);
  pthread_mutexattr_t attributes;
  pthread_mutexattr_init(&attributes);
  configure(&attributes);
  pthread_mutex_destroy(inside);
  pthread_mutex_init(inside, &attributes);
  pthread_mutexattr_destroy(&attributes);
  return inside;
}

// Its calls report errors: locking what this thread holds, unlocking what it does not hold.
void MakeErrorChecking(Mutex& mutex) {
  Remake(mutex, [](pthread_mutexattr_t* attributes) {
    pthread_mutexattr_settype(attributes, PTHREAD_MUTEX_ERRORCHECK);
  });
}

// Neither locking nor unlocking works any more: its owner died and what it guards was given up.
void MakeNotRecoverable(Mutex& mutex) {
  pthread_mutex_t* const inside = Remake(mutex, [](pthread_mutexattr_t* attributes) {
    pthread_mutexattr_setrobust(attributes, PTHREAD_MUTEX_ROBUST);
  });
  InAnotherThread([&] { pthread_mutex_lock(inside); });
  ASSERT_EQ(pthread_mutex_lock(inside), EOWNERDEAD);
  pthread_mutex_unlock(inside);
}

TEST(MutexTest, LockTryLockAndUnlockTellThatTheyWorked) {
  Mutex mutex;
  EXPECT_TRUE(mutex.Lock());
  EXPECT_TRUE(mutex.Unlock());
  EXPECT_TRUE(mutex.TryLock());
  EXPECT_TRUE(mutex.Unlock());
}

TEST(MutexTest, TryLockOfAMutexHeldByAnotherThreadIsFalseAtOnce) {
  Mutex mutex;
  mutex.Lock();
  bool taken = true;
  InAnotherThread([&] { taken = mutex.TryLock(); });  // would never end if it waited
  EXPECT_FALSE(taken);
  mutex.Unlock();
}

TEST(MutexTest, TryLockOfAMutexHeldByThisThreadIsFalse) {
  Mutex mutex;
  mutex.Lock();
  EXPECT_FALSE(mutex.TryLock());
  mutex.Unlock();
}

TEST(MutexTest, LockThatFailsIsFalse) {
  Mutex mutex;
  MakeErrorChecking(mutex);
  ASSERT_TRUE(mutex.Lock());
  EXPECT_FALSE(mutex.Lock());
  EXPECT_TRUE(mutex.Unlock());
}

TEST(MutexTest, UnlockThatFailsIsFalse) {
  Mutex mutex;
  MakeErrorChecking(mutex);
  EXPECT_FALSE(mutex.Unlock());
}

TEST(MutexTest, LockWaitsUntilTheMutexIsFree) {
  Mutex mutex;
  int guarded = 0;
  mutex.Lock();
  std::thread other([&] {
    mutex.Lock();
    guarded *= 2;
    mutex.Unlock();
  });
  guarded = 21;
  mutex.Unlock();
  other.join();
  EXPECT_EQ(guarded, 42);
}

class LockMutexTest : public test::DeviceRootTest {
 protected:
  Mutex mutex_;
};

TEST_F(LockMutexTest, HoldsTheMutexForTheLifeOfItsBlock) {
  {
    const LockMutex lock(mutex_);
    EXPECT_TRUE(IsHeld(mutex_));
  }
  EXPECT_FALSE(IsHeld(mutex_));
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(LockMutexTest, UnlocksWhenItsBlockIsLeftByAnException) {
  EXPECT_THROW(
      {
        const LockMutex lock(mutex_);
        throw 1;
      },
      int);
  EXPECT_FALSE(IsHeld(mutex_));
}

TEST_F(LockMutexTest, NestedScopesOnTwoMutexesReleaseInReverseOrder) {
  struct AtDestruction {
    std::function<void()> look;
    ~AtDestruction() { look(); }
  };
  Mutex second;
  bool looked = false;
  {
    const LockMutex first_lock(mutex_);
    const AtDestruction between{[&] {
      looked = true;
      EXPECT_FALSE(IsHeld(second));
      EXPECT_TRUE(IsHeld(mutex_));
    }};
    const LockMutex second_lock(second);
    EXPECT_TRUE(IsHeld(second));
  }
  EXPECT_TRUE(looked);
  EXPECT_FALSE(IsHeld(mutex_));
}

TEST_F(LockMutexTest, AFailedLockIsLoggedAndNotThrown) {
  MakeErrorChecking(mutex_);
  mutex_.Lock();
  errno = 0;
  {
    const LockMutex lock(mutex_);
    EXPECT_EQ(errno, 0);
    EXPECT_THAT(TakeLog(),
                ElementsAre(FailureLine("lock_mutex", 10, "LockMutex", "Failed [!mutex_.Lock()]")));
  }
}

TEST_F(LockMutexTest, AFailedLockWithErrnoSetIsLoggedWithItsTextAndClearsIt) {
  MakeErrorChecking(mutex_);
  mutex_.Lock();
  errno = ENOENT;
  {
    const LockMutex lock(mutex_);
    EXPECT_EQ(errno, 0);
    EXPECT_THAT(TakeLog(), ElementsAre(FailureLine("lock_mutex", 10, "LockMutex",
                                                   "Failed [!mutex_.Lock()] [err: No such file or "
                                                   "directory]")));
  }
}

TEST_F(LockMutexTest, AFailedUnlockIsLoggedAndNotThrown) {
  MakeErrorChecking(mutex_);
  auto lock = std::make_unique<LockMutex>(mutex_);
  mutex_.Unlock();
  errno = 0;
  lock.reset();
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(FailureLine("lock_mutex", 15, "~LockMutex",
                                                 "Failed [!mutex_.Unlock()]")));
}

TEST_F(LockMutexTest, AFailedUnlockWithErrnoSetIsLoggedWithItsTextAndClearsIt) {
  MakeErrorChecking(mutex_);
  auto lock = std::make_unique<LockMutex>(mutex_);
  mutex_.Unlock();
  errno = ENOENT;
  lock.reset();
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(FailureLine("lock_mutex", 15, "~LockMutex",
                                                 "Failed [!mutex_.Unlock()] [err: No such file or "
                                                 "directory]")));
}

TEST_F(LockMutexTest, AFailedLockIsFollowedByAFailedUnlockAndBothAreLogged) {
  MakeNotRecoverable(mutex_);
  errno = ENOENT;
  { const LockMutex lock(mutex_); }
  EXPECT_THAT(TakeLog(), ElementsAre(FailureLine("lock_mutex", 10, "LockMutex",
                                                 "Failed [!mutex_.Lock()] [err: No such file or "
                                                 "directory]"),
                                     FailureLine("lock_mutex", 15, "~LockMutex",
                                                 "Failed [!mutex_.Unlock()]")));
}

TEST_F(LockMutexTest, AfterAFailedLockTheDestructorStillUnlocks) {
  MakeErrorChecking(mutex_);
  mutex_.Lock();
  { const LockMutex lock(mutex_); }
  EXPECT_FALSE(IsHeld(mutex_));
}

}  // namespace
