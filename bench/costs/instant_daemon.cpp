#include "bench/costs/instant_daemon.h"

#include <poll.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <csignal>
#include <cstring>
#include <stdexcept>

#include "appindex/elastic_control_internal.h"
#include "host/framing.h"
#include "host/sdk/unique_fd.h"

namespace bench {
namespace {

using host::sdk::UniqueFd;

constexpr char kLogSocket[] = "/dev/log";
constexpr char kReply[] = R"({"success":true})";

sockaddr_un AddressOf(const char* path) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strcpy(address.sun_path, path);
  return address;
}

int BoundSocket(int type, const char* path) {
  UniqueFd fd(socket(AF_UNIX, type | SOCK_CLOEXEC, 0));
  const sockaddr_un address = AddressOf(path);
  unlink(path);
  if (!fd.IsOpen() ||
      bind(fd.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof(address)) != 0) {
    throw std::runtime_error(std::string("cannot make the socket ") + path);
  }
  return fd.Release();
}

void Answer(int listener) {
  const UniqueFd client(accept4(listener, nullptr, nullptr, SOCK_CLOEXEC));
  std::string request;
  if (client.IsOpen() && host::RecvFrame(client.Get(), request)) {
    host::SendFrame(client.Get(), kReply);
  }
}

[[noreturn]] void Serve(int listener, int log) {
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  std::array<char, 65536> line;
  std::array<pollfd, 2> ready = {{{listener, POLLIN, 0}, {log, POLLIN, 0}}};
  for (;;) {
    poll(ready.data(), ready.size(), -1);
    if (ready[0].revents != 0) Answer(listener);
    if (ready[1].revents != 0) recv(log, line.data(), line.size(), 0);
  }
}

}  // namespace

InstantDaemon::InstantDaemon() {
  const UniqueFd listener(BoundSocket(SOCK_STREAM, velkor::appindex::elastic::kElasticdSockPath));
  const UniqueFd log(BoundSocket(SOCK_DGRAM, kLogSocket));
  if (listen(listener.Get(), SOMAXCONN) != 0) throw std::runtime_error("cannot listen");
  process_ = fork();
  if (process_ < 0) throw std::runtime_error("no process");
  if (process_ == 0) Serve(listener.Get(), log.Get());
}

InstantDaemon::~InstantDaemon() {
  kill(process_, SIGKILL);
  waitpid(process_, nullptr, 0);
}

std::string Frame(const std::string& request) {
  return host::FrameHeader(request.size()) + request;
}

void BareExchange(const std::string& frame) {
  static const sockaddr_un address = AddressOf(velkor::appindex::elastic::kElasticdSockPath);
  std::array<char, 256> reply;
  const int fd = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  if (connect(fd, reinterpret_cast<const sockaddr*>(&address), sizeof(address)) != 0 ||
      send(fd, frame.data(), frame.size(), MSG_NOSIGNAL) != static_cast<ssize_t>(frame.size()) ||
      recv(fd, reply.data(), reply.size(), 0) <= 0) {
    throw std::runtime_error("the bare exchange failed");
  }
  close(fd);
}

}  // namespace bench
