// The program appindex: the index of the installed applications, from the command line.
#include <fcntl.h>

#include <CLI/CLI.hpp>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <exception>
#include <iostream>
#include <string>

#include "host/device_root.h"
#include "tool/context.h"
#include "tool/failure.h"
#include "tool/output.h"

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
  app.fallthrough();  // handed down to the commands when they are made
  tool::AddIndexCommands(app, context);
  tool::AddEnqueueCommand(app, context);
  tool::AddStatusCommand(app, context);
  tool::AddSearchCommand(app, context);
  tool::AddShowCommand(app, context);
  tool::AddLintCommand(app, context);
  app.require_subcommand(1);
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
  std::cerr << "appindex: " << tool::OneLine(error.what()) << "; `appindex --help` tells more\n";
  return tool::kUsage;
}

void FlushOutput() {
  if (std::cout.flush()) return;
  // A write that failed before has not kept its cause, but fails again.
  std::clearerr(stdout);
  std::fputc('\n', stdout);
  std::fflush(stdout);
  throw tool::Failure(std::string("standard output cannot be written: ") + std::strerror(errno),
                      "direct it to another place");
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
    FlushOutput();
    return context.exit_code;
  } catch (const CLI::ParseError& error) {
    return Answer(app, error);
  } catch (const std::exception& error) {
    return tool::ReportFailure(context, error);
  }
}
