#include "tool/queue_state.h"

#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <ctime>
#include <limits>
#include <sstream>

#include "appindex/error.h"
#include "appindex/utilities/file_utils.h"
#include "common/check.h"
#include "common/file_io.h"
#include "tool/failure.h"

namespace tool {
namespace {

namespace index = velkor::appindex;

std::size_t CountLines(const std::string& text) {
  std::istringstream stream(text);
  std::string line;
  std::size_t lines = 0;
  while (std::getline(stream, line)) lines += line.empty() ? 0 : 1;
  return lines;
}

// When the file was last written: moving it aside as a batch changes nothing of that.
std::time_t Written(const std::string& path, std::time_t now) {
  struct stat status {};
  return stat(path.c_str(), &status) == 0 ? std::min(status.st_mtime, now) : now;
}

void AppendSteps(std::vector<Step>& steps, Trial& trial, const RequestFile& file) {
  for (const auto& [path, op] : file.requests) {
    steps.push_back({&file, op, path, trial.ProblemOf(op, path)});
  }
}

}  // namespace

RequestFile ReadRequestFile(const std::string& path) {
  RequestFile file;
  file.path = path;
  std::string text;
  if (!velkor::ReadRegularFile(path, std::numeric_limits<std::size_t>::max(), text)) {
    if (errno == ENOENT) return file;
    file.state = RequestFile::kUnreadable;
    file.cause = WhyNotRead(errno);
    return file;
  }
  file.state = RequestFile::kReadable;
  file.lines = CountLines(text);
  const std::time_t now = std::time(nullptr);
  file.written = Written(path, now);
  file.age = now - file.written;
  try {
    const velkor::MutedLog muted;
    file.requests = index::ReadBatch(path);
  } catch (const velkor::Error&) {
    file = RequestFile();  // it was moved or done with in this moment
    file.path = path;
  }
  return file;
}

const char* NameOfOperation(int op) {
  switch (op) {
    case index::kAdd:
      return "add";
    case index::kDel:
      return "del";
    case index::kReindex:
      return "reindex";
    default:
      return "none";
  }
}

std::vector<Step> Order(const RequestFile& batch, const RequestFile& queue) {
  std::vector<Step> steps;
  Trial trial;
  AppendSteps(steps, trial, batch);
  AppendSteps(steps, trial, queue);
  return steps;
}

}  // namespace tool
