// The program appindex: the index of the installed applications, from the command line.
#include <fcntl.h>

#include <CLI/CLI.hpp>
#include <exception>
#include <iostream>

#include "host/device_root.h"
#include "tool/context.h"
#include "tool/failure.h"

namespace {

constexpr char kExitCodes[] =
    "Ends with 0: done, 1: failed, 2: wrong usage, 3: nothing found, 4: search daemon "
    "unreachable,\n"
    "5: lint has findings.\n";

void AddOptions(CLI::App& app, tool::Context& context) {
  app.add_option("--root", context.root, "Take this directory for \"/\"")
      ->type_name("DIR")
      ->check(CLI::Validator(CLI::ExistingDirectory).description(""));
  app.add_flag("--json", context.json, "Write data as JSON");
  app.add_flag("-q,--quiet", context.quiet, "No progress and no remarks");
  app.set_version_flag("--version", "appindex " APPINDEX_VERSION);
  app.footer(kExitCodes);
}

void AddCommands(CLI::App& app, tool::Context& context) {
  tool::AddIndexCommands(app, context);
  tool::AddEnqueueCommand(app, context);
  tool::AddStatusCommand(app, context);
  tool::AddSearchCommand(app, context);
  tool::AddShowCommand(app, context);
  tool::AddLintCommand(app, context);
  app.require_subcommand(1);
  app.fallthrough();
}

void EnterRoot(tool::Context& context) {
  context.proc = open("/proc", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  if (!context.root.empty()) host::EnterDeviceRoot(context.root);
}

// A command line that asks for help or the version, or that cannot be understood.
int Answer(const CLI::App& app, const CLI::ParseError& error) {
  if (error.get_exit_code() == 0) {
    app.exit(error);
    return tool::kDone;
  }
  std::cerr << "appindex: " << error.what() << "; `appindex --help` tells more\n";
  return tool::kUsage;
}

}  // namespace

int main(int argc, char** argv) {
  tool::Context context;
  CLI::App app("Keeps and searches the index of the installed applications", "appindex");
  AddOptions(app, context);
  AddCommands(app, context);
  app.parse_complete_callback([&context] { EnterRoot(context); });  // before that of the command
  try {
    app.parse(argc, argv);
    if (!std::cout.flush()) throw tool::Failure("standard output cannot be written");
    return context.exit_code;
  } catch (const CLI::ParseError& error) {
    return Answer(app, error);
  } catch (const std::exception& error) {
    return tool::ReportFailure(context, error);
  }
}
