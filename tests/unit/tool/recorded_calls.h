// The calls with which the program writes files, seen by a test, and made to fail by it. A test
// program that is made with this has write, fsync and ftruncate of its own, which pass on to the
// system's.
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

}  // namespace test
