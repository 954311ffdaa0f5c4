// Files in memory. Where a program links memory_files.cpp, the whole-file readers of the library
// and of the host's device functions read these and no others, since the linker then leaves their
// own sources in the archives; nothing can be written.
#pragma once

#include <map>
#include <string>

namespace fuzz {

// By path.
std::map<std::string, std::string>& MemoryFiles();

}  // namespace fuzz
