// The work queue: requests that other programs leave in a file, one JSON object a line.
#include <cxxabi.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <string_view>

#include "appindex/elastic_control_internal.h"
#include "appindex/error.h"
#include "appindex/index_mgr.h"
#include "appindex/index_mgr_internal.h"
#include "appindex/index_queue_internal.h"
#include "appindex/observer_internal.h"
#include "appindex/utilities/file_utils.h"
#include "appindex/utilities/json_helpers.h"
#include "appindex/utilities/lock_file.h"
#include "common/check.h"
#include "common/file_io.h"
#include "common/json_strict.h"
#include "common/unique_fd.h"

namespace velkor::appindex {
namespace {

// What cannot be looked at may be a batch, which must not be replaced.
bool IsNoFile(const std::string& path) {
  struct stat info {};
  return lstat(path.c_str(), &info) == 0 ? !S_ISREG(info.st_mode) : errno == ENOENT;
}

// Moves the live queue aside, while no writer is in the middle of a line.
void TakeQueue() {
  const LockFile queue_lock(kQueuePath, true);
  CheckOrThrow(rename(kQueuePath, kBatchPath) == 0, {kIndexMgr, 330, "ProcessQueue"},
               "0 > rename(queue_path.c_str(), queue_path_tmp.c_str())", Error::kGeneralError,
               [] { return std::string("rename failed, reason=") + std::strerror(errno); });
}

// A request whose members cannot be read is logged and skipped: it must not hold up the others.
// What else fails here, such as memory, must not make it forgotten: that ends the reading.
void ReadLine(Batch& batch, const std::string& line) {
  constexpr CheckSite kBadRequest = {kIndexMgr, 350, "ProcessQueue"};
  constexpr CheckSite kFailedRequest = {kIndexMgr, 353, "ProcessQueue"};
  const auto failure = [&line] { return "ProcessQueue failed, cmd: " + line; };
  Json::Value request;
  if (!fromString(request, line)) return;
  int op = 0;
  std::string path;
  try {
    GetStrictInt(op, request, "op", true);
    GetStrictString(path, request, "path", false);
  } catch (const Error& error) {
    LogFailureText(kBadRequest, failure() + ", reason: " + error.what());
    return;
  } catch (const abi::__forced_unwind&) {
    throw;  // the thread is being cancelled
  } catch (...) {
    LogFailureText(kFailedRequest, failure());
    return;
  }
  batch[path] = op;
}

void Perform(int op, const std::string& path) {
  switch (op) {
    case kAdd:
      return Add(path, true);
    case kDel:
      return Del(path, true);
    case kReindex:
      return Reindex();
    default:
      return;  // of a later version: replaced what was queued for the path before, and does nothing
  }
}

void PerformAll(const Batch& batch) {
  std::size_t number = 0;
  for (const auto& [path, op] : batch) {
    Tell(&Observer::OnRequest, ++number, batch.size());
    Perform(op, path);
  }
}

// Whether the batch is still the file that is open. Who removes the process lock's file lets a
// second processor in, and that one may have finished this batch and begun the next.
bool IsStillTheBatch(const UniqueFd& batch) {
  struct stat opened {};
  struct stat named {};
  return fstat(batch.Get(), &opened) == 0 && lstat(kBatchPath, &named) == 0 &&
         opened.st_dev == named.st_dev && opened.st_ino == named.st_ino;
}

}  // namespace

Batch ReadBatch(const std::string& path) {
  Batch batch;
  std::string line;  // as much of it as has been read
  const auto take = [&](std::string_view piece) {
    for (;;) {
      const std::size_t end = piece.find('\n');
      line += piece.substr(0, end);
      if (end == std::string_view::npos) return;
      ReadLine(batch, line);
      line.clear();
      piece.remove_prefix(end + 1);
    }
  };
  CheckOrThrow(
      ReadRegularFile(path, take), {kIndexMgr, 340, "ProcessQueue"}, "!input_stream",
      Error::kGeneralError,
      [] { return std::string("Failed to open appindex queue, reason=") + std::strerror(errno); });
  if (!line.empty()) ReadLine(batch, line);
  return batch;
}

void ProcessQueue() {
  const LockFile process_lock(kProcessLockPath, true);
  while (IsFileExist(kQueuePath) || IsFileExist(kBatchPath)) {
    if (access(elastic::kElasticdSockPath, F_OK) != 0) return;  // no daemon: for a later call

    // A batch that an earlier call left unfinished comes first.
    if (IsFileExist(kQueuePath) && IsNoFile(kBatchPath)) TakeQueue();
    if (!IsFileExist(kBatchPath)) return;
    const UniqueFd batch(open(kBatchPath, O_RDONLY | O_NONBLOCK | O_CLOEXEC));
    PerformAll(ReadBatch(kBatchPath));

    // Only now: until here the batch file is the record of what is not done yet.
    if (IsStillTheBatch(batch)) unlink(kBatchPath);
  }
}

}  // namespace velkor::appindex
