// What waits in the work queue.
#pragma once

#include <json/value.h>

#include <ctime>
#include <string>
#include <vector>

#include "appindex/index_queue_internal.h"
#include "tool/trial.h"

namespace tool {

// A file of requests: the queue itself, or the batch that was taken from it and is not done.
struct RequestFile {
  enum State { kMissing, kReadable, kUnreadable };

  std::string path;
  State state = kMissing;
  std::string cause;                 // why it is unreadable
  std::size_t lines = 0;             // that are not empty
  std::time_t written = 0;           // when the last line was
  long long age = 0;                 // seconds since then
  velkor::appindex::Batch requests;  // folded, in the order in which they are carried out
};

// Looks at a file of requests as it is now, without its lock. Changes and logs nothing.
RequestFile ReadRequestFile(const std::string& path);

// "add", "del", "reindex", or "none" for a number that means nothing.
const char* NameOfOperation(int op);

// What the next ProcessQueue does.
struct Step {
  const RequestFile* from;
  int op;
  std::string path;
  Problem problem;  // as far as can be told
};

// The steps of the batch, then those of the queue.
std::vector<Step> Order(const RequestFile& batch, const RequestFile& queue);

}  // namespace tool
