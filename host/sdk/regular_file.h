// Reading whole files that others have written.
#pragma once

#include <cstddef>
#include <optional>
#include <string>

namespace host::sdk {

// The content of the regular file at `path` (links are followed). Nothing, with errno set, when it
// cannot be read, is no regular file (EINVAL; a FIFO or a device is never waited for) or is longer
// than `limit` bytes (EFBIG).
std::optional<std::string> ReadRegularFile(const std::string& path, std::size_t limit);

}  // namespace host::sdk
