#include "fuzz/memory_files.h"

#include <cerrno>
#include <optional>

#include "common/file_io.h"
#include "host/sdk/regular_file.h"

namespace fuzz {
namespace {

// Null, with errno set, as the readers that this stands in for set it.
const std::string* Find(const std::string& path, std::size_t limit) {
  const auto file = MemoryFiles().find(path);
  if (file == MemoryFiles().end()) {
    errno = ENOENT;
    return nullptr;
  }
  if (file->second.size() > limit) {
    errno = EFBIG;
    return nullptr;
  }
  return &file->second;
}

}  // namespace

std::map<std::string, std::string>& MemoryFiles() {
  static std::map<std::string, std::string> files;
  return files;
}

}  // namespace fuzz

bool velkor::ReadRegularFile(const std::string& path, std::size_t limit, std::string& content) {
  const std::string* file = fuzz::Find(path, limit);
  if (file != nullptr) content = *file;
  return file != nullptr;
}

bool velkor::ReplaceFile(const std::string& /*path*/, const std::string& /*content*/,
                         mode_t /*mode*/) {
  errno = EROFS;
  return false;
}

std::optional<std::string> host::sdk::ReadRegularFile(const std::string& path, std::size_t limit) {
  const std::string* file = fuzz::Find(path, limit);
  return file == nullptr ? std::nullopt : std::optional(*file);
}
