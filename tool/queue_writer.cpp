#include "tool/queue_writer.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "appindex/index_queue_internal.h"
#include "appindex/utilities/file_utils.h"
#include "appindex/utilities/json_helpers.h"
#include "common/unique_fd.h"
#include "tool/failure.h"

namespace tool {
namespace {

using velkor::UniqueFd;
using velkor::appindex::kQueuePath;

constexpr mode_t kQueueMode = 0644;

[[noreturn]] void Fail(const std::string& what, int error) {
  throw Failure(std::string(kQueuePath) + ": " + what + ": " + std::strerror(error),
                error == ENOENT ? "make its directory" : AdviceOn(error));
}

UniqueFd Open() {
  const int fd = open(kQueuePath, O_RDWR | O_APPEND | O_CREAT | O_CLOEXEC | O_NOFOLLOW, kQueueMode);
  if (fd < 0) Fail("the queue cannot be opened", errno);
  return UniqueFd(fd);
}

void Lock(int fd) {
  while (flock(fd, LOCK_EX) != 0) {
    if (errno != EINTR) Fail("the queue cannot be locked", errno);
  }
}

bool IsStillTheQueue(int fd) {
  struct stat locked {};
  struct stat named {};
  const bool known = fstat(fd, &locked) == 0 && lstat(kQueuePath, &named) == 0;
  if (!known && errno != ENOENT) Fail("the queue cannot be looked at", errno);
  return known && locked.st_dev == named.st_dev && locked.st_ino == named.st_ino;
}

// An end that cannot be read may be one too: a line feed too many does no harm.
bool EndsInTornLine(int fd, off_t size) {
  char last = '\n';
  return size > 0 && (pread(fd, &last, 1, size - 1) != 1 || last != '\n');
}

void SyncDirectory() {
  const UniqueFd dir(open(velkor::Dirname(kQueuePath).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!dir.IsOpen() || fsync(dir.Get()) != 0) Fail("the queue's directory cannot be synced", errno);
}

void Append(int fd, std::string lines) {
  struct stat before {};
  if (fstat(fd, &before) != 0) Fail("the queue cannot be looked at", errno);
  if (EndsInTornLine(fd, before.st_size)) lines.insert(0, "\n");

  errno = ENOSPC;  // what a write that takes only a part leaves unsaid
  const bool written = write(fd, lines.data(), lines.size()) == static_cast<ssize_t>(lines.size());
  if (!written || fsync(fd) != 0) {
    const int error = errno;
    // Under the lock still: nobody has read it.
    if (ftruncate(fd, before.st_size) != 0) Fail("a part of a line could not be taken back", errno);
    Fail("the queue cannot be written", error);
  }
}

}  // namespace

Json::Value QueueRequest(int op, const std::string& path) {
  Json::Value request;
  request["op"] = op;
  if (!path.empty()) request["path"] = path;
  return request;
}

void AppendToQueue(const std::vector<Json::Value>& requests) {
  std::string lines;
  for (const Json::Value& request : requests) lines += velkor::toString(request) + "\n";
  for (;;) {
    const UniqueFd fd = Open();
    Lock(fd.Get());
    if (!IsStillTheQueue(fd.Get())) continue;
    Append(fd.Get(), lines);
    SyncDirectory();
    return;
  }
}

}  // namespace tool
