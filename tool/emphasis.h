// Showing a reader where in a text the words are that were searched for.
#pragma once

#include <string>

namespace tool {

// `text` with the words of `query` emphasised wherever a word of it begins with one, or, where none
// does, wherever they stand. Case, accents and width do not matter, as for the search itself; both
// are UTF-8.
std::string Emphasised(const std::string& text, const std::string& query);

}  // namespace tool
