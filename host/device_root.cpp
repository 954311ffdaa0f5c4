#include "host/device_root.h"

#include <fcntl.h>
#include <sched.h>
#include <unistd.h>

#include <cerrno>
#include <stdexcept>
#include <string>
#include <system_error>

namespace host {
namespace {

// Performs the steps for one directory and names the one that fails.
class Entry {
 public:
  explicit Entry(const std::string& dir) : dir_(dir) {}

  // Maps the caller to root, the only identity that the namespace knows.
  void MakeUserNamespace() const {
    const std::string uid = std::to_string(geteuid());
    const std::string gid = std::to_string(getegid());
    if (unshare(CLONE_NEWUSER) != 0) {
      const int error = errno;
      Refuse("unshare(CLONE_NEWUSER)", error,
             error == EINVAL ? " (has the process started a thread already?)" : "");
    }
    // An unprivileged process may map a group only once it has given up setgroups.
    WriteLine("/proc/self/setgroups", "deny");
    WriteLine("/proc/self/uid_map", "0 " + uid + " 1");
    WriteLine("/proc/self/gid_map", "0 " + gid + " 1");
  }

  void ChangeRoot() const {
    if (chroot(dir_.c_str()) != 0) Refuse("chroot", errno);
    if (chdir("/") != 0) Refuse("chdir(\"/\")", errno);
  }

 private:
  [[noreturn]] void Refuse(const std::string& step, int error, const std::string& hint = "") const {
    throw std::runtime_error("cannot enter device root " + dir_ + ": " + step + ": " +
                             std::generic_category().message(error) + hint);
  }

  // The kernel takes such a file's text only as one write.
  void WriteLine(const char* path, const std::string& text) const {
    const int fd = open(path, O_WRONLY | O_CLOEXEC);
    if (fd < 0) Refuse(std::string("open ") + path, errno);
    const ssize_t written = write(fd, text.data(), text.size());
    const int error = errno;
    close(fd);
    if (written < 0) Refuse(std::string("write ") + path, error);
  }

  const std::string& dir_;
};

}  // namespace

void EnterDeviceRoot(const std::string& dir) {
  const Entry entry(dir);
  if (geteuid() != 0) entry.MakeUserNamespace();
  entry.ChangeRoot();
}

}  // namespace host
