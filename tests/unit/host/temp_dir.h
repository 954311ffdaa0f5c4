// A fresh directory for one test, and its files.
#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

class TempDir {
 public:
  // Below `parent`, or the usual place for temporary files when that is empty.
  explicit TempDir(const std::string& parent = "");
  ~TempDir();
  TempDir(const TempDir&) = delete;
  TempDir& operator=(const TempDir&) = delete;

  const std::string& Path() const { return path_; }
  std::string operator/(const std::string& name) const { return path_ + "/" + name; }

  // Writes a file, making the directories above it, and returns its path.
  std::string Write(const std::string& name, const std::string& content) const;

  // The names in the directory itself, sorted, hidden ones included.
  std::vector<std::string> Names() const;

 private:
  std::string path_;
};

// The content of a file; a failure of the test when it cannot be read.
std::string ReadFile(const std::string& path);

// How many descriptors the process has open.
std::size_t OpenDescriptors();
