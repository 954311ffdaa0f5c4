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
  // `cause` begins with the file; `advice` says what to do.
  Failure(const std::string& cause, const std::string& advice, ExitCode exit_code = kFailed,
          int code = 0)
      : std::runtime_error(cause + "; " + advice),
        cause_(cause),
        exit_code_(exit_code),
        code_(code) {}
  // Of a line that has both already.
  explicit Failure(const std::string& line, ExitCode exit_code = kFailed, int code = 0)
      : std::runtime_error(line), cause_(line), exit_code_(exit_code), code_(code) {}
  const std::string& cause() const { return cause_; }
  ExitCode exit_code() const { return exit_code_; }
  int code() const { return code_; }  // of the velkor::Error that it is made from, or 0

 private:
  std::string cause_;
  ExitCode exit_code_;
  int code_;
};

// What to do about an error number of the system. Never empty.
std::string AdviceOn(int error);

// Whether the daemon's code says that it is not ready yet. Whoever works the queue then waits and
// asks again, as after Error::kDaemonBusy, without limit.
bool IsNotReady(int code);

// Why ReadRegularFile did not read a descriptor or a file of its kind, by the number in `errno`.
std::string WhyNotRead(int error);

struct Report {
  std::string line;
  int code;  // of the velkor::Error; 0 for another exception
  ExitCode exit_code;
  std::string cause;  // the line without what to do
};

// What to say about `exception`. The library's reasons are put into plain words; one that there are
// no better words for is given as it is, on one line and not longer than a person reads.
Report Explain(const std::exception& exception);

// Writes that line to standard error and, with --json, {"error":{"message":...,"code":N}} to
// standard output. Returns what the program ends with.
ExitCode ReportFailure(const Context& context, const std::exception& exception);

}  // namespace tool
