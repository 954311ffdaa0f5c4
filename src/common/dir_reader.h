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
      type_ = entry->d_type;
      if (name != "." && name != "..") return true;
    }
    return false;
  }

  // Whether the entry that Next gave last may be a link: it is one, or the file system does not say
  // what it is.
  bool MayBeLink() const { return type_ == DT_LNK || type_ == DT_UNKNOWN; }

 private:
  DIR* dir_;
  unsigned char type_ = DT_UNKNOWN;
};

}  // namespace velkor
