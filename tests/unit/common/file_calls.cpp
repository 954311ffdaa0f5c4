#include "file_calls.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <utility>

#include "tests/support/own_calls.h"

namespace test {
namespace {

thread_local const FileCallHook::Hook* current_hook = nullptr;

// Whether the call has to fail; errno is then set, and otherwise as it was.
bool Fails(const char* name, int fd, const char* path = "") {
  if (current_hook == nullptr) return false;
  const FileCallHook::Hook* const hook = std::exchange(current_hook, nullptr);
  const int kept = errno;
  const FileCallResult result = (*hook)({name, fd, path});
  errno = result.value_or(kept);
  current_hook = hook;
  return result.has_value();
}

}  // namespace

FileCallHook::FileCallHook(Hook hook) : hook_(std::move(hook)) { current_hook = &hook_; }
FileCallHook::~FileCallHook() { current_hook = nullptr; }

}  // namespace test

extern "C" {

int open(const char* path, int flags, ...) {
  static auto* const real = test::Real<int(const char*, int, ...)>("open");
  va_list arguments;
  va_start(arguments, flags);
  const mode_t mode = test::OpenMode(flags, arguments);
  va_end(arguments);
  return test::Fails("open", -1, path) ? -1 : real(path, flags, mode);
}

int close(int fd) {
  static auto* const real = test::Real<int(int)>("close");
  if (!test::Fails("close", fd)) return real(fd);
  const int error = errno;
  real(fd);
  errno = error;
  return -1;
}

ssize_t read(int fd, void* data, size_t size) {
  static auto* const real = test::Real<ssize_t(int, void*, size_t)>("read");
  return test::Fails("read", fd) ? -1 : real(fd, data, size);
}

ssize_t write(int fd, const void* data, size_t size) {
  static auto* const real = test::Real<ssize_t(int, const void*, size_t)>("write");
  return test::Fails("write", fd) ? -1 : real(fd, data, size);
}

int fsync(int fd) {
  static auto* const real = test::Real<int(int)>("fsync");
  return test::Fails("fsync", fd) ? -1 : real(fd);
}

int fchmod(int fd, mode_t mode) noexcept {
  static auto* const real = test::Real<int(int, mode_t)>("fchmod");
  return test::Fails("fchmod", fd) ? -1 : real(fd, mode);
}

int rename(const char* from, const char* to) noexcept {
  static auto* const real = test::Real<int(const char*, const char*)>("rename");
  return test::Fails("rename", -1, to) ? -1 : real(from, to);
}

int fstat(int fd, struct stat* info) noexcept {
  return test::Fails("fstat", fd) ? -1 : fstatat(fd, "", info, AT_EMPTY_PATH);
}

ssize_t readlink(const char* path, char* content, size_t size) noexcept {
  static auto* const real = test::Real<ssize_t(const char*, char*, size_t)>("readlink");
  return test::Fails("readlink", -1, path) ? -1 : real(path, content, size);
}

int flock(int fd, int operation) noexcept {
  static auto* const real = test::Real<int(int, int)>("flock");
  return test::Fails("flock", fd) ? -1 : real(fd, operation);
}

}  // extern "C"
