#include "host/sdk/regular_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>

#include "host/sdk/unique_fd.h"

namespace host::sdk {
namespace {

std::nullopt_t FailWith(int error) {
  errno = error;
  return std::nullopt;
}

}  // namespace

std::optional<std::string> ReadRegularFile(const std::string& path, std::size_t limit) {
  if (path.find('\0') != std::string::npos) return FailWith(ENOENT);  // another name to the system
  // Looked at before it is opened: that alone makes a watchdog run or winds a tape back. Once open,
  // it may be another file.
  struct stat info {};
  if (stat(path.c_str(), &info) != 0) return std::nullopt;
  if (!S_ISREG(info.st_mode)) return FailWith(EINVAL);
  const UniqueFd fd(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
  if (!fd.IsOpen() || fstat(fd.Get(), &info) != 0) return std::nullopt;
  if (!S_ISREG(info.st_mode)) return FailWith(EINVAL);
  if (static_cast<std::size_t>(info.st_size) > limit) return FailWith(EFBIG);

  std::string content;
  std::array<char, 16384> chunk;  // NOLINT: filled before it is read
  for (;;) {
    const ssize_t n = read(fd.Get(), chunk.data(), chunk.size());
    if (n == 0) return content;
    if (n < 0 && errno == EINTR) continue;
    if (n < 0) return std::nullopt;
    content.append(chunk.data(), static_cast<std::size_t>(n));
    if (content.size() > limit) return FailWith(EFBIG);
  }
}

}  // namespace host::sdk
