#include "device/tovo_file.h"

#include <fcntl.h>
#include <stdlib.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <iterator>
#include <string>

#include "host/sdk/fail.h"
#include "host/sdk/keep_errno.h"
#include "host/sdk/unique_fd.h"

namespace sdk = host::sdk;

namespace {

// The steps of a copy return 0 or the errno value of what failed, which no clean-up can overwrite.
int ErrorOf(bool done) { return done ? 0 : errno; }

int RefuseAllButRegular(const struct stat& info) {
  if (S_ISREG(info.st_mode)) return 0;
  if (S_ISLNK(info.st_mode)) return ELOOP;
  return S_ISDIR(info.st_mode) ? EISDIR : EINVAL;
}

std::string DirectoryOf(const std::string& path) {
  const std::string::size_type slash = path.rfind('/');
  return slash == std::string::npos ? "." : path.substr(0, slash + 1);
}

// A file beside the destination that becomes the destination, or goes when that fails.
class TemporaryFile {
 public:
  explicit TemporaryFile(const std::string& dir)
      : path_(dir + "/.copy.XXXXXX"),
        fd_(mkostemp(path_.data(), O_CLOEXEC)),
        there_(fd_.IsOpen()) {}
  ~TemporaryFile() {
    if (there_) unlink(path_.c_str());
  }
  TemporaryFile(const TemporaryFile&) = delete;
  TemporaryFile& operator=(const TemporaryFile&) = delete;

  bool IsOpen() const { return fd_.IsOpen(); }
  int Fd() const { return fd_.Get(); }

  int RenameTo(const char* dst) {
    if (rename(path_.c_str(), dst) != 0) return errno;
    there_ = false;
    return 0;
  }

 private:
  std::string path_;
  sdk::UniqueFd fd_;
  bool there_;
};

int WriteAll(int fd, const char* data, std::size_t size) {
  while (size > 0) {
    const ssize_t n = write(fd, data, size);
    if (n < 0 && errno == EINTR) continue;
    if (n < 0) return errno;
    data += n;
    size -= static_cast<std::size_t>(n);
  }
  return 0;
}

int CopyContent(int from, int to) {
  std::array<char, 65536> chunk;
  for (;;) {
    const ssize_t n = read(from, chunk.data(), chunk.size());
    if (n == 0) return 0;
    if (n < 0 && errno == EINTR) continue;
    if (n < 0) return errno;
    if (const int error = WriteAll(to, chunk.data(), static_cast<std::size_t>(n))) return error;
  }
}

// Owner before mode, since a change of owner clears the set-id bits. Only root may give a file
// away; a copy that stays with its maker must not run with the maker's rights instead.
int KeepOwnerModeAndTimes(const struct stat& info, int to) {
  mode_t mode = info.st_mode & 07777;
  if (fchown(to, info.st_uid, info.st_gid) != 0) {
    if (errno != EPERM && errno != EINVAL) return errno;
    mode &= static_cast<mode_t>(~(S_ISUID | S_ISGID));
    if (fchown(to, static_cast<uid_t>(-1), info.st_gid) != 0 && errno != EPERM && errno != EINVAL) {
      return errno;
    }
  }
  if (fchmod(to, mode) != 0) return errno;
  const std::array<timespec, 2> times{info.st_atim, info.st_mtim};
  return ErrorOf(futimens(to, times.data()) == 0);
}

int CopyFile(const char* src, const char* dst) {
  const sdk::UniqueFd from(open(src, O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY));
  struct stat info {};
  if (!from.IsOpen() || fstat(from.Get(), &info) != 0) return errno;
  if (const int error = RefuseAllButRegular(info)) return error;

  const std::string dir = DirectoryOf(dst);
  const sdk::UniqueFd dir_fd(open(dir.c_str(), O_RDONLY | O_CLOEXEC | O_DIRECTORY));
  if (!dir_fd.IsOpen()) return errno;
  TemporaryFile to(dir);
  if (!to.IsOpen()) return errno;
  if (const int error = CopyContent(from.Get(), to.Fd())) return error;
  if (const int error = KeepOwnerModeAndTimes(info, to.Fd())) return error;
  if (fsync(to.Fd()) != 0) return errno;
  if (const int error = to.RenameTo(dst)) return error;
  return ErrorOf(fsync(dir_fd.Get()) == 0);
}

bool SameFile(const struct stat& a, const struct stat& b) {
  return a.st_dev == b.st_dev && a.st_ino == b.st_ino;
}

int CopyOrMove(const char* src, const char* dst, bool move) {
  const sdk::KeepErrno keep;
  struct stat from {};
  if (lstat(src, &from) != 0) return errno;
  if (const int error = RefuseAllButRegular(from)) return error;
  // Between two names of one file rename does nothing, and removing the source could lose it.
  struct stat to {};
  if (lstat(dst, &to) == 0 && SameFile(from, to)) return EINVAL;

  if (move && rename(src, dst) == 0) return 0;
  if (move && errno != EXDEV) return errno;
  if (const int error = CopyFile(src, dst)) return error;
  return move ? ErrorOf(unlink(src) == 0) : 0;
}

// A bit that the kernel refuses is an answer, not an error.
int GrantedOn(const char* path) {
  const sdk::KeepErrno keep;
  int granted = 0;
  for (const int bit : {R_OK, W_OK, X_OK}) {
    if (faccessat(AT_FDCWD, path, bit, AT_EACCESS) == 0) granted |= bit;
  }
  return granted;
}

// A word this implementation does not know asks for something it would not do.
bool IsKnownRequest(const TOVOCOPYARGS& args) {
  return args.words[0] == 1 && args.words[1] <= 1 &&
         std::all_of(std::begin(args.words) + 2, std::end(args.words),
                     [](uint32_t word) { return word == 0; });
}

}  // namespace

// Only a regular file is copied or moved: a link is refused (ELOOP), as are a directory (EISDIR)
// and anything else (EINVAL), and two names of one file (EINVAL). A link at `dst` is replaced, not
// followed. A move within a file system is a rename. Extended attributes are not copied.
int TOVOFileCopy(const char* src, const char* dst, TOVOCOPYARGS* args) {
  if (!src || !dst || !args || !IsKnownRequest(*args)) return sdk::Fail(EINVAL);
  const int error = CopyOrMove(src, dst, args->words[1] == 1);
  return error == 0 ? 0 : sdk::Fail(error);
}

int TOVOACLPermGet(const char* path, int* perm) {
  if (!path || !perm) return sdk::Fail(EINVAL);
  if (faccessat(AT_FDCWD, path, F_OK, AT_EACCESS) != 0) return sdk::Fail(errno);
  *perm = GrantedOn(path);
  return 0;
}

int TOVOFSDirIsMntPoint(const char* path) {
  if (!path) return sdk::Fail(EINVAL);
  struct statx dir {};
  if (statx(AT_FDCWD, path, AT_NO_AUTOMOUNT, STATX_TYPE | STATX_INO, &dir) != 0) {
    return sdk::Fail(errno);
  }
  if (!S_ISDIR(dir.stx_mode)) return sdk::Fail(ENOTDIR);
  if (dir.stx_attributes_mask & STATX_ATTR_MOUNT_ROOT) {
    return dir.stx_attributes & STATX_ATTR_MOUNT_ROOT ? 1 : 0;
  }
  // A kernel that does not say: a mount is another device than its parent, and "/" is its own.
  struct stat here {};
  struct stat parent {};
  if (stat(path, &here) != 0) return sdk::Fail(errno);
  if (stat((std::string(path) + "/..").c_str(), &parent) != 0) return sdk::Fail(errno);
  return here.st_dev != parent.st_dev || SameFile(here, parent) ? 1 : 0;
}
