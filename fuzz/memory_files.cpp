#include "fuzz/memory_files.h"

#include <cerrno>
#include <cstdint>
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

// In two pieces, the first of which ends in the middle of a line as a rule.
bool velkor::ReadRegularFile(const std::string& path,
                             const std::function<void(std::string_view)>& take) {
  const std::string* file = fuzz::Find(path, SIZE_MAX);
  if (file == nullptr) return false;
  const std::string_view content = *file;
  take(content.substr(0, content.size() / 2));
  take(content.substr(content.size() / 2));
  return true;
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
