// The program appindex, run for the device root that the test is in.
#pragma once

#include <sys/types.h>
#include <termios.h>

#include <map>
#include <string>
#include <vector>

#include "tests/support/searchd_process.h"

namespace test {

using Environment = std::map<std::string, std::string>;

// Where a program is started from: the directory that was "/" outside, and the root's path there.
struct Outside {
  int root_fd;
  std::string path;
};

struct Finished {
  int status = -1;  // exit status, or 128 and the signal
  std::string out;
  std::string err;
};

// Runs it to its end without a terminal.
Finished RunTool(const Outside& outside, const std::vector<std::string>& arguments,
                 const Environment& environment = {});

// Runs it in a terminal of its own, of 24 lines and so many columns.
class ToolInTerminal {
 public:
  ToolInTerminal(const Outside& outside, int columns, const std::vector<std::string>& arguments,
                 const Environment& environment = {});
  // Kills it if it still runs.
  ~ToolInTerminal();
  ToolInTerminal(const ToolInTerminal&) = delete;
  ToolInTerminal& operator=(const ToolInTerminal&) = delete;

  // Waits until it has written `text`, or has ended; tells which.
  bool ReadUntil(const std::string& text);
  // Types into the terminal.
  void Type(const std::string& text) const;
  void Resize(int columns) const;
  void Signal(int signal) const;

  // Reads to its end. The status is as that of Finished.
  int Wait();
  // All that it has written so far, as it arrived at the terminal.
  const std::string& Output() const { return output_; }
  // How the terminal is set.
  termios Settings() const;

 private:
  bool ReadMore();

  Fd terminal_;
  pid_t pid_;
  std::string output_;
};

}  // namespace test
