// Reading and replacing whole files.
#pragma once

#include <sys/types.h>

#include <cstddef>
#include <string>

namespace velkor {

constexpr std::size_t kMaxJsonFileBytes = std::size_t{16} * 1024 * 1024;

// Reads a whole regular file of at most `limit` bytes into `content`. Returns false, with errno set
// and `content` untouched, for anything else: EISDIR for a directory, EINVAL for another kind of
// file, EFBIG for a larger one. Never hangs on a FIFO.
bool ReadRegularFile(const std::string& path, std::size_t limit, std::string& content);

// Replaces the file at `path` with `content`, with the permission bits `mode` from its first
// moment: written to a temporary file beside it, synced, renamed over it, and the directory synced.
// Returns false, with errno set and nothing left behind, when any step fails; the old file is then
// still in place, unless only the directory's sync failed. A process that dies meanwhile leaves the
// temporary file, "PATH.new." and six characters, which the next call removes.
bool ReplaceFile(const std::string& path, const std::string& content, mode_t mode);

}  // namespace velkor
