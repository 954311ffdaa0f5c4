// The linter for authors of packages.
#pragma once

#include <string>
#include <vector>

#include "tool/lint/checks.h"

namespace tool::lint {

struct Options {
  KnownNames known;
  std::string package_dir;  // where the package begins; empty: found out
};

// The texts of one descriptor, language by language.
struct TextTable {
  std::string file;
  std::vector<TextRow> rows;
};

struct Outcome {
  std::vector<std::string> checked;  // the descriptors, in order
  std::vector<Finding> findings;     // in the order of files and places
  std::vector<TextTable> tables;     // of the descriptors that refer to texts
};

// Checks every descriptor that the paths name. Throws std::runtime_error, naming the file, for what
// cannot be read.
Outcome Lint(const std::vector<std::string>& paths, const Options& options);

// Reads {"models": [...], "platforms": [...]}, either of which may be left out. Throws
// std::runtime_error, naming the file, when it is not that.
KnownNames ReadKnownNames(const std::string& path);

}  // namespace tool::lint
