// The state of everything around the index, gathered and shown.
#pragma once

#include <json/value.h>

#include <map>
#include <string>
#include <vector>

#include "tool/queue_locks.h"
#include "tool/queue_state.h"

namespace tool {

struct Version {
  std::string recorded;  // empty: the index was never rebuilt
  std::string current;
  std::string problem;  // why one of them is not known; empty: both are
  bool Differs() const { return problem.empty() && recorded != current; }
};

struct Index {
  enum State { kWhole, kMissing, kDamaged };
  State state = kMissing;
  unsigned long long documents = 0;
  std::string damage;
};

struct Status {
  std::string daemon_problem;   // empty: the search daemon answers
  bool daemon_refuses = false;  // it does, but does not say what indexes there are
  int daemon_code = 0;          // of its refusal
  RequestFile batch;
  RequestFile queue;
  std::vector<Step> order;  // points to `batch` and `queue`
  std::vector<Lock> locks;
  Version version;
  std::map<std::string, Index> indexes;  // by language; empty when the daemon does not answer

  // The first request of the file that will fail, for which all of them wait; null: none is known.
  const Step* FirstFailing(const RequestFile& file) const;

  // Whether a process works the queue.
  bool IsWorked() const;

  // Whether something is in the way of those who would work the queue, before they look at a
  // request.
  bool IsLockedOut() const;

  // How whoever works the queue waits for the search daemon: it does if the daemon is not ready or
  // busy, and may while a batch is worked. Empty when it does not.
  std::string Waiting() const;

  // Whether there are as many documents in each language, as there are when nothing was
  // interrupted; nothing is known of it without `indexes`.
  bool IsEven() const;

  Status() = default;
  Status(const Status&) = delete;
  Status& operator=(const Status&) = delete;
};

// Fills `status` with what is so now. Never fails for what it finds.
void Gather(Status& status, int proc);

Json::Value ToJson(const Status& status);

// For a reader, in at most 80 columns but for long paths.
std::string ToText(const Status& status);

}  // namespace tool
