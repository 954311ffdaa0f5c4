// Loaded into a process before every other library, records what it does to files and directories.
// Every act that changes one, or makes one durable, is recorded right after it, one at a time.
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/uio.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdarg>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <mutex>
#include <string>

#include "tests/reliability/disk_record.h"

#include "tests/support/own_calls.h"

namespace {

using test::DiskRecord;

std::mutex& OneAtATime() {
  static auto* const mutex = new std::mutex;  // for as long as the process makes calls
  return *mutex;
}

void Write(DiskRecord record, const std::string& name = "", const void* text = nullptr,
           std::size_t text_size = 0) {
  const int kept = errno;
  record.name_size = static_cast<std::uint32_t>(name.size());
  record.text_size = text_size;
  const std::array<iovec, 3> parts = {iovec{&record, sizeof(record)},
                                      iovec{const_cast<char*>(name.data()), name.size()},
                                      iovec{const_cast<void*>(text), text_size}};
  const auto size = static_cast<long>(sizeof(record) + name.size() + text_size);
  if (syscall(SYS_writev, test::kDiskRecordFd, parts.data(), parts.size()) != size) abort();
  errno = kept;
}

void Write(const DiskRecord& record, const std::string& name, const std::string& text) {
  Write(record, name, text.data(), text.size());
}

// What the recorded disk keeps: no socket, no device, and nothing of /proc.
bool IsKept(const struct stat& status) {
  static const unsigned long disk = std::strtoul(std::getenv(test::kRecordedDisk), nullptr, 10);
  return status.st_dev == disk && (S_ISREG(status.st_mode) || S_ISDIR(status.st_mode));
}

// An entry of a directory, as a call names it.
struct Entry {
  Entry(int at, const char* path) {
    std::string text = path;
    while (text.size() > 1 && text.back() == '/') text.pop_back();
    const std::size_t slash = text.rfind('/');
    name = slash == std::string::npos ? text : text.substr(slash + 1);
    const std::string parent = slash == std::string::npos ? "." : text.substr(0, slash + 1);
    const int kept = errno;
    struct stat status {};
    if (fstatat(at, parent.c_str(), &status, 0) == 0) directory = status.st_ino;
    exists = fstatat(at, path, &status, AT_SYMLINK_NOFOLLOW) == 0 && IsKept(status);
    if (exists) {
      file = status.st_ino;
      size = status.st_size;
    }
    errno = kept;
  }

  std::string name;
  std::uint64_t directory = 0;
  std::uint64_t file = 0;
  off_t size = 0;
  bool exists = false;
};

struct stat StatusOf(int fd) {
  const int kept = errno;
  struct stat status {};
  fstat(fd, &status);
  errno = kept;
  return status;
}

bool IsKept(int fd) { return IsKept(StatusOf(fd)); }

void RecordMade(DiskRecord::Kind kind, const Entry& entry, int at, const char* path) {
  struct stat status {};
  const int kept = errno;
  fstatat(at, path, &status, AT_SYMLINK_NOFOLLOW);
  errno = kept;
  if (!IsKept(status)) return;
  Write({kind, 0, 0, status.st_ino, entry.directory, status.st_mode & 07777U}, entry.name);
}

int Open(int at, const char* path, int flags, mode_t mode) {
  static auto* const real = test::Real<int(int, const char*, int, ...)>("openat64");
  if ((flags & (O_CREAT | O_TRUNC)) == 0) return real(at, path, flags, mode);
  const std::lock_guard<std::mutex> lock(OneAtATime());
  const Entry entry(at, path);
  const int fd = real(at, path, flags, mode);
  if (fd < 0 || !IsKept(fd)) return fd;
  if (!entry.exists) {
    RecordMade(DiskRecord::kMakeFile, entry, at, path);
  } else if ((flags & O_TRUNC) != 0 && entry.size != 0) {
    Write({DiskRecord::kTruncate, 0, 0, entry.file, 0, 0});
  }
  return fd;
}

int MakeTemporary(const char* function, char* name, int flags) {
  const std::lock_guard<std::mutex> lock(OneAtATime());
  const int fd = test::Real<int(char*, int)>(function)(name, flags);
  if (fd >= 0) RecordMade(DiskRecord::kMakeFile, Entry(AT_FDCWD, name), AT_FDCWD, name);
  return fd;
}

template <typename Act>
ssize_t WriteAt(int fd, const void* data, const Act& act) {
  if (!IsKept(fd)) return act(nullptr);
  const std::lock_guard<std::mutex> lock(OneAtATime());
  off_t offset = -1;
  const ssize_t size = act(&offset);
  if (size <= 0) return size;
  if (offset < 0) offset = lseek(fd, 0, SEEK_CUR) - size;
  Write({DiskRecord::kWrite, 0, 0, StatusOf(fd).st_ino, 0, static_cast<std::uint64_t>(offset)}, "",
        data, static_cast<std::size_t>(size));
  return size;
}

ssize_t WriteAtOffset(int fd, const void* data, size_t size, off_t offset) {
  static auto* const real = test::Real<ssize_t(int, const void*, size_t, off_t)>("pwrite64");
  return WriteAt(fd, data, [&](off_t* at) {
    if (at != nullptr) *at = offset;
    return real(fd, data, size, offset);
  });
}

int Truncate(int fd, off_t size) {
  static auto* const real = test::Real<int(int, off_t)>("ftruncate64");
  const std::lock_guard<std::mutex> lock(OneAtATime());
  const int result = real(fd, size);
  if (result == 0 && IsKept(fd)) {
    Write({DiskRecord::kTruncate, 0, 0, StatusOf(fd).st_ino, 0, static_cast<std::uint64_t>(size)});
  }
  return result;
}

int Sync(int (*real)(int), int fd) {
  if (!IsKept(fd)) return real(fd);
  const std::lock_guard<std::mutex> lock(OneAtATime());
  const int result = real(fd);
  if (result == 0) Write({DiskRecord::kSync, 0, 0, StatusOf(fd).st_ino, 0, 0});
  return result;
}

int Rename(int from_at, const char* from, int to_at, const char* to) {
  static auto* const real = test::Real<int(int, const char*, int, const char*)>("renameat");
  const std::lock_guard<std::mutex> lock(OneAtATime());
  const Entry source(from_at, from);
  const Entry target(to_at, to);
  const int result = real(from_at, from, to_at, to);
  if (result != 0 || !source.exists) return result;
  if (source.directory == target.directory) {
    Write({DiskRecord::kRename, 0, 0, source.file, source.directory, 0}, source.name, target.name);
  } else {
    Write({DiskRecord::kNotModelled, 0, 0, 0, 0, 0}, "",
          std::string("a rename to another directory"));
  }
  return result;
}

int Remove(int at, const char* path, int flags) {
  static auto* const real = test::Real<int(int, const char*, int)>("unlinkat");
  const std::lock_guard<std::mutex> lock(OneAtATime());
  const Entry entry(at, path);
  const int result = real(at, path, flags);
  if (result == 0 && entry.exists) {
    Write({DiskRecord::kRemove, 0, 0, entry.file, entry.directory, 0}, entry.name);
  }
  return result;
}

int MakeDirectory(int at, const char* path, mode_t mode) {
  static auto* const real = test::Real<int(int, const char*, mode_t)>("mkdirat");
  const std::lock_guard<std::mutex> lock(OneAtATime());
  const Entry entry(at, path);
  const int result = real(at, path, mode);
  if (result == 0) RecordMade(DiskRecord::kMakeDirectory, entry, at, path);
  return result;
}

mode_t ModeArgument(int flags, va_list arguments) {
  return (flags & O_CREAT) != 0 ? va_arg(arguments, mode_t) : 0;
}

}  // namespace

#define VISIBLE __attribute__((visibility("default")))

extern "C" {

VISIBLE int open(const char* path, int flags, ...) {
  va_list arguments;
  va_start(arguments, flags);
  const mode_t mode = ModeArgument(flags, arguments);
  va_end(arguments);
  return Open(AT_FDCWD, path, flags, mode);
}

VISIBLE int open64(const char* path, int flags, ...) {
  va_list arguments;
  va_start(arguments, flags);
  const mode_t mode = ModeArgument(flags, arguments);
  va_end(arguments);
  return Open(AT_FDCWD, path, flags, mode);
}

VISIBLE int openat(int at, const char* path, int flags, ...) {
  va_list arguments;
  va_start(arguments, flags);
  const mode_t mode = ModeArgument(flags, arguments);
  va_end(arguments);
  return Open(at, path, flags, mode);
}

VISIBLE int openat64(int at, const char* path, int flags, ...) {
  va_list arguments;
  va_start(arguments, flags);
  const mode_t mode = ModeArgument(flags, arguments);
  va_end(arguments);
  return Open(at, path, flags, mode);
}

VISIBLE int mkostemp(char* name, int flags) { return MakeTemporary("mkostemp", name, flags); }
VISIBLE int mkostemp64(char* name, int flags) { return MakeTemporary("mkostemp64", name, flags); }

VISIBLE ssize_t write(int fd, const void* data, size_t size) {
  static auto* const real = test::Real<ssize_t(int, const void*, size_t)>("write");
  return WriteAt(fd, data, [&](off_t*) { return real(fd, data, size); });
}

VISIBLE ssize_t pwrite(int fd, const void* data, size_t size, off_t offset) {
  return WriteAtOffset(fd, data, size, offset);
}

VISIBLE ssize_t pwrite64(int fd, const void* data, size_t size, off64_t offset) {
  return WriteAtOffset(fd, data, size, offset);
}

VISIBLE int ftruncate(int fd, off_t size) noexcept { return Truncate(fd, size); }
VISIBLE int ftruncate64(int fd, off64_t size) noexcept { return Truncate(fd, size); }

VISIBLE int fsync(int fd) {
  static auto* const real = test::Real<int(int)>("fsync");
  return Sync(real, fd);
}

VISIBLE int fdatasync(int fd) {
  static auto* const real = test::Real<int(int)>("fdatasync");
  return Sync(real, fd);
}

VISIBLE int rename(const char* from, const char* to) noexcept {
  return Rename(AT_FDCWD, from, AT_FDCWD, to);
}

VISIBLE int renameat(int from_at, const char* from, int to_at, const char* to) noexcept {
  return Rename(from_at, from, to_at, to);
}

VISIBLE int unlink(const char* path) noexcept { return Remove(AT_FDCWD, path, 0); }
VISIBLE int unlinkat(int at, const char* path, int flags) noexcept {
  return Remove(at, path, flags);
}
VISIBLE int rmdir(const char* path) noexcept { return Remove(AT_FDCWD, path, AT_REMOVEDIR); }

VISIBLE int mkdir(const char* path, mode_t mode) noexcept {
  return MakeDirectory(AT_FDCWD, path, mode);
}
VISIBLE int mkdirat(int at, const char* path, mode_t mode) noexcept {
  return MakeDirectory(at, path, mode);
}

VISIBLE int chmod(const char* path, mode_t mode) noexcept {
  static auto* const real = test::Real<int(const char*, mode_t)>("chmod");
  const std::lock_guard<std::mutex> lock(OneAtATime());
  const int result = real(path, mode);
  const Entry entry(AT_FDCWD, path);
  if (result == 0 && entry.exists) Write({DiskRecord::kMode, 0, 0, entry.file, 0, mode});
  return result;
}

VISIBLE int fchmod(int fd, mode_t mode) noexcept {
  static auto* const real = test::Real<int(int, mode_t)>("fchmod");
  const std::lock_guard<std::mutex> lock(OneAtATime());
  const int result = real(fd, mode);
  if (result == 0 && IsKept(fd)) Write({DiskRecord::kMode, 0, 0, StatusOf(fd).st_ino, 0, mode});
  return result;
}

}  // extern "C"
