// Adds an application with a daemon that answers at once, for strace.
#include <appindex/index_mgr.h>

#include <CLI/CLI.hpp>
#include <cstdio>
#include <exception>
#include <string>

#include "bench/costs/instant_daemon.h"
#include "host/device_root.h"

int main(int argc, char** argv) {
  CLI::App app("Adds one application");
  std::string root;
  std::string descriptor;
  app.add_option("root", root, "A device root")->required();
  app.add_option("descriptor", descriptor, "Path of an index.conf in it")->required();
  CLI11_PARSE(app, argc, argv);
  try {
    host::EnterDeviceRoot(root);
    const bench::InstantDaemon daemon;
    velkor::appindex::Add(descriptor, false);
    return 0;
  } catch (const std::exception& e) {
    std::fprintf(stderr, "add_calls: %s\n", e.what());
    return 2;
  }
}
