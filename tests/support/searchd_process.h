// The search daemon as a program that a test starts, watches and ends.
#pragma once

#include <sys/types.h>
#include <sys/un.h>

#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace test {

// A file descriptor that is closed with its owner.
class Fd {
 public:
  explicit Fd(int fd) : fd_(fd) {}
  Fd(Fd&& other) noexcept : fd_(other.fd_) { other.fd_ = -1; }
  Fd& operator=(Fd&& other) = delete;
  ~Fd() { Close(); }
  int Get() const { return fd_; }
  void Close();

 private:
  int fd_;
};

// What comes from `fd` until its other end is closed.
std::string ReadToEnd(int fd);

sockaddr_un SocketAddress(const std::string& path);

// A connection to the stream socket at `path`; not open when nobody listens there.
Fd Connect(const std::string& path);

// One run of tovoelasticd. Killed with the object if it still runs.
class SearchdProcess {
 public:
  struct Result {
    int status;  // exit status, or 128 and the signal
    std::string error_text;
  };

  // `prepare` is called in the new process before the program takes it over.
  SearchdProcess(std::vector<std::string> arguments, bool wait_until_ready,
                 const std::function<void()>& prepare = nullptr);
  ~SearchdProcess();
  SearchdProcess(const SearchdProcess&) = delete;
  SearchdProcess& operator=(const SearchdProcess&) = delete;

  bool IsReady() const { return ready_; }
  pid_t Pid() const { return pid_; }

  Result Wait();
  Result Stop(int signal);

 private:
  pid_t pid_ = -1;
  std::unique_ptr<Fd> errors_;
  bool ready_ = false;
};

}  // namespace test
