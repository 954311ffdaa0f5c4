// What every command of appindex is given.
#pragma once

#include <string>

namespace CLI {
class App;
}

namespace tool {

enum ExitCode {
  kDone = 0,
  kFailed = 1,
  kUsage = 2,
  kNothingFound = 3,
  kDaemonUnreachable = 4,
  kFindings = 5,
};

// The options that stand before a command, and what the program ends with.
struct Context {
  std::string root;    // the device's; empty: this system
  bool json = false;   // data as JSON texts
  bool quiet = false;  // no progress, no remarks
  int proc = -1;       // an open descriptor of /proc, which a device root does not have
  ExitCode exit_code = kDone;
};

// Each adds its command or commands; a callback of theirs carries one out. They stay valid as long
// as both arguments.
void AddIndexCommands(CLI::App& app, Context& context);  // add, del, reindex, process-queue
void AddEnqueueCommand(CLI::App& app, Context& context);
void AddStatusCommand(CLI::App& app, Context& context);
void AddSearchCommand(CLI::App& app, Context& context);
void AddShowCommand(CLI::App& app, Context& context);
void AddLintCommand(CLI::App& app, Context& context);

}  // namespace tool
