// What the linter has to say about a descriptor or its package.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

namespace tool::lint {

enum class Severity { kError, kWarning, kNote };

// Counted from 1, the column in characters; both 0 where there is no such place.
struct Position {
  std::size_t line = 0;
  std::size_t column = 0;
};

struct Finding {
  std::string tag;  // one of AllTags
  Severity severity = Severity::kError;
  std::string file;  // absolute
  Position position;
  std::string pointer;  // JSON pointer into the file; empty: all of it
  std::string message;
  std::vector<std::string> languages;  // that it is about; empty: not about languages
};

}  // namespace tool::lint
