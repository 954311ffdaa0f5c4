#include "tests/unit/searchd/disk_calls.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <filesystem>

#include "tests/support/own_calls.h"

DiskCalls disk_calls;

DiskCalls::File DiskCalls::FileAt(const std::string& path) {
  struct stat status {};
  if (stat(path.c_str(), &status) != 0) return {};
  return {status.st_dev, status.st_ino};
}

namespace {

void Step() {
  if (disk_calls.die_at > 0 && --disk_calls.die_at == 0) raise(SIGKILL);
}

// Pipes and sockets are not on the disk.
bool IsOnDisk(int fd, struct stat& status) {
  return fstat(fd, &status) == 0 && (S_ISREG(status.st_mode) || S_ISDIR(status.st_mode));
}

void Change(const DiskCalls::File& file) {
  disk_calls.changed.insert(file);
  disk_calls.unsynced.insert(file);
}

void Write(int fd) {
  struct stat status {};
  if (!IsOnDisk(fd, status)) return;
  Step();
  Change({status.st_dev, status.st_ino});
}

bool SyncFails(int fd) {
  Step();
  if (disk_calls.sync_error != 0) {
    errno = disk_calls.sync_error;
    return true;
  }
  struct stat status {};
  if (IsOnDisk(fd, status)) disk_calls.unsynced.erase({status.st_dev, status.st_ino});
  return false;
}

}  // namespace

#define VISIBLE __attribute__((visibility("default")))

extern "C" {

VISIBLE ssize_t write(int fd, const void* bytes, size_t size) {
  static auto* const real = test::Real<ssize_t(int, const void*, size_t)>("write");
  Write(fd);
  return real(fd, bytes, size);
}

VISIBLE ssize_t pwrite(int fd, const void* bytes, size_t size, off_t at) {
  static auto* const real = test::Real<ssize_t(int, const void*, size_t, off_t)>("pwrite");
  Write(fd);
  return real(fd, bytes, size, at);
}

VISIBLE int fsync(int fd) {
  static auto* const real = test::Real<int(int)>("fsync");
  return SyncFails(fd) ? -1 : real(fd);
}

VISIBLE int fdatasync(int fd) {
  static auto* const real = test::Real<int(int)>("fdatasync");
  return SyncFails(fd) ? -1 : real(fd);
}

VISIBLE int rename(const char* from, const char* to) noexcept {
  static auto* const real = test::Real<int(const char*, const char*)>("rename");
  Step();
  const int result = real(from, to);
  if (result == 0) Change(DiskCalls::FileAt(std::filesystem::path(to).parent_path()));
  return result;
}

VISIBLE int unlink(const char* path) noexcept {
  static auto* const real = test::Real<int(const char*)>("unlink");
  Step();
  return real(path);
}

}  // extern "C"
