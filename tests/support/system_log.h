// The system log of a device root: the datagram socket that syslog(3) writes to.
#pragma once

#include <condition_variable>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace test {

class SystemLog {
 public:
  // Binds the socket file `path`, "/dev/log" of a root that is entered later.
  explicit SystemLog(const std::string& path);
  ~SystemLog();
  SystemLog(const SystemLog&) = delete;
  SystemLog& operator=(const SystemLog&) = delete;

  // Begins to read: from then on a writer never waits. Starts a thread, so after entering the root.
  void Start();

  // The texts of all lines written since the last call, without the time and the program's name.
  // Fails the test for a line at another priority than LOG_ERR.
  std::vector<std::string> Take();

 private:
  void Read();

  std::string path_;
  int fd_;
  std::thread reader_;
  std::mutex mutex_;
  std::condition_variable marked_;
  std::vector<std::string> datagrams_;
  int marks_seen_ = 0;
  int marks_sent_ = 0;
};

}  // namespace test
