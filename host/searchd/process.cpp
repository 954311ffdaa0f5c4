#include "host/searchd/process.h"

#include <fcntl.h>
#include <malloc.h>
#include <sys/file.h>
#include <sys/resource.h>
#include <sys/signalfd.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstring>
#include <utility>

#include "host/searchd/request_error.h"

namespace searchd {
namespace {

using host::sdk::UniqueFd;

[[noreturn]] void Fail(const std::string& what) {
  throw std::runtime_error(WithErrno(what, errno));
}

[[noreturn]] void ExitAs(pid_t child, int ready) {
  char byte = 0;
  ssize_t got = 0;
  while ((got = read(ready, &byte, 1)) < 0 && errno == EINTR) {
  }
  if (got > 0) _exit(0);
  int status = 0;
  while (waitpid(child, &status, 0) < 0 && errno == EINTR) {
  }
  _exit(WIFEXITED(status) ? WEXITSTATUS(status) : 1);
}

sockaddr_un AddressOf(const std::string& path) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  if (path.size() >= sizeof(address.sun_path)) throw std::runtime_error("path too long: " + path);
  std::memcpy(address.sun_path, path.c_str(), path.size() + 1);
  return address;
}

UniqueFd MakeSocket() {
  return UniqueFd(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
}

bool SomebodyListens(const sockaddr_un& address) {
  const UniqueFd probe = MakeSocket();
  if (!probe.IsOpen()) Fail("socket");
  return connect(probe.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof(address)) == 0 ||
         errno != ECONNREFUSED;
}

void RemoveStaleSocket(const std::string& path) {
  const sockaddr_un address = AddressOf(path);
  struct stat status {};
  if (lstat(path.c_str(), &status) != 0) {
    if (errno == ENOENT) return;
    Fail(path);
  }
  if (!S_ISSOCK(status.st_mode)) {
    throw std::runtime_error(path + " is not a socket; it is left alone");
  }
  if (SomebodyListens(address)) {
    throw std::runtime_error(path + " is in use by another program");
  }
  if (unlink(path.c_str()) != 0) Fail("cannot remove " + path);
}

}  // namespace

int GoToBackground() {
  std::array<int, 2> ends{};
  if (pipe2(ends.data(), O_CLOEXEC) != 0) Fail("pipe");
  const pid_t child = fork();
  if (child < 0) Fail("fork");
  if (child > 0) {
    close(ends[1]);
    ExitAs(child, ends[0]);
  }
  close(ends[0]);
  setsid();
  return ends[1];
}

void DropTerminal(int null_fd) {
  for (const int fd : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) dup2(null_fd, fd);
}

void ReportReady(int fd) {
  constexpr std::string_view kLine = "ready\n";
  // Whoever waits for it sees the end of the file if this fails.
  if (write(fd, kLine.data(), kLine.size()) < 0) errno = 0;
  close(fd);
}

ProcessLock::ProcessLock(const std::string& file)
    : fd_(open(file.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, S_IRUSR | S_IWUSR)) {
  if (!fd_.IsOpen()) Fail(file);
  if (flock(fd_.Get(), LOCK_EX | LOCK_NB) != 0) {
    if (errno != EWOULDBLOCK) Fail(file);
    std::array<char, 32> holder{};
    const ssize_t n = pread(fd_.Get(), holder.data(), holder.size() - 1, 0);
    throw AlreadyRunning("another daemon serves this root, process " +
                         (n > 0 ? std::string(holder.data()) : "unknown"));
  }
  const std::string id = std::to_string(getpid());
  if (ftruncate(fd_.Get(), 0) != 0 || pwrite(fd_.Get(), id.data(), id.size(), 0) < 0) Fail(file);
}

// It gets its name when it listens already: nobody who sees the file is refused.
SocketFile::SocketFile(std::string path) : path_(std::move(path)), listener_(MakeSocket()) {
  if (!listener_.IsOpen()) Fail("socket");
  RemoveStaleSocket(path_);
  const std::string unready = path_ + ".new";
  RemoveStaleSocket(unready);
  const sockaddr_un address = AddressOf(unready);
  // The mode is right from the first moment: read and write for all.
  const mode_t mask = umask(S_IXUSR | S_IXGRP | S_IXOTH);
  const int bound =
      bind(listener_.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof(address));
  const int error = errno;
  umask(mask);
  errno = error;
  if (bound != 0 || listen(listener_.Get(), SOMAXCONN) != 0 ||
      std::rename(unready.c_str(), path_.c_str()) != 0) {
    Fail(path_);
  }
  struct stat status {};
  if (lstat(path_.c_str(), &status) != 0) Fail(path_);
  device_ = status.st_dev;
  inode_ = status.st_ino;
}

SocketFile::~SocketFile() {
  struct stat status {};
  if (lstat(path_.c_str(), &status) != 0) return;
  if (status.st_dev == device_ && status.st_ino == inode_) unlink(path_.c_str());
}

int CatchSignals() {
  std::signal(SIGPIPE, SIG_IGN);
  std::signal(SIGXFSZ, SIG_IGN);
  sigset_t caught;
  sigemptyset(&caught);
  for (const int signal : {SIGTERM, SIGINT, SIGHUP}) sigaddset(&caught, signal);
  if (sigprocmask(SIG_BLOCK, &caught, nullptr) != 0) Fail("sigprocmask");
  const int fd = signalfd(-1, &caught, SFD_CLOEXEC | SFD_NONBLOCK);
  if (fd < 0) Fail("signalfd");
  return fd;
}

void ShareHeaps() { mallopt(M_ARENA_MAX, 2); }

void RaiseDescriptorLimit() {
  rlimit limit{};
  if (getrlimit(RLIMIT_NOFILE, &limit) != 0) return;
  limit.rlim_cur = limit.rlim_max;
  setrlimit(RLIMIT_NOFILE, &limit);
}

}  // namespace searchd
