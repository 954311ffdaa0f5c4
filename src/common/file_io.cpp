#include "common/file_io.h"

#include <fcntl.h>
#include <stdlib.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdio>

#include "common/dir_reader.h"
#include "common/unique_fd.h"

namespace velkor {
namespace {

constexpr std::size_t kPieceBytes = 16384;

bool FailWith(int error) {
  errno = error;
  return false;
}

bool IsRegular(const struct stat& info) {
  if (S_ISREG(info.st_mode)) return true;
  return FailWith(S_ISDIR(info.st_mode) ? EISDIR : EINVAL);
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

std::string DirectoryOf(const std::string& path) {
  const std::string::size_type slash = path.rfind('/');
  return slash == std::string::npos ? "./" : path.substr(0, slash + 1);
}

bool SyncDirectoryOf(const std::string& path) {
  const UniqueFd fd(open(DirectoryOf(path).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  return fd.IsOpen() && fsync(fd.Get()) == 0;
}

// A temporary file's name is that of the file, this, and characters that make it unlike all others.
constexpr char kTemporaryMark[] = ".new.";
constexpr char kUniquePart[] = "XXXXXX";

// Who writes a temporary file holds its lock until it is renamed. One that nobody holds was left by
// a process that died.
void RemoveTemporary(const std::string& temporary) {
  const UniqueFd fd(open(temporary.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
  if (fd.IsOpen() && flock(fd.Get(), LOCK_EX | LOCK_NB) == 0) unlink(temporary.c_str());
}

void RemoveLeftovers(const std::string& path) {
  const int kept = errno;
  const std::string dir = DirectoryOf(path);
  const std::string mark = path.substr(path.rfind('/') + 1) + kTemporaryMark;
  DirReader reader(dir);
  std::string name;
  while (reader.IsOpen() && reader.Next(name)) {
    const bool ours = name.size() == mark.size() + sizeof(kUniquePart) - 1 &&
                      name.compare(0, mark.size(), mark) == 0;
    if (ours) RemoveTemporary(dir + name);
  }
  errno = kept;
}

// Makes a temporary file that nobody takes for a leftover, and tells its name: it is locked, and
// was still there then. Another writer may have removed it in the moment before. Where there are no
// locks, nobody can take it for a leftover either. -1 with errno set when that fails.
int OpenTemporary(const std::string& path, std::string& temporary) {
  for (;;) {
    temporary = path + kTemporaryMark + kUniquePart;
    const int fd = mkostemp(temporary.data(), O_CLOEXEC);
    if (fd < 0) return -1;
    struct stat info {};
    if (flock(fd, LOCK_EX) != 0 || fstat(fd, &info) != 0 || info.st_nlink > 0) return fd;
    close(fd);
  }
}

// The mode comes before the content, so that nobody reads what they may not.
bool FillFile(UniqueFd& fd, const std::string& content, mode_t mode) {
  return fchmod(fd.Get(), mode) == 0 && WriteAll(fd.Get(), content) && fsync(fd.Get()) == 0 &&
         fd.Close();
}

// Opens a regular file for reading and looks at it. -1 with errno set when that fails.
int OpenRegularFile(const std::string& path, struct stat& info) {
  if (path.find('\0') != std::string::npos) {  // another name to the system
    errno = ENOENT;
    return -1;
  }
  // Looked at before it is opened: that alone makes a watchdog run, winds a tape back, or gives the
  // process a terminal. Once open, it may be another file.
  if (stat(path.c_str(), &info) != 0 || !IsRegular(info)) return -1;
  UniqueFd fd(open(path.c_str(), O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
  if (!fd.IsOpen() || fstat(fd.Get(), &info) != 0 || !IsRegular(info)) return -1;
  return fd.Release();
}

}  // namespace

bool ReadRegularFile(const std::string& path, std::size_t limit, std::string& content) {
  struct stat info {};
  const UniqueFd fd(OpenRegularFile(path, info));
  if (!fd.IsOpen()) return false;
  if (static_cast<std::size_t>(info.st_size) > limit) return FailWith(EFBIG);

  const int kept = errno;
  // Room for one byte more than the file is said to have: where it has more, the text grows.
  std::string text(static_cast<std::size_t>(info.st_size) + 1, '\0');
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

bool ReadRegularFile(const std::string& path, const std::function<void(std::string_view)>& take) {
  struct stat info {};
  const UniqueFd fd(OpenRegularFile(path, info));
  if (!fd.IsOpen()) return false;
  std::array<char, kPieceBytes> piece;  // NOLINT: filled before it is read
  for (;;) {
    const int kept = errno;
    const ssize_t n = read(fd.Get(), piece.data(), piece.size());
    if (n == 0) return true;
    if (n > 0) {
      take({piece.data(), static_cast<std::size_t>(n)});
    } else if (errno == EINTR) {
      errno = kept;  // an interruption is no failure
    } else {
      return false;
    }
  }
}

bool ReplaceFile(const std::string& path, const std::string& content, mode_t mode) {
  RemoveLeftovers(path);
  std::string temporary;
  UniqueFd fd(OpenTemporary(path, temporary));
  if (!fd.IsOpen()) return false;
  const UniqueFd lock(fcntl(fd.Get(), F_DUPFD_CLOEXEC, 0));
  if (!FillFile(fd, content, mode) || rename(temporary.c_str(), path.c_str()) != 0) {
    const int failed_with = errno;
    unlink(temporary.c_str());
    return FailWith(failed_with);
  }
  return SyncDirectoryOf(path);
}

}  // namespace velkor
