// The service that keeps the index: works the queue, or rebuilds everything.
#include <appindex/index_mgr.h>

#include "program.h"

int main(int argc, char** argv) {
  CLI::App app("Keeps the search index of the installed applications", "indexer");
  app.require_subcommand(1);
  const CLI::App* queue =
      app.add_subcommand("process-queue", "Carry out what other programs have queued");
  app.add_subcommand("reindex", "Rebuild the index of every application");
  app.fallthrough();
  return example::Run(app, argc, argv, [&] {
    if (queue->parsed()) {
      velkor::appindex::ProcessQueue();
    } else {
      velkor::appindex::Reindex();
    }
  });
}
