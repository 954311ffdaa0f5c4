#include "tests/unit/host/faults.h"

#include <fcntl.h>
#include <grp.h>
#include <pwd.h>
#include <sched.h>
#include <stdlib.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>

#include "tests/support/own_calls.h"

Faults faults;

bool Fault::Strikes() {
  if (errors_.empty()) return false;
  if (spared_ > 0) {
    --spared_;
    return false;
  }
  errno = errors_.front();
  errors_.erase(errors_.begin());
  return true;
}

extern "C" {

int open(const char* path, int flags, ...) {
  static auto* const real = test::Real<int(const char*, int, ...)>("open");
  va_list arguments;
  va_start(arguments, flags);
  const mode_t mode = test::OpenMode(flags, arguments);
  va_end(arguments);
  return faults.open.Strikes() ? -1 : real(path, flags, mode);
}

int mkostemp(char* name, int flags) {
  static auto* const real = test::Real<int(char*, int)>("mkostemp");
  return faults.mkostemp.Strikes() ? -1 : real(name, flags);
}

int stat(const char* path, struct stat* info) noexcept {
  static auto* const real = test::Real<int(const char*, struct stat*)>("stat");
  return faults.stat.Strikes() ? -1 : real(path, info);
}

int rename(const char* from, const char* to) noexcept {
  static auto* const real = test::Real<int(const char*, const char*)>("rename");
  return faults.rename.Strikes() ? -1 : real(from, to);
}

int fsync(int fd) {
  static auto* const real = test::Real<int(int)>("fsync");
  return faults.fsync.Strikes() ? -1 : real(fd);
}

ssize_t write(int fd, const void* data, size_t size) {
  static auto* const real = test::Real<ssize_t(int, const void*, size_t)>("write");
  return faults.write.Strikes() ? -1 : real(fd, data, size);
}

ssize_t read(int fd, void* data, size_t size) {
  static auto* const real = test::Real<ssize_t(int, void*, size_t)>("read");
  return faults.read.Strikes() ? -1 : real(fd, data, size);
}

int fchown(int fd, uid_t owner, gid_t group) noexcept {
  static auto* const real = test::Real<int(int, uid_t, gid_t)>("fchown");
  return faults.fchown.Strikes() ? -1 : real(fd, owner, group);
}

int fchmod(int fd, mode_t mode) noexcept {
  static auto* const real = test::Real<int(int, mode_t)>("fchmod");
  return faults.fchmod.Strikes() ? -1 : real(fd, mode);
}

int futimens(int fd, const timespec* times) noexcept {
  static auto* const real = test::Real<int(int, const timespec*)>("futimens");
  return faults.futimens.Strikes() ? -1 : real(fd, times);
}

// Every argument that there may be is as wide as a pointer.
int fcntl(int fd, int command, ...) {
  static auto* const real = test::Real<int(int, int, ...)>("fcntl");
  va_list arguments;
  va_start(arguments, command);
  void* const argument = va_arg(arguments, void*);
  va_end(arguments);
  return faults.fcntl.Strikes() ? -1 : real(fd, command, argument);
}

ssize_t send(int fd, const void* data, size_t size, int flags) {
  static auto* const real = test::Real<ssize_t(int, const void*, size_t, int)>("send");
  return faults.send.Strikes() ? -1 : real(fd, data, size, flags);
}

ssize_t recv(int fd, void* data, size_t size, int flags) {
  static auto* const real = test::Real<ssize_t(int, void*, size_t, int)>("recv");
  return faults.recv.Strikes() ? -1 : real(fd, data, size, flags);
}

int socket(int domain, int type, int protocol) noexcept {
  static auto* const real = test::Real<int(int, int, int)>("socket");
  return faults.socket.Strikes() ? -1 : real(domain, type, protocol);
}

int connect(int fd, const sockaddr* address, socklen_t size) {
  static auto* const real = test::Real<int(int, const sockaddr*, socklen_t)>("connect");
  return faults.connect.Strikes() ? -1 : real(fd, address, size);
}

int setsockopt(int fd, int level, int name, const void* value, socklen_t size) noexcept {
  static auto* const real = test::Real<int(int, int, int, const void*, socklen_t)>("setsockopt");
  return faults.setsockopt.Strikes() ? -1 : real(fd, level, name, value, size);
}

// These two return what others leave in errno.
int getpwnam_r(const char* name, passwd* entry, char* buffer, size_t size, passwd** found) {
  static auto* const real =
      test::Real<int(const char*, passwd*, char*, size_t, passwd**)>("getpwnam_r");
  return faults.getpwnam_r.Strikes() ? errno : real(name, entry, buffer, size, found);
}

int getgrnam_r(const char* name, group* entry, char* buffer, size_t size, group** found) {
  static auto* const real =
      test::Real<int(const char*, group*, char*, size_t, group**)>("getgrnam_r");
  return faults.getgrnam_r.Strikes() ? errno : real(name, entry, buffer, size, found);
}

int setgroups(size_t count, const gid_t* groups) noexcept {
  static auto* const real = test::Real<int(size_t, const gid_t*)>("setgroups");
  return faults.setgroups.Strikes() ? -1 : real(count, groups);
}

int setegid(gid_t gid) noexcept {
  static auto* const real = test::Real<int(gid_t)>("setegid");
  return faults.setegid.Strikes() ? -1 : real(gid);
}

int seteuid(uid_t uid) noexcept {
  static auto* const real = test::Real<int(uid_t)>("seteuid");
  return faults.seteuid.Strikes() ? -1 : real(uid);
}

int unshare(int flags) noexcept {
  static auto* const real = test::Real<int(int)>("unshare");
  return faults.unshare.Strikes() ? -1 : real(flags);
}

int chdir(const char* path) noexcept {
  static auto* const real = test::Real<int(const char*)>("chdir");
  return faults.chdir.Strikes() ? -1 : real(path);
}

int statx(int dir, const char* path, int flags, unsigned mask, struct statx* info) noexcept {
  static auto* const real =
      test::Real<int(int, const char*, int, unsigned, struct statx*)>("statx");
  const int result = real(dir, path, flags, mask, info);
  if (!faults.statx_knows_mounts) {
    info->stx_attributes_mask &= ~static_cast<__u64>(STATX_ATTR_MOUNT_ROOT);
    info->stx_attributes &= ~static_cast<__u64>(STATX_ATTR_MOUNT_ROOT);
  }
  return result;
}

}  // extern "C"
