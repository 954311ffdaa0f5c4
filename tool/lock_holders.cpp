#include "tool/lock_holders.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <sstream>

#include "common/unique_fd.h"

namespace tool {
namespace {

// Files of /proc have no size: read to the end.
std::string ReadBelow(int proc, const std::string& name) {
  const velkor::UniqueFd fd(openat(proc, name.c_str(), O_RDONLY | O_CLOEXEC));
  std::string text;
  char buffer[4096];
  ssize_t size = 0;
  while (fd.IsOpen() && (size = read(fd.Get(), buffer, sizeof(buffer))) > 0) {
    text.append(buffer, static_cast<std::size_t>(size));
  }
  return text;
}

std::string ProgramOf(int proc, pid_t pid) {
  std::string name = ReadBelow(proc, std::to_string(pid) + "/comm");
  if (!name.empty() && name.back() == '\n') name.pop_back();
  return name;
}

// The names in a directory below `proc`; none when it cannot be read, which `readable` tells.
std::vector<std::string> NamesIn(int proc, const std::string& dir, bool& readable) {
  const int fd = openat(proc, dir.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  const std::unique_ptr<DIR, int (*)(DIR*)> open_dir(fd < 0 ? nullptr : fdopendir(fd), closedir);
  readable = open_dir != nullptr;
  std::vector<std::string> names;
  while (const dirent* entry = readable ? readdir(open_dir.get()) : nullptr) {
    names.emplace_back(static_cast<const char*>(entry->d_name));
  }
  return names;
}

// Whether the process has the file open; `if_hidden` when it does not show what it has.
bool HasOpen(int proc, pid_t pid, const struct stat& file, bool if_hidden) {
  const std::string dir = std::to_string(pid) + "/fd";
  bool readable = false;
  const std::vector<std::string> names = NamesIn(proc, dir, readable);
  if (!readable) return if_hidden && errno != ENOENT;
  return std::any_of(names.begin(), names.end(), [&](const std::string& name) {
    struct stat opened {};
    return fstatat(proc, (dir + "/" + name).c_str(), &opened, 0) == 0 &&
           opened.st_dev == file.st_dev && opened.st_ino == file.st_ino;
  });
}

// The processes that have the file open, but for those that wait for its lock.
std::vector<LockHolder> Openers(int proc, const std::string& locks, const struct stat& file) {
  const std::vector<pid_t> waiting = WaitersIn(locks, file.st_dev, file.st_ino);
  std::vector<LockHolder> openers;
  bool readable = false;
  for (const std::string& name : NamesIn(proc, ".", readable)) {
    const pid_t pid = std::atoi(name.c_str());
    const bool waits = std::count(waiting.begin(), waiting.end(), pid) != 0;
    if (pid > 0 && !waits && HasOpen(proc, pid, file, false)) {
      openers.push_back({pid, ProgramOf(proc, pid)});
    }
  }
  return openers;
}

// The processes of the lines about the file of those that hold the lock, or of those that wait.
std::vector<pid_t> PidsIn(const std::string& locks, dev_t device, ino_t inode, bool waiting) {
  std::vector<pid_t> pids;
  std::istringstream lines(locks);
  std::string line;
  while (std::getline(lines, line)) {
    // "1: FLOCK  ADVISORY  WRITE 1234 08:01:5678 0 EOF"; one that waits has "->" behind the colon.
    std::istringstream fields(line);
    std::string number, kind, mode, access;
    pid_t pid = 0;
    unsigned major_number = 0;
    unsigned minor_number = 0;
    unsigned long long file = 0;
    std::string place;
    fields >> number >> kind;
    const bool waits = kind == "->";
    if (waits) fields >> kind;
    fields >> mode >> access >> pid >> place;
    if (!fields || kind != "FLOCK" || waits != waiting ||
        std::sscanf(place.c_str(), "%x:%x:%llu", &major_number, &minor_number, &file) != 3) {
      continue;
    }
    if (makedev(major_number, minor_number) == device && file == inode) pids.push_back(pid);
  }
  return pids;
}

}  // namespace

std::vector<pid_t> HoldersIn(const std::string& locks, dev_t device, ino_t inode) {
  return PidsIn(locks, device, inode, false);
}

std::vector<pid_t> WaitersIn(const std::string& locks, dev_t device, ino_t inode) {
  return PidsIn(locks, device, inode, true);
}

std::vector<LockHolder> LockHolders(int proc, const std::string& path) {
  struct stat file {};
  std::vector<LockHolder> holders;
  if (stat(path.c_str(), &file) != 0) return holders;
  const std::string locks = ReadBelow(proc, "locks");
  for (const pid_t pid : HoldersIn(locks, file.st_dev, file.st_ino)) {
    if (HasOpen(proc, pid, file, true)) {
      holders.push_back({pid, ProgramOf(proc, pid)});
      continue;
    }
    // The kernel names who took the lock. It is held by whoever has got the open file from there.
    const std::vector<LockHolder> heirs = Openers(proc, locks, file);
    holders.insert(holders.end(), heirs.begin(), heirs.end());
    if (heirs.empty()) holders.push_back({pid, "", true});
  }
  return holders;
}

}  // namespace tool
