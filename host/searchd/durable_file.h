#pragma once

#include <string>

namespace searchd {

// Replaces the content of `file` durably and as a whole, mode 0600: a new file beside it, synced,
// renamed over it, and the directory synced. Throws RequestError(kStorage) naming the file; it then
// holds what it held before. One caller at a time.
void ReplaceFile(const std::string& file, const std::string& content);

// Makes a directory with missing parents, durably; those are for all to enter, the last one has
// `mode`. Directories that exist stay as they are. Throws std::runtime_error.
void MakeDirectories(const std::string& path, unsigned mode);

}  // namespace searchd
