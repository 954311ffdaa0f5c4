// A package manager's part: after it has installed or removed packages it leaves a request for each
// of their descriptors in the work queue.
#include <appindex/utilities/json_helpers.h>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>
#include <vector>

#include "program.h"

namespace {

constexpr char kQueue[] = "/var/packages/Velkor/etc/appindex.queue";
constexpr mode_t kQueueMode = 0644;
enum Operation { kInstalled = 1, kRemoved = 2 };

[[noreturn]] void Fail(const std::string& what) {
  throw std::runtime_error(what + " " + kQueue + ": " + std::strerror(errno));
}

// Opens the queue and locks it: whoever moves the queue aside holds the same lock, so that no line
// is ever torn. A file that was moved aside while this waited for its lock is no longer the queue.
int OpenLocked() {
  for (;;) {
    const int fd = open(kQueue, O_WRONLY | O_APPEND | O_CREAT | O_CLOEXEC, kQueueMode);
    if (fd < 0) Fail("cannot open");
    while (flock(fd, LOCK_EX) != 0) {
      if (errno != EINTR) Fail("cannot lock");
    }
    struct stat locked {};
    struct stat named {};
    if (fstat(fd, &locked) == 0 && lstat(kQueue, &named) == 0 && locked.st_dev == named.st_dev &&
        locked.st_ino == named.st_ino) {
      return fd;
    }
    close(fd);
  }
}

// Appends complete lines, in one write.
void Append(const std::string& lines) {
  const int fd = OpenLocked();
  const bool done =
      write(fd, lines.data(), lines.size()) == static_cast<ssize_t>(lines.size()) && fsync(fd) == 0;
  if (!done) Fail("cannot write");
  close(fd);
}

}  // namespace

int main(int argc, char** argv) {
  CLI::App app("Queues installed or removed packages for indexing", "package_manager");
  std::vector<std::string> descriptors;
  app.require_subcommand(1);
  const auto add = [&](const char* name, const char* help) {
    CLI::App* command = app.add_subcommand(name, help);
    command->add_option("descriptor", descriptors, "Path of a package's index.conf")->required();
    return command;
  };
  const CLI::App* installed = add("installed", "Packages were installed");
  add("removed", "Packages are about to be removed");
  app.fallthrough();
  return example::Run(app, argc, argv, [&] {
    std::string lines;
    for (const std::string& descriptor : descriptors) {
      Json::Value request;
      request["op"] = installed->parsed() ? kInstalled : kRemoved;
      request["path"] = descriptor;
      lines += velkor::toString(request) + "\n";
    }
    Append(lines);
  });
}
