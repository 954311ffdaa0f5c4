// Reading a directory.
#pragma once

#include <dirent.h>

#include <string>

namespace velkor {

// An open directory, closed when it goes out of scope. Different readers may be used by different
// threads: what the C library's readdir keeps, it keeps per open directory.
class DirReader {
 public:
  // Opens the directory, close-on-exec; IsOpen is false, with errno set, when that fails.
  explicit DirReader(const std::string& path) : dir_(opendir(path.c_str())) {}
  ~DirReader() {
    if (dir_ != nullptr) closedir(dir_);
  }
  DirReader(const DirReader&) = delete;
  DirReader& operator=(const DirReader&) = delete;

  bool IsOpen() const { return dir_ != nullptr; }

  // The descriptor of the open directory, which stays its owner's.
  int Fd() const { return dirfd(dir_); }

  // Puts the next entry's name into `name`, in the order the file system gives; false at the end
  // and when reading fails. "." and ".." are left out.
  bool Next(std::string& name) {
    while (const dirent64* entry = readdir64(dir_)) {
      name = static_cast<const char*>(entry->d_name);
      if (name != "." && name != "..") return true;
    }
    return false;
  }

 private:
  DIR* dir_;
};

}  // namespace velkor
