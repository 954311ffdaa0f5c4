#pragma once

#include <xapian.h>

#include <string>

#include "host/searchd/request_error.h"

namespace searchd {

// What a client is told when Xapian fails on the index in `path`: kBusy when another process has it
// open for writing, kStorage otherwise.
RequestError StorageError(const std::string& path, const Xapian::Error& error);

}  // namespace searchd
