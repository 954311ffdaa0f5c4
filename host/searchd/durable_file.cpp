#include "host/searchd/durable_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <stdexcept>

#include "host/sdk/unique_fd.h"
#include "host/searchd/request_error.h"

namespace searchd {
namespace {

using host::sdk::UniqueFd;

[[noreturn]] void Fail(const std::string& path) {
  throw RequestError(Code::kStorage, WithErrno(path, errno));
}

std::string DirectoryOf(const std::string& file) {
  const std::size_t slash = file.rfind('/');
  return slash == std::string::npos ? "." : file.substr(0, slash + 1);
}

bool WriteAll(int fd, const std::string& content) {
  std::size_t done = 0;
  while (done < content.size()) {
    const ssize_t n = write(fd, content.data() + done, content.size() - done);
    if (n < 0 && errno == EINTR) continue;
    if (n < 0) return false;
    done += static_cast<std::size_t>(n);
  }
  return true;
}

bool WriteSynced(const std::string& file, const std::string& content) {
  const UniqueFd fd(
      open(file.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_NOFOLLOW | O_CLOEXEC, S_IRUSR | S_IWUSR));
  return fd.IsOpen() && WriteAll(fd.Get(), content) && fsync(fd.Get()) == 0;
}

bool SyncDirectory(const std::string& path) {
  const UniqueFd dir(open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  return dir.IsOpen() && fsync(dir.Get()) == 0;
}

void MakeDirectory(const std::string& dir, mode_t mode) {
  if (mkdir(dir.c_str(), mode) == 0) {
    // The process masks bits out of the mode of what it makes. The file in it that is durable would
    // be lost with an entry that is not.
    if (chmod(dir.c_str(), mode) == 0 && SyncDirectory(DirectoryOf(dir))) return;
  } else if (errno == EEXIST) {
    return;
  }
  throw std::runtime_error(WithErrno("cannot make directory " + dir, errno));
}

}  // namespace

void ReplaceFile(const std::string& file, const std::string& content) {
  const std::string temporary = file + ".tmp";
  if (!WriteSynced(temporary, content) || std::rename(temporary.c_str(), file.c_str()) != 0) {
    const int error = errno;
    unlink(temporary.c_str());
    errno = error;
    Fail(file);
  }
  if (!SyncDirectory(DirectoryOf(file))) Fail(file);
}

void MakeDirectories(const std::string& path, unsigned mode) {
  constexpr mode_t kForAllToEnter = S_IRWXU | S_IRGRP | S_IXGRP | S_IROTH | S_IXOTH;
  for (std::size_t at = path.find('/', 1);; at = path.find('/', at + 1)) {
    const bool last = at == std::string::npos;
    MakeDirectory(path.substr(0, at), last ? mode : kForAllToEnter);
    if (last) return;
  }
}

}  // namespace searchd
