// The calls that change the index: add, del, reindex and process-queue.
#include <json/value.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <chrono>
#include <cstdio>
#include <exception>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "appindex/elastic_control_internal.h"
#include "appindex/error.h"
#include "appindex/index_mgr.h"
#include "appindex/index_queue_internal.h"
#include "appindex/utilities/file_utils.h"
#include "common/check.h"
#include "tool/context.h"
#include "tool/descriptor_path.h"
#include "tool/failure.h"
#include "tool/interrupt.h"
#include "tool/output.h"
#include "tool/progress.h"
#include "tool/refusal.h"
#include "tool/trial.h"

namespace tool {
namespace {

namespace index = velkor::appindex;
using Clock = std::chrono::steady_clock;
using velkor::Error;

// What a change of the index came to.
struct Work {
  std::size_t documents = 0;
  std::size_t requests = 0;
  std::chrono::milliseconds time{0};
};

bool IsAboutDescriptors(const std::exception& exception) {
  const auto* error = dynamic_cast<const Error*>(&exception);
  return error == nullptr || error->code == Error::kJsonError ||
         error->code == Error::kGeneralError || error->code == kRejected;
}

// Runs `call`. Of a failure that a descriptor is to blame for it says which one, as `culprit` finds
// out: the library's reason does not name it.
Work Run(const Context& context, const std::function<void()>& call,
         const std::function<std::string()>& culprit) {
  ProgressLine progress(!context.quiet && IsTerminal(STDERR_FILENO));
  const Clock::time_point begun = Clock::now();
  try {
    call();
  } catch (const std::exception& exception) {
    const std::string found = IsAboutDescriptors(exception) ? culprit() : "";
    if (found.empty()) throw;
    const Report report = Explain(exception);
    throw Failure(found, report.exit_code, report.code);
  }
  return {progress.documents(), progress.requests(),
          std::chrono::duration_cast<std::chrono::milliseconds>(Clock::now() - begun)};
}

// "21 documents in 0.3 s"
std::string Sum(const Work& work) {
  char seconds[32];
  std::snprintf(seconds, sizeof(seconds), "%.1f s", static_cast<double>(work.time.count()) / 1000);
  return Counted(work.documents, "document") + " in " + seconds;
}

Json::Value ToJson(const Work& work) {
  Json::Value value;
  value["documents"] = Json::UInt64(work.documents);
  value["milliseconds"] = Json::Int64(work.time.count());
  return value;
}

struct Change {
  index::Operation operation;
  void (*call)(const std::string& conf_path, bool commit);
  const char* done;  // what the remark begins with
  const char* interrupted;
};

constexpr Change kAddition = {index::kAdd, index::Add, "Wrote ",
                              "a part of the documents is written: run the same command again"};
constexpr Change kDeletion = {index::kDel, index::Del, "Deleted ",
                              "a part of the documents is deleted: run the same command again"};

void Carry(const Context& context, const Change& change,
           const std::vector<std::string>& arguments) {
  const std::vector<std::string> paths = DescriptorPaths(arguments);
  for (const std::string& path : paths) RequireReadable(path);
  SayWhenInterrupted(change.interrupted);
  Json::Value done(Json::arrayValue);
  for (const std::string& path : paths) {
    const Work work = Run(
        context, [&] { change.call(path, true); },
        [&] {
          const Problem problem = Trial().ProblemOf(change.operation, path);
          return problem.fails ? path + ": " + problem.line : "";
        });
    Remark(context, change.done + Sum(work) + ": " + path);
    done.append(ToJson(work));
    done[done.size() - 1]["path"] = path;
  }
  if (!context.json) return;
  Json::Value value;
  value["descriptors"] = done;
  PrintJson(value);
}

void Rebuild(const Context& context) {
  SayWhenInterrupted("the index is incomplete until `appindex reindex` has run to its end");
  const Work work =
      Run(context, index::Reindex, [] { return Trial().ProblemOf(index::kReindex, "").line; });
  Remark(context, "Rebuilt the index: " + Sum(work));
  if (context.json) PrintJson(ToJson(work));
}

bool IsWorkLeft() {
  return velkor::IsFileExist(index::kQueuePath) || velkor::IsFileExist(index::kBatchPath);
}

bool IsDaemonGone() { return access(index::elastic::kElasticdSockPath, F_OK) != 0; }

// The first request of the batch that cannot be carried out.
std::string CulpritOfBatch() {
  const velkor::MutedLog muted;
  Trial trial;
  try {
    for (const auto& [path, op] : index::ReadBatch(index::kBatchPath)) {
      const Problem problem = trial.ProblemOf(op, path);
      if (!problem.fails) continue;
      return (op == index::kReindex ? "" : path + ": ") + problem.line +
             "; it holds up the whole batch";
    }
  } catch (const Error&) {
    // No batch: the failure that is looked into is another one.
  }
  return "";
}

void WorkQueue(const Context& context) {
  SayWhenInterrupted(
      "no request is lost: the next `appindex process-queue` begins its batch again");
  const Work work = Run(context, index::ProcessQueue, CulpritOfBatch);
  if (IsWorkLeft() && IsDaemonGone()) {
    throw Failure(std::string(index::elastic::kElasticdSockPath) +
                      ": the search daemon is not running, and the requests stay queued",
                  "start tovoelasticd and try again", kDaemonUnreachable,
                  Error::kElasticdRequestError);
  }
  Remark(context, work.requests == 0
                      ? "Nothing was queued"
                      : "Carried out " + Counted(work.requests, "request") + ": " + Sum(work));
  if (!context.json) return;
  Json::Value value = ToJson(work);
  value["requests"] = Json::UInt64(work.requests);
  PrintJson(value);
}

void AddChange(CLI::App& app, Context& context, const char* name, const char* help,
               const Change& change) {
  CLI::App* command = app.add_subcommand(name, help);
  const auto paths = std::make_shared<std::vector<std::string>>();
  command->add_option("PATH", *paths, "Descriptors, or directories that hold one")
      ->required()
      ->type_name("");
  command->callback([&context, &change, paths] { Carry(context, change, *paths); });
}

}  // namespace

void AddIndexCommands(CLI::App& app, Context& context) {
  AddChange(app, context, "add", "Write the documents of applications into the index", kAddition);
  AddChange(app, context, "del", "Delete the documents of applications from the index", kDeletion);
  app.add_subcommand("reindex", "Rebuild the index from every application on the device")
      ->callback([&context] { Rebuild(context); });
  app.add_subcommand("process-queue", "Carry out what is queued")->callback([&context] {
    WorkQueue(context);
  });
}

}  // namespace tool
