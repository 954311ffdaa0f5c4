#include "tool/lock_path.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <system_error>

#include "appindex/utilities/file_utils.h"
#include "common/unique_fd.h"

namespace tool {
namespace {

constexpr int kMostLinks = 40;  // the kernel's own limit

int Setting(int proc, const char* name) {
  const velkor::UniqueFd fd(openat(proc, name, O_RDONLY | O_CLOEXEC));
  char text[16] = {};
  if (!fd.IsOpen() || read(fd.Get(), text, sizeof(text) - 1) < 0) return 0;
  return std::atoi(text);
}

// Where a file is made that is opened by this name: links that lead to nothing are followed.
std::string PlaceOf(const std::string& path) {
  std::filesystem::path place = path;
  std::error_code not_a_link;
  for (int links = 0; links < kMostLinks; ++links) {
    const std::filesystem::path target = std::filesystem::read_symlink(place, not_a_link);
    if (target.empty()) break;
    place = place.parent_path() / target;
  }
  return place.string();
}

// Where users write who are to leave each other's files alone, the kernel asks who made a file.
bool IsProtected(const std::string& path, const struct stat& file, const Protection& protection) {
  const int level = S_ISFIFO(file.st_mode)  ? protection.fifos
                    : S_ISREG(file.st_mode) ? protection.regular
                                            : 0;
  struct stat dir {};
  if (level == 0 || stat((velkor::Dirname(velkor::RealPath(path)) + "/").c_str(), &dir) != 0) {
    return false;
  }
  const bool is_shared =
      (dir.st_mode & S_IWOTH) != 0 || (level > 1 && (dir.st_mode & S_IWGRP) != 0);
  return (dir.st_mode & S_ISVTX) != 0 && is_shared && file.st_uid != dir.st_uid &&
         file.st_uid != geteuid();
}

LockPath Failing(int error) { return {LockPath::kFails, error, 0}; }

LockPath LookAtPlace(const std::string& path) {
  const std::string dir = velkor::Dirname(PlaceOf(path)) + "/";
  if (faccessat(AT_FDCWD, dir.c_str(), W_OK | X_OK, AT_EACCESS) != 0) return Failing(errno);
  return {};
}

}  // namespace

Protection ReadProtection(int proc) {
  return {Setting(proc, "sys/fs/protected_regular"), Setting(proc, "sys/fs/protected_fifos")};
}

LockPath LookAtLock(const std::string& path, const Protection& protection) {
  struct stat file {};
  if (stat(path.c_str(), &file) != 0) return errno == ENOENT ? LookAtPlace(path) : Failing(errno);
  if (S_ISDIR(file.st_mode)) return Failing(EISDIR);
  if (IsProtected(path, file, protection)) return {LockPath::kProtected, EACCES, file.st_uid};
  if (faccessat(AT_FDCWD, path.c_str(), R_OK, AT_EACCESS) != 0) return Failing(errno);
  if (S_ISSOCK(file.st_mode)) return Failing(ENXIO);
  return {S_ISFIFO(file.st_mode) ? LockPath::kWaits : LockPath::kOpens, 0, 0};
}

std::string WhyNotOpened(const LockPath& lock) {
  switch (lock.state) {
    case LockPath::kOpens:
      break;
    case LockPath::kFails:
      return std::strerror(lock.error);
    case LockPath::kProtected:
      return "it belongs to user " + std::to_string(lock.owner) +
             ", and the kernel keeps others from opening it so (fs.protected_regular, "
             "fs.protected_fifos)";
    case LockPath::kWaits:
      return "it is a FIFO";
  }
  return "";
}

}  // namespace tool
