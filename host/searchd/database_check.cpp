#include "host/searchd/database_check.h"

#include <syslog.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <utility>

namespace searchd {
namespace {

std::string ReadToEnd(int fd) {
  std::string text;
  std::array<char, 1024> part{};
  for (;;) {
    const ssize_t n = read(fd, part.data(), part.size());
    if (n < 0 && errno == EINTR) continue;
    if (n <= 0) return text;
    text.append(part.data(), static_cast<std::size_t>(n));
  }
}

}  // namespace

DatabaseCheck::DatabaseCheck(std::string path, CheckProcess& process, Files files)
    : path_(std::move(path)), process_(process) {
  if (files == Files::kFound) Begin();
}

unsigned DatabaseCheck::Await() {
  const std::lock_guard lock(mutex_);
  return AwaitLocked();
}

void DatabaseCheck::ThrowIfDamaged() {
  if (!damaged_) return;
  const std::unique_lock lock(mutex_, std::try_to_lock);
  if (!lock) return;
  LookLocked();
  if (damaged_) throw KnownDamage(damage_);
}

void DatabaseCheck::Renew() {
  const std::lock_guard lock(mutex_);
  renew_ = true;
  try {
    Begin();
  } catch (const RequestError& e) {  // the next use tries again
    syslog(LOG_ERR, "%s", e.what());
  }
}

// Begins to check the files anew if somebody else has changed them.
void DatabaseCheck::LookLocked() {
  if (!state_) state_ = StateOfFiles(path_);
  if (!writing_ && (renew_ || StateOfFiles(path_) != *state_)) Begin();
}

unsigned DatabaseCheck::AwaitLocked() {
  LookLocked();
  if (result_fd_) {
    const std::string result = ReadToEnd(result_fd_->Get());
    result_fd_.reset();
    if (result.empty()) {
      damage_ = path_ + " is damaged: the attempt to read it has crashed";
      syslog(LOG_ERR, "an index cannot be used: %s", damage_.c_str());
    } else if (result[0] != kNoDamage) {
      damage_ = result;
    }
    damaged_ = !damage_.empty();
  }
  if (damaged_) throw KnownDamage(damage_);
  return generation_;
}

// The state is taken before the files are read: what changes meanwhile is seen by the next Await.
void DatabaseCheck::Begin() {
  FilesState state = StateOfFiles(path_);
  result_fd_ = process_.Begin(path_);
  state_ = std::move(state);
  renew_ = false;
  damage_.clear();
  damaged_ = false;
  ++generation_;
}

DatabaseCheck::Writing::Writing(DatabaseCheck& check) : check_(check) {
  const std::lock_guard lock(check_.mutex_);
  generation_ = check_.AwaitLocked();
  check_.writing_ = true;
}

DatabaseCheck::Writing::~Writing() {
  const std::lock_guard lock(check_.mutex_);
  check_.state_ = StateOfFiles(check_.path_);
  check_.writing_ = false;
}

}  // namespace searchd
