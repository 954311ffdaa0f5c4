#include <fcntl.h>
#include <sys/socket.h>
#include <systemd/sd-daemon.h>

#include <cerrno>
#include <chrono>
#include <stdexcept>
#include <string>

#include "host/sdk/unique_fd.h"
#include "host/searchd/request_error.h"
#include "host/searchd/service_manager.h"

namespace searchd {
namespace {

using host::sdk::UniqueFd;

[[noreturn]] void Fail(const std::string& what, int error) {
  throw std::runtime_error(WithErrno("socket activation: " + what, error));
}

// The manager may have been asked for a socket that blocks; nothing here may.
void MakeNonBlocking(int fd) {
  const int flags = fcntl(fd, F_GETFL);
  if (flags < 0 || fcntl(fd, F_SETFL, flags | O_NONBLOCK) < 0) Fail("fcntl", errno);
}

}  // namespace

int TakeActivatedSocket() {
  constexpr int kForgetTheVariables = 1;
  const int count = sd_listen_fds(kForgetTheVariables);
  if (count < 0) Fail("LISTEN_FDS", -count);
  if (count == 0) return -1;
  if (count > 1) {
    throw std::runtime_error("socket activation: " + std::to_string(count) +
                             " sockets were handed over, there must be one");
  }
  UniqueFd fd(SD_LISTEN_FDS_START);
  constexpr int kListening = 1;
  const int matches = sd_is_socket_unix(fd.Get(), SOCK_STREAM, kListening, nullptr, 0);
  if (matches < 0) Fail("descriptor " + std::to_string(fd.Get()), -matches);
  if (matches == 0) {
    throw std::runtime_error("socket activation: descriptor " + std::to_string(fd.Get()) +
                             " is not a Unix stream socket that listens");
  }
  MakeNonBlocking(fd.Get());
  return fd.Release();
}

void NotifyReady() { sd_notify(0, "READY=1"); }

void NotifyReloading() {
  const auto now = std::chrono::steady_clock::now().time_since_epoch();
  const auto microseconds = std::chrono::duration_cast<std::chrono::microseconds>(now).count();
  sd_notify(0, ("RELOADING=1\nMONOTONIC_USEC=" + std::to_string(microseconds)).c_str());
}

void NotifyStopping() { sd_notify(0, "STOPPING=1"); }

}  // namespace searchd
