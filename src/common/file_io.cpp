#include "common/file_io.h"

#include <fcntl.h>
#include <stdlib.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>

#include "common/unique_fd.h"

namespace velkor {
namespace {

bool FailWith(int error) {
  errno = error;
  return false;
}

bool WriteAll(int fd, const std::string& content) {
  std::size_t done = 0;
  while (done < content.size()) {
    const ssize_t n = write(fd, content.data() + done, content.size() - done);
    if (n < 0) {
      if (errno == EINTR) continue;
      return false;
    }
    done += static_cast<std::size_t>(n);
  }
  return true;
}

bool SyncDirectoryOf(const std::string& path) {
  const std::string::size_type slash = path.rfind('/');
  const std::string dir = slash == std::string::npos ? "." : path.substr(0, slash + 1);
  const UniqueFd fd(open(dir.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  return fd.IsOpen() && fsync(fd.Get()) == 0;
}

// The mode comes before the content, so that nobody reads what they may not.
bool FillFile(UniqueFd& fd, const std::string& content, mode_t mode) {
  return fchmod(fd.Get(), mode) == 0 && WriteAll(fd.Get(), content) && fsync(fd.Get()) == 0 &&
         fd.Close();
}

}  // namespace

bool ReadRegularFile(const std::string& path, std::size_t limit, std::string& content) {
  const UniqueFd fd(open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC));
  if (!fd.IsOpen()) return false;
  struct stat info {};
  if (fstat(fd.Get(), &info) != 0) return false;
  if (!S_ISREG(info.st_mode)) return FailWith(S_ISDIR(info.st_mode) ? EISDIR : EINVAL);

  const int kept = errno;
  // Room for one byte more than the file is said to have: where it has more, the text grows.
  std::string text(std::min(static_cast<std::size_t>(info.st_size), limit) + 1, '\0');
  std::size_t done = 0;
  for (;;) {
    const ssize_t n = read(fd.Get(), &text[done], text.size() - done);
    if (n == 0) break;
    if (n < 0) {
      if (errno == EINTR) continue;
      return false;
    }
    done += static_cast<std::size_t>(n);
    if (done > limit) return FailWith(EFBIG);
    if (done == text.size()) text.resize(2 * text.size());
  }
  text.resize(done);
  content.swap(text);
  errno = kept;  // a read that was interrupted and then went well is no failure
  return true;
}

bool ReplaceFile(const std::string& path, const std::string& content, mode_t mode) {
  std::string temporary = path + ".XXXXXX";
  UniqueFd fd(mkostemp(temporary.data(), O_CLOEXEC));
  if (!fd.IsOpen()) return false;
  if (!FillFile(fd, content, mode) || rename(temporary.c_str(), path.c_str()) != 0) {
    const int failed_with = errno;
    unlink(temporary.c_str());
    return FailWith(failed_with);
  }
  return SyncDirectoryOf(path);
}

}  // namespace velkor
