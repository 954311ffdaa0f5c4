// Regular expressions, compiled in one place: what they are made of takes a compiler longer than
// all the rest of the library.
#pragma once

#include <string>
#include <vector>

namespace velkor {

// Looks for the first match of a Perl regular expression in `text`. Returns whether there is one,
// and then puts what its groups have matched into `groups`, the first group first; else leaves them
// alone.
bool SearchPattern(const char* pattern, const std::string& text, std::vector<std::string>& groups);

}  // namespace velkor
