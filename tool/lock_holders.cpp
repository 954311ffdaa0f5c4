#include "tool/lock_holders.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <unistd.h>

#include <cstdio>
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

}  // namespace

std::vector<pid_t> HoldersIn(const std::string& locks, dev_t device, ino_t inode) {
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
    fields >> number >> kind >> mode >> access >> pid >> place;
    if (!fields || kind != "FLOCK" ||
        std::sscanf(place.c_str(), "%x:%x:%llu", &major_number, &minor_number, &file) != 3) {
      continue;
    }
    if (makedev(major_number, minor_number) == device && file == inode) pids.push_back(pid);
  }
  return pids;
}

std::vector<LockHolder> LockHolders(int proc, const std::string& path) {
  struct stat status {};
  std::vector<LockHolder> holders;
  if (stat(path.c_str(), &status) != 0) return holders;
  for (const pid_t pid : HoldersIn(ReadBelow(proc, "locks"), status.st_dev, status.st_ino)) {
    holders.push_back({pid, ProgramOf(proc, pid)});
  }
  return holders;
}

}  // namespace tool
