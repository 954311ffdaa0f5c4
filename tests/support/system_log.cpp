#include "tests/support/system_log.h"

#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <syslog.h>
#include <unistd.h>

#include <cstring>
#include <stdexcept>
#include <utility>

#include "tests/support/fork_guard.h"

namespace test {
namespace {

constexpr char kMark[] = "mark";
constexpr char kStop[] = "stop";
constexpr std::size_t kMaxDatagram = 256 * 1024;
constexpr std::size_t kTimestampLength = 16;  // "Nov 21 04:40:00 "

sockaddr_un AddressOf(const std::string& path) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, path.c_str(), sizeof(address.sun_path) - 1);
  return address;
}

// "<11>Nov 21 04:40:00 program: text"
std::string TextOf(const std::string& datagram) {
  const std::string priority = "<" + std::to_string(LOG_USER | LOG_ERR) + ">";
  EXPECT_EQ(datagram.substr(0, priority.size()), priority) << datagram;
  const std::size_t colon = datagram.find(": ", priority.size() + kTimestampLength);
  return colon == std::string::npos ? datagram : datagram.substr(colon + 2);
}

}  // namespace

SystemLog::SystemLog(const std::string& path)
    : path_(path), fd_(socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0)) {
  const sockaddr_un address = AddressOf(path);
  if (fd_ < 0 || bind(fd_, reinterpret_cast<const sockaddr*>(&address), sizeof(address)) != 0 ||
      chmod(path.c_str(), 0666) != 0) {
    throw std::runtime_error("cannot bind " + path + ": " + std::strerror(errno));
  }
}

void SystemLog::Start() {
  path_ = "/dev/log";
  reader_ = std::thread([this] { Read(); });
  Take();  // a fork from now on finds it begun
}

SystemLog::~SystemLog() {
  if (reader_.joinable()) {
    const sockaddr_un address = AddressOf(path_);
    const int fd = socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    sendto(fd, kStop, sizeof(kStop) - 1, 0, reinterpret_cast<const sockaddr*>(&address),
           sizeof(address));
    close(fd);
    reader_.join();
  }
  close(fd_);
}

void SystemLog::Read() {
  ForkGuard guard = HoldForks();
  std::string buffer(kMaxDatagram, '\0');
  for (;;) {
    guard.unlock();
    const ssize_t size = recv(fd_, buffer.data(), buffer.size(), 0);
    guard.lock();
    if (size < 0) {
      if (errno == EINTR) continue;
      return;
    }
    std::string datagram = buffer.substr(0, static_cast<std::size_t>(size));
    if (datagram == kStop) return;
    const std::lock_guard<std::mutex> lock(mutex_);
    if (datagram == kMark) {
      ++marks_seen_;
      marked_.notify_all();
    } else {
      datagrams_.push_back(std::move(datagram));
    }
  }
}

std::vector<std::string> SystemLog::Take() {
  // A datagram queues behind those written before it: when the mark has come, all of them have.
  const int kept = errno;
  const sockaddr_un address = AddressOf(path_);
  const int fd = socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
  sendto(fd, kMark, sizeof(kMark) - 1, 0, reinterpret_cast<const sockaddr*>(&address),
         sizeof(address));
  close(fd);
  errno = kept;

  std::unique_lock<std::mutex> lock(mutex_);
  ++marks_sent_;
  marked_.wait(lock, [this] { return marks_seen_ == marks_sent_; });
  std::vector<std::string> texts;
  for (const std::string& datagram : datagrams_) texts.push_back(TextOf(datagram));
  datagrams_.clear();
  return texts;
}

}  // namespace test
