#include "tests/support/datagram_socket.h"

#include <sys/socket.h>
#include <sys/stat.h>

#include <algorithm>
#include <array>
#include <stdexcept>
#include <utility>

#include "tests/support/fork_guard.h"

namespace test {

DatagramSocket::DatagramSocket(const std::string& path)
    : path_(path), fd_(socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0)) {
  const sockaddr_un address = SocketAddress(path);
  if (bind(fd_.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof(address)) != 0 ||
      chmod(path.c_str(), 0666) != 0) {
    throw std::runtime_error("cannot bind " + path);
  }
  reader_ = std::thread([this] { Read(); });
}

DatagramSocket::~DatagramSocket() {
  shutdown(fd_.Get(), SHUT_RDWR);  // ends the reader
  reader_.join();
}

void DatagramSocket::Read() {
  std::array<char, 65536> buffer{};
  for (;;) {
    const ssize_t size = recv(fd_.Get(), buffer.data(), buffer.size(), 0);
    if (size <= 0) return;
    const ForkGuard guard = HoldForks();
    const std::lock_guard lock(mutex_);
    datagrams_.emplace_back(buffer.data(), static_cast<std::size_t>(size));
    arrived_.notify_all();
  }
}

std::vector<std::string> DatagramSocket::ReadUntil(const std::string& text) {
  std::unique_lock lock(mutex_);
  std::vector<std::string>::iterator found;
  arrived_.wait(lock, [&] {
    found = std::find_if(datagrams_.begin(), datagrams_.end(), [&](const std::string& datagram) {
      return datagram.find(text) != std::string::npos;
    });
    return found != datagrams_.end();
  });
  std::vector<std::string> read(datagrams_.begin(), found + 1);
  datagrams_.erase(datagrams_.begin(), found + 1);
  return read;
}

}  // namespace test
