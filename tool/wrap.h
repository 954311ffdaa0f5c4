// Long texts on narrow terminals.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

namespace tool {

// `text` in lines of at most so many columns, broken where its language allows a line break,
// without the white space there. What cannot be broken stands on a line of its own, however long.
// Characters of East Asian scripts take two columns, marks none. An empty text is one empty line.
std::vector<std::string> Wrapped(const std::string& text, std::size_t columns);

}  // namespace tool
