// What a person is told when a command fails: one line with the file, the cause and what to do.
#pragma once

#include <exception>
#include <stdexcept>
#include <string>

#include "tool/context.h"

namespace tool {

// A failure that the program found itself. `what()` is the whole line.
class Failure : public std::runtime_error {
 public:
  explicit Failure(const std::string& line, ExitCode exit_code = kFailed, int code = 0)
      : std::runtime_error(line), exit_code_(exit_code), code_(code) {}
  ExitCode exit_code() const { return exit_code_; }
  int code() const { return code_; }  // of the velkor::Error that it is made from, or 0

 private:
  ExitCode exit_code_;
  int code_;
};

struct Report {
  std::string line;
  int code;  // of the velkor::Error; 0 for another exception
  ExitCode exit_code;
};

// What to say about `exception`. The library's reasons are put into plain words; one that there are
// no better words for is given as it is, on one line and not longer than a person reads.
Report Explain(const std::exception& exception);

// Writes that line to standard error and, with --json, {"error":{"message":...,"code":N}} to
// standard output. Returns what the program ends with.
ExitCode ReportFailure(const Context& context, const std::exception& exception);

}  // namespace tool
