// Reading and replacing whole files.
#pragma once

#include <sys/types.h>

#include <cstddef>
#include <functional>
#include <string>
#include <string_view>

namespace velkor {

constexpr std::size_t kMaxJsonFileBytes = std::size_t{16} * 1024 * 1024;

// Reads a whole regular file of at most `limit` bytes into `content`. Returns false, with errno set
// and `content` untouched, for anything else: EISDIR for a directory, EINVAL for another kind of
// file, EFBIG for a larger one. Never hangs on a FIFO.
bool ReadRegularFile(const std::string& path, std::size_t limit, std::string& content);

// Reads a regular file of any size piece by piece, in order, and keeps no more than one. Returns
// false, with errno set as above, when it cannot be opened or, after pieces that were given, not be
// read. errno is the caller's own whenever `take` is called and when all went well.
bool ReadRegularFile(const std::string& path, const std::function<void(std::string_view)>& take);

// Replaces the file at `path` with `content`, with the permission bits `mode` from its first
// moment: written to a temporary file beside it, synced, renamed over it, and the directory synced.
// Returns false, with errno set and nothing left behind, when any step fails; the old file is then
// still in place, unless only the directory's sync failed. A process that dies meanwhile leaves the
// temporary file, "PATH.new." and six characters, which the next call removes.
bool ReplaceFile(const std::string& path, const std::string& content, mode_t mode);

}  // namespace velkor
