#include "tests/unit/tool/recorded_calls.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdarg>
#include <utility>

#include "tests/support/own_calls.h"

namespace test {
namespace {

thread_local std::vector<std::string>* recorded = nullptr;
thread_local const std::vector<std::string>* failing_calls = nullptr;
thread_local FailingCall* failing_call = nullptr;

bool IsOf(int fd, mode_t type) {
  struct stat info {};
  return fstatat(fd, "", &info, AT_EMPTY_PATH) == 0 && (info.st_mode & S_IFMT) == type;
}

// Whether the call is to fail.
bool Fails(const std::string& call) {
  if (recorded == nullptr) return false;
  recorded->push_back(call);
  const auto begins = [&](const std::string& text) {
    return call.compare(0, text.size(), text) == 0;
  };
  const bool fails = std::any_of(failing_calls->begin(), failing_calls->end(), begins);
  if (fails) errno = EIO;
  return fails;
}

}  // namespace

RecordedCalls::RecordedCalls(std::vector<std::string>& calls, std::vector<std::string> failing)
    : failing_(std::move(failing)) {
  failing_calls = &failing_;
  recorded = &calls;
}

RecordedCalls::~RecordedCalls() { recorded = nullptr; }

FailingCall::FailingCall(std::string name, int error, int spared)
    : name_(std::move(name)), error_(error), spared_(spared) {
  failing_call = this;
}

FailingCall::~FailingCall() { failing_call = nullptr; }

bool FailingCall::Fails(const std::string& name) {
  if (name != name_ || HasFailed() || --spared_ >= 0) return false;
  errno = error_;
  return true;
}

namespace {

bool IsFailing(const char* name) { return failing_call != nullptr && failing_call->Fails(name); }

}  // namespace
}  // namespace test

// Bound to from everywhere in the program, before the C library's.
#define VISIBLE __attribute__((visibility("default")))

extern "C" {

VISIBLE ssize_t write(int fd, const void* data, size_t size) {
  if (test::recorded != nullptr && test::IsOf(fd, S_IFREG) &&
      test::Fails("write " + std::to_string(size) + " to a file")) {
    return -1;
  }
  return syscall(SYS_write, fd, data, size);
}

VISIBLE int fsync(int fd) {
  if (test::recorded != nullptr &&
      test::Fails(test::IsOf(fd, S_IFDIR) ? "fsync of a directory" : "fsync of a file")) {
    return -1;
  }
  return static_cast<int>(syscall(SYS_fsync, fd));
}

VISIBLE int ftruncate(int fd, off_t size) noexcept {
  if (test::recorded != nullptr && test::Fails("ftruncate to " + std::to_string(size))) return -1;
  return static_cast<int>(syscall(SYS_ftruncate, fd, size));
}

VISIBLE int flock(int fd, int operation) noexcept {
  return test::IsFailing("flock") ? -1 : static_cast<int>(syscall(SYS_flock, fd, operation));
}

VISIBLE int stat(const char* path, struct stat* info) noexcept {
  return test::IsFailing("stat") ? -1 : fstatat(AT_FDCWD, path, info, 0);
}

VISIBLE int fstat(int fd, struct stat* info) noexcept {
  return test::IsFailing("fstat") ? -1 : fstatat(fd, "", info, AT_EMPTY_PATH);
}

VISIBLE int lstat(const char* path, struct stat* info) noexcept {
  return test::IsFailing("lstat") ? -1 : fstatat(AT_FDCWD, path, info, AT_SYMLINK_NOFOLLOW);
}

VISIBLE ssize_t pread(int fd, void* data, size_t size, off_t at) {
  return test::IsFailing("pread") ? -1 : syscall(SYS_pread64, fd, data, size, at);
}

VISIBLE int open(const char* path, int flags, ...) {
  va_list arguments;
  va_start(arguments, flags);
  const mode_t mode = test::OpenMode(flags, arguments);
  va_end(arguments);
  return test::IsFailing("open")
             ? -1
             : static_cast<int>(syscall(SYS_openat, AT_FDCWD, path, flags, mode));
}

}  // extern "C"
