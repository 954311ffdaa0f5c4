#include "host/sdk/regular_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>

#include "host/sdk/unique_fd.h"

namespace host::sdk {

std::optional<std::string> ReadRegularFile(const std::string& path, std::size_t limit) {
  const UniqueFd fd(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
  struct stat info {};
  if (!fd.IsOpen() || fstat(fd.Get(), &info) != 0) return std::nullopt;
  if (!S_ISREG(info.st_mode)) {
    errno = EINVAL;
    return std::nullopt;
  }

  std::string content;
  std::array<char, 16384> chunk{};
  for (;;) {
    const ssize_t n = read(fd.Get(), chunk.data(), chunk.size());
    if (n == 0) return content;
    if (n < 0 && errno == EINTR) continue;
    if (n < 0) return std::nullopt;
    content.append(chunk.data(), static_cast<std::size_t>(n));
    if (content.size() > limit) {
      errno = EFBIG;
      return std::nullopt;
    }
  }
}

}  // namespace host::sdk
