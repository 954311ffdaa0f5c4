// Telling an operator how things stand.
#include <CLI/CLI.hpp>
#include <iostream>

#include "tool/context.h"
#include "tool/output.h"
#include "tool/status.h"

namespace tool {

void AddStatusCommand(CLI::App& app, Context& context) {
  CLI::App* command =
      app.add_subcommand("status", "Show daemon, queue, locks, version and indexes");
  command->callback([&context] {
    Status status;
    Gather(status, context.proc);
    if (context.json) {
      PrintJson(ToJson(status));
    } else {
      std::cout << ToText(status);
    }
    if (status.daemon_problem.empty()) return;
    context.exit_code = status.daemon_refuses ? kFailed : kDaemonUnreachable;
  });
}

}  // namespace tool
