// Internal seam of the work queue: its files, and what a batch of requests comes to.
#pragma once

#include <map>
#include <string>

namespace velkor::appindex {

constexpr char kProcessLockPath[] = "/tmp/velkor_appindex_process.lck";
constexpr char kQueuePath[] = "/var/packages/Velkor/etc/appindex.queue";
constexpr char kBatchPath[] = "/var/packages/Velkor/etc/appindex.queue.tmp";

// The numbers stand in the file.
enum Operation { kAdd = 1, kDel = 2, kReindex = 3 };

// By descriptor path, in the order in which the requests are carried out. A std::map keeps its keys
// in byte order, and the requests without a path, rebuilds as a rule, come first.
using Batch = std::map<std::string, int>;

// Reads a file of requests, a line each, and folds them: the last one for a path holds. A line that
// is no request is skipped, and logged if it is JSON. Throws Error 502, logged, when the file
// cannot be read.
Batch ReadBatch(const std::string& path);

}  // namespace velkor::appindex
