// The file calls of the code under test, seen by a test and, where it says so, made to fail.
#pragma once

#include <functional>
#include <optional>
#include <string>

namespace test {

// One call of open, close, read, write, fsync, fchmod, rename, flock, fstat or readlink.
struct FileCall {
  std::string name;
  int fd;            // -1 for those that take a path
  std::string path;  // the new name of rename
};

// Fails a call with this errno, or lets it through.
using FileCallResult = std::optional<int>;

// While it lives, `hook` is asked before each such call that this thread makes, but for those that
// the hook makes. A close that fails closes all the same, as it does in the kernel.
class FileCallHook {
 public:
  using Hook = std::function<FileCallResult(const FileCall& call)>;
  explicit FileCallHook(Hook hook);
  ~FileCallHook();
  FileCallHook(const FileCallHook&) = delete;
  FileCallHook& operator=(const FileCallHook&) = delete;

 private:
  Hook hook_;
};

}  // namespace test
