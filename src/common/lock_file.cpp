#include "appindex/utilities/lock_file.h"

#include <fcntl.h>
#include <stdlib.h>
#include <sys/file.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstring>

#include "common/check.h"
#include "common/lock_pause.h"

namespace velkor {
namespace {

constexpr int kMaxAttempts = 64;
constexpr int kPauseSteps = 10;
constexpr std::chrono::milliseconds kPauseStep(100);

bool IsHeldElsewhere(int error) { return error == EINTR || error == EWOULDBLOCK; }

void Pause() {
  const std::chrono::milliseconds pause = (rand() % kPauseSteps) * kPauseStep;
  if (on_lock_pause != nullptr) on_lock_pause(pause);
  usleep(static_cast<useconds_t>(std::chrono::microseconds(pause).count()));
}

}  // namespace

void (*on_lock_pause)(std::chrono::milliseconds pause) = nullptr;

LockFile::LockFile(const std::string& path, bool exclusive) : fd_(-1), path_(path) {
  const int operation = (exclusive ? LOCK_EX : LOCK_SH) | LOCK_NB;
  for (int attempt = 0; attempt < kMaxAttempts; ++attempt) {
    fd_ = open(path_.c_str(), O_RDONLY | O_CREAT | O_CLOEXEC, 0644);
    CheckOrThrow(
        fd_ >= 0, {"lock_file", 15, "LockFile"},
        "0 > (fd_ = open(path_.c_str(), O_RDONLY | O_CREAT, 0644))", Error::kLockFileError,
        [this] { return "open failed, path=" + path_ + ", reason=" + std::strerror(errno); });
    if (flock(fd_, operation) == 0) return;
    // The descriptor is deliberately left open here, where no destructor will run.
    if (!IsHeldElsewhere(errno)) throw Error(Error::kLockFileError, std::strerror(errno));

    close(fd_);
    fd_ = -1;
    Pause();
  }
  throw Error(Error::kLockFileError, "Exceed max retry, path=" + path_);
}

LockFile::~LockFile() {
  if (fd_ < 0) return;
  flock(fd_, LOCK_UN);
  close(fd_);
}

}  // namespace velkor
