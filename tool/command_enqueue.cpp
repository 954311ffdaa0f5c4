// Leaving requests for whoever works the queue.
#include <CLI/CLI.hpp>
#include <memory>
#include <string>
#include <vector>

#include "appindex/index_queue_internal.h"
#include "tool/context.h"
#include "tool/descriptor_path.h"
#include "tool/output.h"
#include "tool/queue_writer.h"

namespace tool {
namespace {

namespace index = velkor::appindex;

void Enqueue(const Context& context, const std::vector<Json::Value>& requests) {
  AppendToQueue(requests);
  Remark(context, "Queued " + Counted(requests.size(), "request") + " in " + index::kQueuePath);
  if (!context.json) return;
  Json::Value value;
  value["requests"] = Json::Value(Json::arrayValue);
  for (const Json::Value& request : requests) value["requests"].append(request);
  PrintJson(value);
}

void AddOperation(CLI::App& enqueue, const Context& context, const char* name, const char* help,
                  index::Operation operation) {
  CLI::App* command = enqueue.add_subcommand(name, help);
  const auto arguments = std::make_shared<std::vector<std::string>>();
  command->add_option("PATH", *arguments, "Descriptors, or directories that hold one")
      ->required()
      ->type_name("");
  command->callback([&context, operation, arguments] {
    std::vector<Json::Value> requests;
    for (const std::string& path : DescriptorPaths(*arguments)) {
      requests.push_back(QueueRequest(operation, path));
    }
    Enqueue(context, requests);
  });
}

}  // namespace

void AddEnqueueCommand(CLI::App& app, Context& context) {
  CLI::App* enqueue = app.add_subcommand("enqueue", "Leave requests in the work queue");
  enqueue->require_subcommand(1);
  AddOperation(*enqueue, context, "add", "Applications were installed", index::kAdd);
  AddOperation(*enqueue, context, "del", "Applications are about to be removed", index::kDel);
  enqueue->add_subcommand("reindex", "Everything is to be rebuilt")->callback([&context] {
    Enqueue(context, {QueueRequest(index::kReindex, "")});
  });
}

}  // namespace tool
