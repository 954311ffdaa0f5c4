// A file of queued requests: what it comes to.
#include <json/value.h>

#include <algorithm>
#include <cstddef>
#include <string>

#include "appindex/index_queue_internal.h"
#include "appindex/utilities/json_helpers.h"
#include "fuzz/memory_files.h"
#include "fuzz/target.h"
#include "tool/queue_state.h"

namespace fuzz {
namespace {

using velkor::appindex::Batch;

constexpr char kFile[] = "/queue";

Batch Read(const std::string& text) {
  MemoryFiles()[kFile] = text;
  return velkor::appindex::ReadBatch(kFile);
}

std::string Written(const Batch& batch) {
  std::string text;
  for (const auto& [path, op] : batch) {
    Json::Value request(Json::objectValue);
    request["op"] = op;
    request["path"] = path;
    text += velkor::toString(request) + "\n";
  }
  return text;
}

// What waits longer is overtaken by what came after it.
Batch Merged(Batch older, const Batch& newer) {
  for (const auto& [path, op] : newer) older[path] = op;
  return older;
}

void IsTheSumOfItsParts(const std::string& text, const Batch& batch) {
  const std::size_t cut = std::min(text.find('\n', text.size() / 2), text.size());
  const Batch older = Read(text.substr(0, cut));
  const Batch newer = Read(text.substr(std::min(cut + 1, text.size())));
  Require(Merged(older, newer) == batch, "the last request of each path holds");
}

void IsFoldedForGood(const Batch& batch) {
  const std::string written = Written(batch);
  if (written.find("\xEF\xBF\xBD") != std::string::npos) return;  // a path that is not UTF-8
  Require(Read(written) == batch, "a folded batch folds to itself");
}

}  // namespace

void Try(const std::string& input) {
  const Batch batch = Read(input);
  const auto lines = static_cast<std::size_t>(std::count(input.begin(), input.end(), '\n')) + 1;
  Require(batch.size() <= lines, "a line is one request at most");
  Require(Read(input + "\n" + input) == batch, "requests that are queued again change nothing");
  IsTheSumOfItsParts(input, batch);
  IsFoldedForGood(batch);

  MemoryFiles()[kFile] = input;
  const tool::RequestFile file = tool::ReadRequestFile(kFile);
  Require(file.state == tool::RequestFile::kReadable && file.requests == batch,
          "the status shows what is carried out");
  Require(file.lines >= batch.size(), "the status counts every line");
}

}  // namespace fuzz
