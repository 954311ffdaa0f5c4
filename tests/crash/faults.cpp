#include "tests/crash/faults.h"

#include <fcntl.h>
#include <sys/syscall.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <stdexcept>

namespace test {
namespace {

constexpr int kPart = 0;  // stands for a short read or write

struct Entry {
  long number;
  const char* name;
  std::vector<int> errors;  // none: it does not fail
};

// EINTR is in the list of a call that waits, and comes once: for good it would be no interruption.
const std::vector<Entry>& Table() {
  static const std::vector<Entry> table = {
    {SYS_openat, "openat", {EIO, EACCES, EMFILE, ENOMEM, EINTR}},
    {SYS_read, "read", {EIO, ENOMEM, EINTR, kPart}},
    {SYS_pread64, "pread64", {EIO, ENOMEM, EINTR, kPart}},
    {SYS_write, "write", {EIO, ENOSPC, EDQUOT, EROFS, EINTR, kPart}},
    {SYS_pwrite64, "pwrite64", {EIO, ENOSPC, EDQUOT, EROFS, EINTR, kPart}},
    {SYS_writev, "writev", {EIO, ENOSPC, EDQUOT, EROFS, EINTR, kPart}},
    {SYS_close, "close", {EIO, EINTR}},
    {SYS_fsync, "fsync", {EIO, ENOSPC, EDQUOT, EROFS}},
    {SYS_fdatasync, "fdatasync", {EIO, ENOSPC, EDQUOT, EROFS}},
    {SYS_ftruncate, "ftruncate", {EIO, EINTR, EROFS}},
    {SYS_fchmod, "fchmod", {EIO, EROFS, EPERM}},
    {SYS_unlinkat, "unlinkat", {EIO, EROFS, EACCES}},
    {SYS_mkdirat, "mkdirat", {EIO, ENOSPC, EDQUOT, EROFS, EACCES}},
    {SYS_newfstatat, "newfstatat", {EIO, EACCES, ENOMEM}},
    {SYS_statx, "statx", {EIO, EACCES, ENOMEM}},
    {SYS_faccessat, "faccessat", {EIO, EACCES, ENOMEM}},
    {SYS_faccessat2, "faccessat2", {EIO, EACCES, ENOMEM}},
    {SYS_readlinkat, "readlinkat", {EIO, EACCES, ENOMEM}},
    {SYS_getdents64, "getdents64", {EIO, ENOMEM}},
    {SYS_lseek, "lseek", {}},
    {SYS_flock, "flock", {EINTR, EWOULDBLOCK, ENOLCK}},
    {SYS_fcntl, "fcntl", {ENOMEM}},
    {SYS_socket, "socket", {EMFILE, ENOMEM, EACCES}},
    {SYS_connect, "connect", {ECONNREFUSED, EACCES, EAGAIN, EINTR}},
    {SYS_setsockopt, "setsockopt", {ENOMEM}},
    {SYS_sendto, "sendto", {EPIPE, ENOBUFS, ENOMEM, EINTR, kPart}},
    {SYS_recvfrom, "recvfrom", {ECONNRESET, ENOMEM, EINTR, kPart}},
    {SYS_setgroups, "setgroups", {EPERM, ENOMEM}},
    {SYS_setresuid, "setresuid", {EAGAIN, EPERM, ENOMEM}},
    {SYS_setresgid, "setresgid", {EPERM}},
    {SYS_getrandom, "getrandom", {EAGAIN, EINTR}},
    {SYS_getgroups, "getgroups", {}},
    {SYS_getresuid, "getresuid", {}},
    {SYS_getpid, "getpid", {}},
    {SYS_gettid, "gettid", {}},
    {SYS_getuid, "getuid", {}},
    {SYS_geteuid, "geteuid", {}},
    {SYS_getgid, "getgid", {}},
    {SYS_getegid, "getegid", {}},
    {SYS_umask, "umask", {}},
    {SYS_rt_sigaction, "rt_sigaction", {}},
    {SYS_rt_sigprocmask, "rt_sigprocmask", {}},
    {SYS_futex, "futex", {}},
    {SYS_tgkill, "tgkill", {}},
#if defined(__x86_64__)
    {SYS_access, "access", {EIO, EACCES, ENOMEM}},
    {SYS_stat, "stat", {EIO, EACCES, ENOMEM}},
    {SYS_lstat, "lstat", {EIO, EACCES, ENOMEM}},
    {SYS_fstat, "fstat", {EIO, ENOMEM}},
    {SYS_readlink, "readlink", {EIO, EACCES, ENOMEM}},
    {SYS_rename, "rename", {EIO, ENOSPC, EDQUOT, EROFS, EACCES}},
    {SYS_unlink, "unlink", {EIO, EROFS, EACCES}},
    {SYS_mkdir, "mkdir", {EIO, ENOSPC, EDQUOT, EROFS, EACCES}},
    {SYS_rmdir, "rmdir", {EIO, EROFS, EACCES}},
    {SYS_chmod, "chmod", {EIO, EROFS, EPERM}},
#endif
  };
  return table;
}

const Entry* Find(long number) {
  const auto found = std::find_if(Table().begin(), Table().end(),
                                  [number](const Entry& entry) { return entry.number == number; });
  return found == Table().end() ? nullptr : &*found;
}

// A call that makes a file may find that there is no room for one.
std::vector<int> MoreErrorsOfOpen(std::uint64_t flags) {
  if ((flags & O_CREAT) != 0) return {ENOSPC, EDQUOT, EROFS};
  if ((flags & O_ACCMODE) != O_RDONLY) return {EROFS};
  return {};
}

std::vector<int> MoreErrorsOfFcntl(std::uint64_t command) {
  switch (command) {
    case F_DUPFD:
    case F_DUPFD_CLOEXEC:
      return {EMFILE};
    case F_SETLK:
    case F_OFD_SETLK:
      return {EAGAIN, ENOLCK, EINTR};
    case F_SETLKW:
      return {EDEADLK, ENOLCK, EINTR};
    case F_OFD_SETLKW:
      return {ENOLCK, EINTR};
    default:
      return {};
  }
}

std::vector<int> ErrorsOf(const SystemCall& call, const Entry& entry) {
  std::vector<int> errors = entry.errors;
  std::vector<int> more;
  if (call.number == SYS_openat) more = MoreErrorsOfOpen(call.arguments[2]);
  if (call.number == SYS_fcntl) more = MoreErrorsOfFcntl(call.arguments[1]);
  errors.insert(errors.end(), more.begin(), more.end());
  // A part of one byte, or of one of writev's pieces, or of nothing is not less than it.
  if (call.arguments[2] < 2)
    errors.erase(std::remove(errors.begin(), errors.end(), kPart), errors.end());
  return errors;
}

}  // namespace

std::string Fault::Text(long number) const {
  return NameOfCall(number) +
         (error == kPart ? " takes a part" : std::string(" fails with ") + strerrorname_np(error)) +
         (for_good ? " for good" : "");
}

Step Fault::Inject(const SystemCall& call) const {
  Step step;
  if (error == kPart) {
    step.kind = Step::kReplaceArgument;
    step.argument = 2;
    step.value = std::max<std::uint64_t>(1, call.arguments[2] / 2);
  } else {
    // A descriptor is gone after a failed close too.
    step.kind = call.number == SYS_close ? Step::kFailAfterwards : Step::kFail;
    step.error = error;
  }
  step.last = !for_good;
  return step;
}

std::vector<Fault> FaultsOf(const SystemCall& call) {
  const Entry* const entry = Find(call.number);
  if (entry == nullptr) {
    throw std::runtime_error("nothing is known of system call " + std::to_string(call.number));
  }
  std::vector<Fault> faults;
  for (const int error : ErrorsOf(call, *entry)) {
    faults.push_back({error, false});
    if (error != EINTR) faults.push_back({error, true});
  }
  return faults;
}

bool MayFailSo(const SystemCall& call, const Fault& fault) {
  const std::vector<Fault> faults = FaultsOf(call);
  return std::any_of(faults.begin(), faults.end(),
                     [&](const Fault& other) { return other.error == fault.error; });
}

bool IsPassedOver(const SystemCall& call) {
  switch (call.number) {
    case SYS_brk:
    case SYS_mmap:
    case SYS_munmap:
    case SYS_mprotect:
    case SYS_mremap:
    case SYS_madvise:
    case SYS_getrandom:
      return true;
    default:
      return false;
  }
}

std::string NameOfCall(long number) {
  const Entry* const entry = Find(number);
  return entry == nullptr ? "system call " + std::to_string(number) : entry->name;
}

}  // namespace test
