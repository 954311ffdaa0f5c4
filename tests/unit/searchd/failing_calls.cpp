#include "tests/unit/searchd/failing_calls.h"

#include <dlfcn.h>
#include <sys/epoll.h>
#include <sys/eventfd.h>
#include <sys/file.h>
#include <sys/signalfd.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdio>

FailingCall failing_call;

namespace {

bool Fails(const char* name) {
  if (failing_call.name != name) return false;
  if (failing_call.spared > 0) {
    --failing_call.spared;
    return false;
  }
  failing_call.name.clear();  // once
  errno = failing_call.error;
  return true;
}

template <typename Function>
Function* Real(const char* name) {
  return reinterpret_cast<Function*>(dlsym(RTLD_NEXT, name));
}

}  // namespace

extern "C" {

pid_t fork() noexcept {
  static auto* const real = Real<pid_t()>("fork");
  return Fails("fork") ? -1 : real();
}

int pipe2(int* ends, int flags) noexcept {
  static auto* const real = Real<int(int*, int)>("pipe2");
  return Fails("pipe2") ? -1 : real(ends, flags);
}

int socket(int domain, int type, int protocol) noexcept {
  static auto* const real = Real<int(int, int, int)>("socket");
  return Fails("socket") ? -1 : real(domain, type, protocol);
}

int socketpair(int domain, int type, int protocol, int* ends) noexcept {
  static auto* const real = Real<int(int, int, int, int*)>("socketpair");
  return Fails("socketpair") ? -1 : real(domain, type, protocol, ends);
}

int bind(int fd, const sockaddr* address, socklen_t size) noexcept {
  static auto* const real = Real<int(int, const sockaddr*, socklen_t)>("bind");
  return Fails("bind") ? -1 : real(fd, address, size);
}

int listen(int fd, int backlog) noexcept {
  static auto* const real = Real<int(int, int)>("listen");
  return Fails("listen") ? -1 : real(fd, backlog);
}

ssize_t sendmsg(int fd, const msghdr* message, int flags) {
  static auto* const real = Real<ssize_t(int, const msghdr*, int)>("sendmsg");
  return Fails("sendmsg") ? -1 : real(fd, message, flags);
}

ssize_t send(int fd, const void* bytes, size_t size, int flags) {
  static auto* const real = Real<ssize_t(int, const void*, size_t, int)>("send");
  return Fails("send") ? -1 : real(fd, bytes, size, flags);
}

ssize_t recv(int fd, void* bytes, size_t size, int flags) {
  static auto* const real = Real<ssize_t(int, void*, size_t, int)>("recv");
  return Fails("recv") ? -1 : real(fd, bytes, size, flags);
}

ssize_t write(int fd, const void* bytes, size_t size) {
  static auto* const real = Real<ssize_t(int, const void*, size_t)>("write");
  return Fails("write") ? -1 : real(fd, bytes, size);
}

int rename(const char* from, const char* to) noexcept {
  static auto* const real = Real<int(const char*, const char*)>("rename");
  return Fails("rename") ? -1 : real(from, to);
}

int unlink(const char* path) noexcept {
  static auto* const real = Real<int(const char*)>("unlink");
  return Fails("unlink") ? -1 : real(path);
}

int mkdir(const char* path, mode_t mode) noexcept {
  static auto* const real = Real<int(const char*, mode_t)>("mkdir");
  return Fails("mkdir") ? -1 : real(path, mode);
}

int chmod(const char* path, mode_t mode) noexcept {
  static auto* const real = Real<int(const char*, mode_t)>("chmod");
  return Fails("chmod") ? -1 : real(path, mode);
}

int flock(int fd, int operation) noexcept {
  static auto* const real = Real<int(int, int)>("flock");
  return Fails("flock") ? -1 : real(fd, operation);
}

int ftruncate(int fd, off_t size) noexcept {
  static auto* const real = Real<int(int, off_t)>("ftruncate");
  return Fails("ftruncate") ? -1 : real(fd, size);
}

ssize_t pwrite(int fd, const void* bytes, size_t size, off_t at) {
  static auto* const real = Real<ssize_t(int, const void*, size_t, off_t)>("pwrite");
  return Fails("pwrite") ? -1 : real(fd, bytes, size, at);
}

int sigprocmask(int how, const sigset_t* set, sigset_t* before) noexcept {
  static auto* const real = Real<int(int, const sigset_t*, sigset_t*)>("sigprocmask");
  return Fails("sigprocmask") ? -1 : real(how, set, before);
}

int signalfd(int fd, const sigset_t* set, int flags) noexcept {
  static auto* const real = Real<int(int, const sigset_t*, int)>("signalfd");
  return Fails("signalfd") ? -1 : real(fd, set, flags);
}

int epoll_create1(int flags) noexcept {
  static auto* const real = Real<int(int)>("epoll_create1");
  return Fails("epoll_create1") ? -1 : real(flags);
}

int eventfd(unsigned count, int flags) noexcept {
  static auto* const real = Real<int(unsigned, int)>("eventfd");
  return Fails("eventfd") ? -1 : real(count, flags);
}

}  // extern "C"
