#include "tests/unit/host/faults.h"

#include <dlfcn.h>
#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

Faults faults;

bool Fault::Strikes() {
  if (times_ == 0) return false;
  if (spared_ > 0) {
    --spared_;
    return false;
  }
  --times_;
  errno = error_;
  return true;
}

namespace {

template <typename Function>
Function* Real(const char* name) {
  return reinterpret_cast<Function*>(dlsym(RTLD_NEXT, name));
}

}  // namespace

extern "C" {

int rename(const char* from, const char* to) noexcept {
  static auto* const real = Real<int(const char*, const char*)>("rename");
  return faults.rename.Strikes() ? -1 : real(from, to);
}

int fsync(int fd) {
  static auto* const real = Real<int(int)>("fsync");
  return faults.fsync.Strikes() ? -1 : real(fd);
}

ssize_t write(int fd, const void* data, size_t size) {
  static auto* const real = Real<ssize_t(int, const void*, size_t)>("write");
  return faults.write.Strikes() ? -1 : real(fd, data, size);
}

ssize_t read(int fd, void* data, size_t size) {
  static auto* const real = Real<ssize_t(int, void*, size_t)>("read");
  return faults.read.Strikes() ? -1 : real(fd, data, size);
}

ssize_t send(int fd, const void* data, size_t size, int flags) {
  static auto* const real = Real<ssize_t(int, const void*, size_t, int)>("send");
  return faults.send.Strikes() ? -1 : real(fd, data, size, flags);
}

ssize_t recv(int fd, void* data, size_t size, int flags) {
  static auto* const real = Real<ssize_t(int, void*, size_t, int)>("recv");
  return faults.recv.Strikes() ? -1 : real(fd, data, size, flags);
}

int socket(int domain, int type, int protocol) noexcept {
  static auto* const real = Real<int(int, int, int)>("socket");
  return faults.socket.Strikes() ? -1 : real(domain, type, protocol);
}

int connect(int fd, const sockaddr* address, socklen_t size) {
  static auto* const real = Real<int(int, const sockaddr*, socklen_t)>("connect");
  return faults.connect.Strikes() ? -1 : real(fd, address, size);
}

int setsockopt(int fd, int level, int name, const void* value, socklen_t size) noexcept {
  static auto* const real = Real<int(int, int, int, const void*, socklen_t)>("setsockopt");
  return faults.setsockopt.Strikes() ? -1 : real(fd, level, name, value, size);
}

int seteuid(uid_t uid) noexcept {
  static auto* const real = Real<int(uid_t)>("seteuid");
  return faults.seteuid.Strikes() ? -1 : real(uid);
}

int statx(int dir, const char* path, int flags, unsigned mask, struct statx* info) noexcept {
  static auto* const real = Real<int(int, const char*, int, unsigned, struct statx*)>("statx");
  const int result = real(dir, path, flags, mask, info);
  if (!faults.statx_knows_mounts) {
    info->stx_attributes_mask &= ~static_cast<__u64>(STATX_ATTR_MOUNT_ROOT);
    info->stx_attributes &= ~static_cast<__u64>(STATX_ATTR_MOUNT_ROOT);
  }
  return result;
}

}  // extern "C"
