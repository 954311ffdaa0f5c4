// A datagram socket that a test reads: the system log of a device root, or what a service manager
// listens on.
#pragma once

#include <condition_variable>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "tests/support/searchd_process.h"

namespace test {

// Reads all the time, so that nobody who writes ever waits.
class DatagramSocket {
 public:
  // Binds the socket file `path`, to which every user may write. Throws when it cannot.
  explicit DatagramSocket(const std::string& path);
  ~DatagramSocket();
  DatagramSocket(const DatagramSocket&) = delete;
  DatagramSocket& operator=(const DatagramSocket&) = delete;

  // Waits until a datagram holds `text`, and returns it and all before it since the last call.
  std::vector<std::string> ReadUntil(const std::string& text);

 private:
  void Read();

  const std::string path_;
  const Fd fd_;
  std::mutex mutex_;
  std::condition_variable arrived_;
  std::vector<std::string> datagrams_;
  std::thread reader_;
};

}  // namespace test
