#include "tests/unit/searchd/failing_calls.h"

#include <dirent.h>
#include <fcntl.h>
#include <poll.h>
#include <sys/epoll.h>
#include <sys/eventfd.h>
#include <sys/file.h>
#include <sys/signalfd.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdarg>
#include <cstdio>
#include <mutex>

#include "tests/support/own_calls.h"

FailingCall failing_call;

namespace {

bool Fails(const char* name) {
  static std::mutex mutex;
  const std::lock_guard lock(mutex);
  if (failing_call.name != name) return false;
  if (failing_call.spared > 0) {
    --failing_call.spared;
    return false;
  }
  failing_call.name.clear();  // once
  errno = failing_call.error;
  return true;
}

}  // namespace

extern "C" {

int open(const char* path, int flags, ...) {
  static auto* const real = test::Real<int(const char*, int, ...)>("open");
  va_list arguments;
  va_start(arguments, flags);
  const mode_t mode = test::OpenMode(flags, arguments);
  va_end(arguments);
  return Fails("open") ? -1 : real(path, flags, mode);
}

int openat(int dir, const char* path, int flags, ...) {
  static auto* const real = test::Real<int(int, const char*, int, ...)>("openat");
  va_list arguments;
  va_start(arguments, flags);
  const mode_t mode = test::OpenMode(flags, arguments);
  va_end(arguments);
  return Fails("openat") ? -1 : real(dir, path, flags, mode);
}

DIR* fdopendir(int fd) {
  static auto* const real = test::Real<DIR*(int)>("fdopendir");
  return Fails("fdopendir") ? nullptr : real(fd);
}

int mkdirat(int dir, const char* path, mode_t mode) noexcept {
  static auto* const real = test::Real<int(int, const char*, mode_t)>("mkdirat");
  return Fails("mkdirat") ? -1 : real(dir, path, mode);
}

int unlinkat(int dir, const char* path, int flags) noexcept {
  static auto* const real = test::Real<int(int, const char*, int)>("unlinkat");
  return Fails("unlinkat") ? -1 : real(dir, path, flags);
}

int lstat(const char* path, struct stat* status) noexcept {
  static auto* const real = test::Real<int(const char*, struct stat*)>("lstat");
  return Fails("lstat") ? -1 : real(path, status);
}

int fsync(int fd) {
  static auto* const real = test::Real<int(int)>("fsync");
  return Fails("fsync") ? -1 : real(fd);
}

ssize_t read(int fd, void* bytes, size_t size) {
  static auto* const real = test::Real<ssize_t(int, void*, size_t)>("read");
  return Fails("read") ? -1 : real(fd, bytes, size);
}

pid_t waitpid(pid_t child, int* status, int options) {
  static auto* const real = test::Real<pid_t(pid_t, int*, int)>("waitpid");
  return Fails("waitpid") ? -1 : real(child, status, options);
}

pid_t fork() noexcept {
  static auto* const real = test::Real<pid_t()>("fork");
  return Fails("fork") ? -1 : real();
}

int pipe2(int* ends, int flags) noexcept {
  static auto* const real = test::Real<int(int*, int)>("pipe2");
  return Fails("pipe2") ? -1 : real(ends, flags);
}

int socket(int domain, int type, int protocol) noexcept {
  static auto* const real = test::Real<int(int, int, int)>("socket");
  return Fails("socket") ? -1 : real(domain, type, protocol);
}

int socketpair(int domain, int type, int protocol, int* ends) noexcept {
  static auto* const real = test::Real<int(int, int, int, int*)>("socketpair");
  return Fails("socketpair") ? -1 : real(domain, type, protocol, ends);
}

int bind(int fd, const sockaddr* address, socklen_t size) noexcept {
  static auto* const real = test::Real<int(int, const sockaddr*, socklen_t)>("bind");
  return Fails("bind") ? -1 : real(fd, address, size);
}

int listen(int fd, int backlog) noexcept {
  static auto* const real = test::Real<int(int, int)>("listen");
  return Fails("listen") ? -1 : real(fd, backlog);
}

ssize_t sendmsg(int fd, const msghdr* message, int flags) {
  static auto* const real = test::Real<ssize_t(int, const msghdr*, int)>("sendmsg");
  return Fails("sendmsg") ? -1 : real(fd, message, flags);
}

ssize_t send(int fd, const void* bytes, size_t size, int flags) {
  static auto* const real = test::Real<ssize_t(int, const void*, size_t, int)>("send");
  return Fails("send") ? -1 : real(fd, bytes, size, flags);
}

ssize_t recv(int fd, void* bytes, size_t size, int flags) {
  static auto* const real = test::Real<ssize_t(int, void*, size_t, int)>("recv");
  return Fails("recv") ? -1 : real(fd, bytes, size, flags);
}

ssize_t write(int fd, const void* bytes, size_t size) {
  static auto* const real = test::Real<ssize_t(int, const void*, size_t)>("write");
  return Fails("write") ? -1 : real(fd, bytes, size);
}

int rename(const char* from, const char* to) noexcept {
  static auto* const real = test::Real<int(const char*, const char*)>("rename");
  return Fails("rename") ? -1 : real(from, to);
}

int unlink(const char* path) noexcept {
  static auto* const real = test::Real<int(const char*)>("unlink");
  return Fails("unlink") ? -1 : real(path);
}

int mkdir(const char* path, mode_t mode) noexcept {
  static auto* const real = test::Real<int(const char*, mode_t)>("mkdir");
  return Fails("mkdir") ? -1 : real(path, mode);
}

int chmod(const char* path, mode_t mode) noexcept {
  static auto* const real = test::Real<int(const char*, mode_t)>("chmod");
  return Fails("chmod") ? -1 : real(path, mode);
}

int accept4(int fd, sockaddr* address, socklen_t* size, int flags) {
  static auto* const real = test::Real<int(int, sockaddr*, socklen_t*, int)>("accept4");
  return Fails("accept4") ? -1 : real(fd, address, size, flags);
}

int getsockopt(int fd, int level, int name, void* value, socklen_t* size) noexcept {
  static auto* const real = test::Real<int(int, int, int, void*, socklen_t*)>("getsockopt");
  return Fails("getsockopt") ? -1 : real(fd, level, name, value, size);
}

int epoll_ctl(int fd, int operation, int other, epoll_event* event) noexcept {
  static auto* const real = test::Real<int(int, int, int, epoll_event*)>("epoll_ctl");
  return Fails("epoll_ctl") ? -1 : real(fd, operation, other, event);
}

int epoll_wait(int fd, epoll_event* events, int most, int milliseconds) {
  static auto* const real = test::Real<int(int, epoll_event*, int, int)>("epoll_wait");
  return Fails("epoll_wait") ? -1 : real(fd, events, most, milliseconds);
}

// Without the time-out, so that no test depends on the machine's speed.
int poll(pollfd* ones, nfds_t count, int) {
  static auto* const real = test::Real<int(pollfd*, nfds_t, int)>("poll");
  return Fails("poll") ? -1 : real(ones, count, -1);
}

int connect(int fd, const sockaddr* address, socklen_t size) {
  static auto* const real = test::Real<int(int, const sockaddr*, socklen_t)>("connect");
  return Fails("connect") ? -1 : real(fd, address, size);
}

int flock(int fd, int operation) noexcept {
  static auto* const real = test::Real<int(int, int)>("flock");
  return Fails("flock") ? -1 : real(fd, operation);
}

int ftruncate(int fd, off_t size) noexcept {
  static auto* const real = test::Real<int(int, off_t)>("ftruncate");
  return Fails("ftruncate") ? -1 : real(fd, size);
}

ssize_t pwrite(int fd, const void* bytes, size_t size, off_t at) {
  static auto* const real = test::Real<ssize_t(int, const void*, size_t, off_t)>("pwrite");
  return Fails("pwrite") ? -1 : real(fd, bytes, size, at);
}

int sigprocmask(int how, const sigset_t* set, sigset_t* before) noexcept {
  static auto* const real = test::Real<int(int, const sigset_t*, sigset_t*)>("sigprocmask");
  return Fails("sigprocmask") ? -1 : real(how, set, before);
}

int signalfd(int fd, const sigset_t* set, int flags) noexcept {
  static auto* const real = test::Real<int(int, const sigset_t*, int)>("signalfd");
  return Fails("signalfd") ? -1 : real(fd, set, flags);
}

int epoll_create1(int flags) noexcept {
  static auto* const real = test::Real<int(int)>("epoll_create1");
  return Fails("epoll_create1") ? -1 : real(flags);
}

int eventfd(unsigned count, int flags) noexcept {
  static auto* const real = test::Real<int(unsigned, int)>("eventfd");
  return Fails("eventfd") ? -1 : real(count, flags);
}

}  // extern "C"
