// The calls with which the program writes files, seen by a test, and made to fail by it. A test
// program that is made with this has such functions of its own, which pass on to the system's.
#pragma once

#include <string>
#include <vector>

namespace test {

// While it exists, the calls of the thread that made it are appended to `calls`: "write 9 to a
// file", "fsync of a file", "fsync of a directory", "ftruncate to 9". Those that begin with one of
// the texts in `failing` are not passed on, but fail with EIO. What is written to anything but a
// file is left out.
class RecordedCalls {
 public:
  explicit RecordedCalls(std::vector<std::string>& calls, std::vector<std::string> failing = {});
  ~RecordedCalls();
  RecordedCalls(const RecordedCalls&) = delete;
  RecordedCalls& operator=(const RecordedCalls&) = delete;

 private:
  std::vector<std::string> failing_;
};

// One call of flock, stat, fstat, lstat, pread or open that fails with `error`: the one by the
// thread that made this, as long as it exists, that comes after `spared` others of its name.
class FailingCall {
 public:
  FailingCall(std::string name, int error, int spared = 0);
  ~FailingCall();
  FailingCall(const FailingCall&) = delete;
  FailingCall& operator=(const FailingCall&) = delete;

  // Whether it has come to it.
  bool HasFailed() const { return spared_ < 0; }

  // For the functions: whether this call of `name` is the one; errno is set then.
  bool Fails(const std::string& name);

 private:
  const std::string name_;
  const int error_;
  int spared_;
};

}  // namespace test
