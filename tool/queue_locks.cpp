#include "tool/queue_locks.h"

#include <sys/stat.h>

#include <cerrno>
#include <cstring>

#include "appindex/error.h"
#include "appindex/index_queue_internal.h"
#include "tool/failure.h"
#include "tool/lock_path.h"

namespace tool {
namespace {

using velkor::appindex::kProcessLockPath;
using velkor::appindex::kQueuePath;

std::string AdviceOnOpening(const LockPath& lock) {
  constexpr char kRemove[] = "remove it: it is made anew";
  if (lock.state == LockPath::kProtected) return kRemove;
  switch (lock.error) {
    case EISDIR:
    case ELOOP:
    case ENXIO:
      return kRemove;
    case ENOENT:
      return "make its directory";
    default:
      return AdviceOn(lock.error);
  }
}

Problem ProblemOfOpening(const LockPath& lock, const std::string& what_follows) {
  if (lock.state == LockPath::kOpens) return {};
  if (lock.state == LockPath::kWaits) {
    return {WhyNotOpened(lock) +
            ": whoever works the queue waits, without limit, until somebody opens it for writing; "
            "remove it, then start again whoever waits"};
  }
  return {WhyNotOpened(lock) + ": " + what_follows + "; " + AdviceOnOpening(lock), true,
          velkor::Error::kLockFileError};
}

Problem ProblemOfProcessLock(const Protection& protection) {
  return ProblemOfOpening(LookAtLock(kProcessLockPath, protection),
                          "nobody can work the queue, all requests wait");
}

// Only a regular file counts as a queue, and no link does. What else is there is not opened.
Problem ProblemOfQueueLock(const Protection& protection) {
  constexpr char kPassedOver[] = ": whoever works the queue takes it for none, and does nothing; ";
  struct stat file {};
  if (lstat(kQueuePath, &file) != 0) {
    const int error = errno;
    if (error == ENOENT) return {};
    return {std::strerror(error) + std::string(kPassedOver) + AdviceOn(error)};
  }
  if (!S_ISREG(file.st_mode)) {
    return {WhyNotRead(EINVAL) + kPassedOver + "remove it: it is made anew"};
  }
  return ProblemOfOpening(LookAtLock(kQueuePath, protection),
                          "the queue cannot be taken, its requests wait");
}

}  // namespace

std::vector<Lock> ReadLocks(int proc) {
  const Protection protection = ReadProtection(proc);
  return {
      {kProcessLockPath, LockHolders(proc, kProcessLockPath), ProblemOfProcessLock(protection)},
      {kQueuePath, LockHolders(proc, kQueuePath), ProblemOfQueueLock(protection)},
  };
}

}  // namespace tool
