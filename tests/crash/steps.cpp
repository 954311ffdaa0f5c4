#include "tests/crash/steps.h"

#include <sys/file.h>
#include <sys/socket.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>

#include "tests/support/controlled_time.h"
#include "tests/support/own_calls.h"

namespace test {
namespace {

int g_steps_left = 0;  // 0: steps are not counted

void Step() {
  if (g_steps_left > 0 && --g_steps_left == 0) raise(SIGKILL);
}

}  // namespace

void DieAtStep(int n) {
  g_steps_left = n;
  Time().on_usleep = [](unsigned) { Step(); };
}

}  // namespace test

#define VISIBLE __attribute__((visibility("default")))

extern "C" {

VISIBLE int flock(int fd, int operation) noexcept {
  static auto* const real = test::Real<int(int, int)>("flock");
  test::Step();
  return real(fd, operation);
}

VISIBLE int rename(const char* from, const char* to) noexcept {
  static auto* const real = test::Real<int(const char*, const char*)>("rename");
  test::Step();
  return real(from, to);
}

VISIBLE int unlink(const char* path) noexcept {
  static auto* const real = test::Real<int(const char*)>("unlink");
  test::Step();
  return real(path);
}

VISIBLE int connect(int fd, const sockaddr* address, socklen_t length) {
  static auto* const real = test::Real<int(int, const sockaddr*, socklen_t)>("connect");
  test::Step();
  return real(fd, address, length);
}

}  // extern "C"
