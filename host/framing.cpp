#include "host/framing.h"

#include <sys/socket.h>

#include <array>
#include <cerrno>

namespace host {
namespace {

// What is received with one call: more than most messages. The memory grows as the bytes arrive, so
// that a length alone never makes the receiver take 16 MiB.
constexpr std::size_t kReceiveStep = 16384;

bool SendAll(int fd, const char* data, std::size_t size) {
  while (size > 0) {
    const ssize_t sent = ::send(fd, data, size, MSG_NOSIGNAL);
    if (sent < 0) {
      if (errno == EINTR) continue;
      return false;
    }
    data += sent;
    size -= static_cast<std::size_t>(sent);
  }
  return true;
}

// Waits for more bytes and appends them. False at the end of what the peer sent, with errno set to
// `error_at_end`, and when the socket failed.
bool RecvMore(int fd, std::string& received, int error_at_end) {
  std::array<char, kReceiveStep> bytes;  // NOLINT: filled before it is read
  ssize_t n = -1;
  do {
    n = ::recv(fd, bytes.data(), bytes.size(), 0);
  } while (n < 0 && errno == EINTR);
  if (n == 0) errno = error_at_end;
  if (n <= 0) return false;
  received.append(bytes.data(), static_cast<std::size_t>(n));
  return true;
}

bool FailWith(int error) {
  errno = error;
  return false;
}

}  // namespace

std::string FrameHeader(std::size_t length) {
  std::string header;
  for (const unsigned shift : {24U, 16U, 8U, 0U}) {
    header.push_back(static_cast<char>((length >> shift) & 0xFFU));
  }
  return header;
}

std::size_t FrameLength(const char* header) {
  std::size_t length = 0;
  for (std::size_t i = 0; i < kFrameHeaderBytes; ++i) {
    length = (length << 8U) | static_cast<unsigned char>(header[i]);
  }
  return length;
}

bool SendFrame(int fd, const std::string& message) {
  if (message.size() > kMaxFrameBytes) return FailWith(EMSGSIZE);
  const std::string frame = FrameHeader(message.size()) + message;
  return SendAll(fd, frame.data(), frame.size());
}

bool RecvFrame(int fd, std::string& ahead, std::string& message) {
  message.clear();
  std::string received;
  received.swap(ahead);
  while (received.size() < kFrameHeaderBytes) {
    if (!RecvMore(fd, received, received.empty() ? 0 : EPROTO)) return false;
  }
  const std::size_t length = FrameLength(received.data());
  if (length > kMaxFrameBytes) return FailWith(EMSGSIZE);
  while (received.size() - kFrameHeaderBytes < length) {
    if (!RecvMore(fd, received, EPROTO)) return false;
  }
  ahead.assign(received, kFrameHeaderBytes + length);
  received.resize(kFrameHeaderBytes + length);
  received.erase(0, kFrameHeaderBytes);
  message.swap(received);
  return true;
}

bool RecvFrame(int fd, std::string& message) {
  std::string ahead;
  return RecvFrame(fd, ahead, message);
}

}  // namespace host
