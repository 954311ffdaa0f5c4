// One act of the library or of a writer of the queue in a device root, as a program of its own.
//   power_cut_subject ROOT enqueue PATH | process PATH | save VERSION
// While the batch is being carried out, another request comes, for PATH.
#include <cstdio>
#include <exception>
#include <string>

#include "appindex/config.h"
#include "appindex/index_mgr.h"
#include "host/device_root.h"
#include "tests/support/controlled_time.h"
#include "tool/queue_writer.h"

namespace {

void Enqueue(const std::string& path) { tool::AppendToQueue({tool::QueueRequest(1, path)}); }

void Run(const std::string& act, const std::string& argument) {
  if (act == "enqueue") {
    Enqueue(argument);
  } else if (act == "process") {
    test::Time().on_usleep = [&](unsigned) {
      if (test::Time().usleeps.size() == 1) Enqueue(argument);
    };
    velkor::appindex::ProcessQueue();
  } else {
    velkor::appindex::Config config;
    config.indexed_version = argument;
    config.Save();
  }
}

}  // namespace

int main(int argc, char** argv) {
  if (argc < 3) return 2;
  try {
    host::EnterDeviceRoot(argv[1]);
    Run(argv[2], argc > 3 ? argv[3] : "");
    return 0;
  } catch (const std::exception& e) {
    std::fprintf(stderr, "power_cut_subject: %s\n", e.what());
    return 1;
  }
}
