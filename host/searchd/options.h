#pragma once

#include <chrono>
#include <stdexcept>
#include <string>

namespace searchd {

struct Options {
  std::string root;  // empty: the system's own
  bool foreground = false;
  int ready_fd = -1;
  std::chrono::seconds time_limit{30};
  bool show_help = false;
  bool show_version = false;
};

class UsageError : public std::runtime_error {
  using std::runtime_error::runtime_error;
};

// Throws UsageError.
Options ParseOptions(int argc, char** argv);

// What --help prints.
const char* HelpText();

}  // namespace searchd
