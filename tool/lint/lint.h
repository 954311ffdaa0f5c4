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

struct Outcome {
  std::vector<std::string> checked;  // the descriptors, in order
  std::vector<Finding> findings;     // in the order of files and places
  std::vector<TextTable> tables;     // of the descriptors that refer to texts
};

// Checks every descriptor that the paths name. Throws Failure for a path that cannot be
// read; what of its descriptors cannot be read is a finding.
Outcome Lint(const std::vector<std::string>& paths, const Options& options);

// Reads {"models": [...], "platforms": [...]}, either of which may be left out. Throws Failure when
// it is not that.
KnownNames ReadKnownNames(const std::string& path);

}  // namespace tool::lint
