// Internal seam of the module string_pool: the search for an application's texts.
#pragma once

#include <string>

namespace velkor::appindex {

// Finds the first directory named "texts" below `find_dir` (ending in "/"), depth-first in the
// order in which the file system lists directories, links to directories included. `depth` is 0 at
// the start; a "texts" directory is found at most six levels down. Puts its path, ending in "/",
// into `out` and returns true, or returns false. Throws Error 502, logged, when a directory cannot
// be opened.
bool FindPkgTextRoot(std::string& out, const std::string& find_dir, int depth);

}  // namespace velkor::appindex
