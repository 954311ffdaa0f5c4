#include "host/framing.h"

#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cerrno>

namespace host {
namespace {

// Grown as the bytes arrive, so that a length alone never makes the receiver take 16 MiB.
constexpr std::size_t kReceiveStep = 65536;

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

// Returns how many bytes arrived before the peer closed, or -1 when the socket failed.
ssize_t RecvAll(int fd, char* data, std::size_t size) {
  std::size_t got = 0;
  while (got < size) {
    const ssize_t n = ::recv(fd, data + got, size - got, 0);
    if (n < 0) {
      if (errno == EINTR) continue;
      return -1;
    }
    if (n == 0) break;
    got += static_cast<std::size_t>(n);
  }
  return static_cast<ssize_t>(got);
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

bool RecvFrame(int fd, std::string& message) {
  message.clear();
  std::array<char, kFrameHeaderBytes> header{};
  const ssize_t got = RecvAll(fd, header.data(), header.size());
  if (got < 0) return false;
  if (got == 0) return FailWith(0);
  if (got < static_cast<ssize_t>(header.size())) return FailWith(EPROTO);

  std::size_t left = FrameLength(header.data());
  if (left > kMaxFrameBytes) return FailWith(EMSGSIZE);

  std::string text;
  while (left > 0) {
    const std::size_t step = std::min(left, kReceiveStep);
    const std::size_t at = text.size();
    text.resize(at + step);
    const ssize_t n = RecvAll(fd, &text[at], step);
    if (n < 0) return false;
    if (n < static_cast<ssize_t>(step)) return FailWith(EPROTO);
    left -= step;
  }
  message.swap(text);
  return true;
}

}  // namespace host
