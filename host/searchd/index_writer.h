// Writing one index. Changes are queued, applied when there is time and durable with Commit.
#pragma once

#include <json/value.h>
#include <xapian.h>

#include <atomic>
#include <deque>
#include <memory>
#include <mutex>
#include <optional>
#include <set>
#include <string>

#include "host/searchd/analyzer.h"
#include "host/searchd/database_check.h"
#include "host/searchd/mapping.h"

namespace searchd {

struct Change {
  std::string document_id;
  std::optional<Json::Value> document;  // accepted by CheckDocument; none: delete
  std::size_t bytes = 0;                // about how much memory it holds while it waits
};

// Any thread may call. What was not committed is dropped with the object.
//
// A change is answered for before it is applied, so that a client that pauses between changes does
// not wait for the work. If applying it fails, all uncommitted changes are lost, and the next Queue
// or Commit reports that by throwing RequestError, once. While another process holds the index
// nothing is lost: changes wait, and Commit, and Queue when many wait, throw RequestError(kBusy).
class IndexWriter {
 public:
  // `crowded` counts the writers whose next Queue is likely to apply what waits.
  IndexWriter(std::string path, const Mapping& mapping, const Language& language,
              DatabaseCheck& check, std::atomic<int>& crowded);

  // Returns whether so much is waiting that it should be applied soon. Applies at once when it is
  // so much that clients have to be held back.
  bool Queue(Change change);

  // Applies what is queued, unless another thread is at it.
  void ApplyQueued();

  // Whether Commit would find work that can be done beforehand, and doing it: applying what is
  // queued and bringing it on its way to the files.
  bool HasWork() const { return (queued_ && !busy_) || unflushed_; }
  void DoWork();

  // Applies what is queued and makes all changes durable. If there were any, returns the words and
  // titles that they brought.
  std::optional<std::set<std::string>> Commit();

  // Lets go of the files and has them checked before they are opened again; if there are
  // uncommitted changes, as soon as they are committed.
  void Reopen();

  // Drops what was not committed and lets go of the files; later calls do nothing.
  void Close();

 private:
  bool IsFull(std::size_t more_bytes);
  bool IsFullLocked(std::size_t more_bytes) const;
  void SetCrowded(bool crowded);
  std::deque<Change> TakeQueue();
  void ThrowFailure();
  void ApplyQueuedLocked();
  void Apply(const Change& change);
  void Flush();
  void CommitLocked();
  void OpenDatabase(unsigned generation);
  void RenewDatabase(unsigned generation);
  void ReopenLocked();
  void Drop(const std::string& cause);
  void LetGo();

  const std::string path_;
  const Mapping& mapping_;
  const Language language_;
  DatabaseCheck& check_;
  std::atomic<int>& crowded_writers_;

  std::mutex queue_mutex_;
  std::deque<Change> queue_;
  std::size_t queued_bytes_ = 0;
  bool is_crowded_ = false;
  std::optional<std::string> failure_;

  std::mutex write_mutex_;  // taken before queue_mutex_ where both are needed
  std::unique_ptr<Analyzer> analyzer_;
  std::unique_ptr<Xapian::WritableDatabase> database_;
  unsigned generation_ = 0;  // of the files that are open
  bool reopen_ = false;
  bool created_ = false;  // by this object, and nothing committed since
  bool in_transaction_ = false;
  std::set<std::string> new_terms_;  // words and titles that it brings
  bool closed_ = false;
  std::atomic<bool> queued_ = false;
  std::atomic<bool> busy_ = false;  // another process held the index at the last attempt
  std::atomic<bool> unflushed_ = false;
};

}  // namespace searchd
