#include "host/searchd/connection.h"

#include <sys/socket.h>

#include <array>
#include <cerrno>
#include <cstdint>
#include <utility>

#include "host/framing.h"

namespace searchd {
namespace {

constexpr std::size_t kReceiveStep = 64 * 1024;
constexpr uid_t kNobody = 65534;

uid_t PeerOf(int fd) {
  ucred peer{};
  socklen_t size = sizeof(peer);
  return getsockopt(fd, SOL_SOCKET, SO_PEERCRED, &peer, &size) == 0 ? peer.uid : kNobody;
}

}  // namespace

Connection::Connection(int fd, TimePoint deadline)
    : fd_(fd), client_(PeerOf(fd)), deadline_(deadline) {}

void Connection::Continue() {
  if (state_ == State::kReceiving) Receive();
  if (state_ == State::kSending) Send();
}

std::string Connection::TakeRequest() {
  std::string request = std::exchange(bytes_, {});
  return request.substr(host::kFrameHeaderBytes);
}

void Connection::Reply(const std::string& text, TimePoint deadline) {
  bytes_ = host::FrameHeader(text.size()) + text;
  sent_ = 0;
  deadline_ = deadline;
  state_ = State::kSending;
  Send();
}

void Connection::Receive() {
  std::array<char, kReceiveStep> step;  // NOLINT: filled before it is read
  while (state_ == State::kReceiving) {
    const ssize_t n = recv(Fd(), step.data(), step.size(), MSG_DONTWAIT);
    if (n < 0 && errno == EINTR) continue;
    if (n < 0 && errno == EAGAIN) return;
    if (n <= 0) {
      state_ = State::kDone;
      return;
    }
    bytes_.append(step.data(), static_cast<std::size_t>(n));
    CheckFrame();
  }
}

void Connection::CheckFrame() {
  if (bytes_.size() < host::kFrameHeaderBytes) return;
  const std::size_t length = host::FrameLength(bytes_.data());
  if (length > host::kMaxFrameBytes) {
    state_ = State::kTooLong;
  } else if (bytes_.size() >= host::kFrameHeaderBytes + length) {
    bytes_.resize(host::kFrameHeaderBytes + length);
    state_ = State::kReceived;
  }
}

void Connection::Send() {
  while (sent_ < bytes_.size()) {
    const ssize_t n =
        send(Fd(), bytes_.data() + sent_, bytes_.size() - sent_, MSG_NOSIGNAL | MSG_DONTWAIT);
    if (n < 0 && errno == EINTR) continue;
    if (n < 0 && errno == EAGAIN) return;
    if (n < 0) break;
    sent_ += static_cast<std::size_t>(n);
  }
  state_ = State::kDone;
}

}  // namespace searchd
