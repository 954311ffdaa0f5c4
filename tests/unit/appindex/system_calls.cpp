#include "system_calls.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

#include "tests/support/own_calls.h"

namespace test {

SystemCalls& Calls() {
  static SystemCalls calls;
  return calls;
}

namespace {

bool Fails(SystemCall& call, const char* path) {
  call.paths.emplace_back(path);
  if (call.fails_for != path) return false;
  if (call.error != 0) errno = call.error == kNoErrno ? 0 : call.error;
  return true;
}

}  // namespace
}  // namespace test

extern "C" {

int access(const char* path, int mode) noexcept {
  static auto* const real = test::Real<int(const char*, int)>("access");
  return test::Fails(test::Calls().access, path) ? -1 : real(path, mode);
}

int chmod(const char* path, mode_t mode) noexcept {
  static auto* const real = test::Real<int(const char*, mode_t)>("chmod");
  return test::Fails(test::Calls().chmod, path) ? -1 : real(path, mode);
}

int rename(const char* from, const char* to) noexcept {
  static auto* const real = test::Real<int(const char*, const char*)>("rename");
  return test::Fails(test::Calls().rename, to) ? -1 : real(from, to);
}

int lstat(const char* path, struct stat* info) noexcept {
  return test::Fails(test::Calls().lstat, path)
             ? -1
             : fstatat(AT_FDCWD, path, info, AT_SYMLINK_NOFOLLOW);
}

DIR* opendir(const char* path) {
  static auto* const real = test::Real<DIR*(const char*)>("opendir");
  return test::Fails(test::Calls().opendir, path) ? nullptr : real(path);
}

}  // extern "C"
