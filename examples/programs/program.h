// What the example programs have in common: `--root DIR`, and one line for a failure.
#pragma once

#include <appindex/error.h>

#include <CLI/CLI.hpp>
#include <exception>
#include <iostream>
#include <string>

#include "host/device_root.h"

namespace example {

// Parses the arguments, enters the device root if one is given, runs `work` and returns the exit
// status: 0 done, 1 failed, 2 wrong arguments.
template <typename Work>
int Run(CLI::App& app, int argc, char** argv, const Work& work) {
  std::string root;
  app.add_option("--root", root, "Take this directory for \"/\"")->check(CLI::ExistingDirectory);
  try {
    app.parse(argc, argv);
  } catch (const CLI::ParseError& error) {
    return app.exit(error) == 0 ? 0 : 2;
  }
  try {
    if (!root.empty()) host::EnterDeviceRoot(root);
    work();
    return 0;
  } catch (const velkor::Error& error) {
    std::cerr << app.get_name() << ": " << error.what() << " (code " << error.code << ")\n";
  } catch (const std::exception& error) {
    std::cerr << app.get_name() << ": " << error.what() << "\n";
  }
  return 1;
}

}  // namespace example
