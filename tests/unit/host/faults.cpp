#include "tests/unit/host/faults.h"

#include <dlfcn.h>
#include <fcntl.h>
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
