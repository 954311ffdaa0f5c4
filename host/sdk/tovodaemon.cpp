#include "device/tovodaemon.h"

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <sys/un.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>

#include "host/framing.h"
#include "host/sdk/unique_fd.h"

namespace tovodaemon {
namespace {

using Clock = std::chrono::steady_clock;
using std::chrono::microseconds;
using std::chrono::seconds;

// Longer waits count as ten years, so that no reckoning with time can overflow.
constexpr long kLongestWaitSeconds = 10L * 366 * 86400;

bool FailWith(int error) {
  errno = error;
  return false;
}

bool MakeAddress(const std::string& path, sockaddr_un& address) {
  address = {};
  address.sun_family = AF_UNIX;
  // A path that starts with NUL would name a socket outside the file system.
  if (path.empty() || path.find('\0') != std::string::npos) return FailWith(EINVAL);
  if (path.size() >= sizeof(address.sun_path)) return FailWith(ENAMETOOLONG);
  std::memcpy(address.sun_path, path.c_str(), path.size());
  return true;
}

bool SetSendTimeout(int fd, microseconds wait) {
  timeval time{};
  time.tv_sec = wait.count() / 1000000;
  time.tv_usec = wait.count() % 1000000;
  return setsockopt(fd, SOL_SOCKET, SO_SNDTIMEO, &time, sizeof(time)) == 0;
}

// On a Unix socket the only wait is the one for room in the listener's queue. poll cannot wait for
// that; a send time-out does, and its seconds do not overflow as poll's milliseconds would.
bool ConnectWithin(int fd, const sockaddr_un& address, long timeout_seconds) {
  const Clock::time_point deadline =
      Clock::now() + seconds(std::clamp(timeout_seconds, 0L, kLongestWaitSeconds));
  for (;;) {
    const auto left = std::chrono::duration_cast<microseconds>(deadline - Clock::now());
    // A time-out of 0 would mean none at all.
    if (!SetSendTimeout(fd, std::max(left, microseconds(1)))) return false;
    if (connect(fd, reinterpret_cast<const sockaddr*>(&address), sizeof(address)) == 0) break;
    if (errno == EINTR && Clock::now() < deadline) continue;
    return FailWith(errno == EINTR || errno == EAGAIN ? ETIMEDOUT : errno);
  }
  return SetSendTimeout(fd, microseconds(0));
}

bool SetBlocking(int fd) { return fcntl(fd, F_SETFL, 0) == 0; }

// Connects a socket that does not block yet, and makes it block. As a rule there is room at once;
// EAGAIN says that the listener's queue is full.
bool ConnectNewSocket(int fd, const sockaddr_un& address, long timeout_seconds) {
  if (connect(fd, reinterpret_cast<const sockaddr*>(&address), sizeof(address)) == 0) {
    return SetBlocking(fd);
  }
  return errno == EAGAIN && SetBlocking(fd) && ConnectWithin(fd, address, timeout_seconds);
}

}  // namespace

SockConnection::SockConnection() : fd_(-1) {}

SockConnection::~SockConnection() { SockConnection::Disconnect(); }

void SockConnection::Disconnect() {
  const host::sdk::UniqueFd closing(fd_);
  fd_ = -1;
  ahead_.clear();
}

bool SockConnection::Send(const std::string& message) {
  if (fd_ == -1) return FailWith(ENOTCONN);
  return host::SendFrame(fd_, message);
}

bool SockConnection::Recv(std::string& message) {
  message.clear();
  if (fd_ == -1) return FailWith(ENOTCONN);
  return host::RecvFrame(fd_, ahead_, message);
}

DomainSockConnection::DomainSockConnection(const std::string& path) : path_(path) {}

bool DomainSockConnection::Connect(long timeout_seconds) {
  Disconnect();
  // An interrupted wait that ends well is no error to be found in errno later.
  const int error_before = errno;
  sockaddr_un address;
  if (!MakeAddress(path_, address)) return false;
  host::sdk::UniqueFd fd(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
  if (!fd.IsOpen() || !ConnectNewSocket(fd.Get(), address, timeout_seconds)) return false;
  fd_ = fd.Release();
  errno = error_before;
  return true;
}

}  // namespace tovodaemon
