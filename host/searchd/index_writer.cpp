#include "host/searchd/index_writer.h"

#include <utility>

#include "host/searchd/document.h"
#include "host/searchd/index_directory.h"
#include "host/searchd/request_error.h"
#include "host/searchd/storage_error.h"
#include "host/searchd/terms.h"
#include "host/searchd/vocabulary.h"

namespace searchd {
namespace {

constexpr std::size_t kManyQueued = 16;
constexpr std::size_t kMaxQueued = 64;
constexpr std::size_t kMaxQueuedBytes = 8 * 1024 * 1024;
constexpr std::size_t kUsualBytes = std::size_t{16} * 1024;  // few changes are larger

}  // namespace

IndexWriter::IndexWriter(std::string path, const Mapping& mapping, const Language& language,
                         DatabaseCheck& check, std::atomic<int>& crowded)
    : path_(std::move(path)),
      mapping_(mapping),
      language_(language),
      check_(check),
      crowded_writers_(crowded) {}

bool IndexWriter::Queue(Change change) {
  check_.ThrowIfDamaged();
  if (IsFull(change.bytes)) {
    const std::lock_guard lock(write_mutex_);
    ApplyQueuedLocked();
  }
  const std::lock_guard lock(queue_mutex_);
  ThrowFailure();
  queued_bytes_ += change.bytes;
  queue_.push_back(std::move(change));
  queued_ = true;
  SetCrowded(IsFullLocked(kUsualBytes));
  busy_ = false;
  return queue_.size() >= kManyQueued;
}

void IndexWriter::ApplyQueued() {
  // Whoever holds the lock looks at the queue again after letting go of it.
  while (queued_ && !busy_) {
    const std::unique_lock lock(write_mutex_, std::try_to_lock);
    if (!lock) return;
    try {
      ApplyQueuedLocked();
    } catch (const RequestError&) {  // the next change or commit tries again
    }
  }
}

void IndexWriter::DoWork() {
  ApplyQueued();
  {
    const std::unique_lock lock(write_mutex_, std::try_to_lock);
    if (!lock || !unflushed_) return;
    unflushed_ = false;
    try {
      Flush();
    } catch (const Xapian::Error& e) {
      Drop(StorageError(path_, e).what());
    } catch (const std::exception& e) {
      Drop(e.what());
    }
  }
  ApplyQueued();
}

std::optional<std::set<std::string>> IndexWriter::Commit() {
  std::optional<std::set<std::string>> new_terms;
  {
    const std::lock_guard lock(write_mutex_);
    check_.Await();
    ApplyQueuedLocked();
    {
      const std::lock_guard queue_lock(queue_mutex_);
      ThrowFailure();
    }
    if (in_transaction_) {
      CommitLocked();
      new_terms = std::exchange(new_terms_, {});
    }
    ReopenLocked();
  }
  ApplyQueued();
  return new_terms;
}

void IndexWriter::Reopen() {
  const std::lock_guard lock(write_mutex_);
  reopen_ = true;
  ReopenLocked();
}

void IndexWriter::Close() {
  const std::lock_guard lock(write_mutex_);
  closed_ = true;
  TakeQueue();
  LetGo();
}

bool IndexWriter::IsFull(std::size_t more_bytes) {
  const std::lock_guard lock(queue_mutex_);
  return IsFullLocked(more_bytes);
}

bool IndexWriter::IsFullLocked(std::size_t more_bytes) const {
  return queue_.size() >= kMaxQueued ||
         (!queue_.empty() && queued_bytes_ + more_bytes > kMaxQueuedBytes);
}

void IndexWriter::SetCrowded(bool crowded) {
  if (std::exchange(is_crowded_, crowded) != crowded) crowded_writers_ += crowded ? 1 : -1;
}

std::deque<Change> IndexWriter::TakeQueue() {
  const std::lock_guard lock(queue_mutex_);
  queued_ = false;
  SetCrowded(false);
  queued_bytes_ = 0;
  return std::exchange(queue_, {});
}

void IndexWriter::ThrowFailure() {
  if (!failure_) return;
  const std::string failure = *std::exchange(failure_, std::nullopt);
  throw RequestError(Code::kStorage, failure);
}

// Throws RequestError(kBusy) when another process holds the index.
void IndexWriter::ApplyQueuedLocked() {
  while (queued_ && !closed_) {
    try {
      const DatabaseCheck::Writing writing(check_);
      OpenDatabase(writing.Generation());
      for (const Change& change : TakeQueue()) Apply(change);
    } catch (const Xapian::DatabaseLockError& e) {
      busy_ = true;
      throw StorageError(path_, e);
    } catch (const Xapian::Error& e) {
      Drop(StorageError(path_, e).what());
    } catch (const std::exception& e) {
      Drop(e.what());
    }
  }
}

void IndexWriter::Apply(const Change& change) {
  const std::string key = KeyTerm(change.document_id);
  if (change.document) {
    const Xapian::Document document =
        BuildDocument(mapping_, *analyzer_, change.document_id, *change.document);
    database_->replace_document(key, document);
    AddWordsAndTitles(new_terms_, document);
  } else {
    database_->delete_document(key);
  }
  unflushed_ = true;
}

void IndexWriter::Flush() {
  const DatabaseCheck::Writing writing(check_);
  RenewDatabase(writing.Generation());
  // Listing the terms makes Xapian merge the changes that it keeps in memory.
  if (database_) database_->allterms_begin();
}

void IndexWriter::CommitLocked() {
  try {
    const DatabaseCheck::Writing writing(check_);
    RenewDatabase(writing.Generation());
    database_->commit_transaction();
    in_transaction_ = false;
    unflushed_ = false;
    SyncIndexDirectory(path_, std::exchange(created_, false));
  } catch (const Xapian::Error& e) {
    LetGo();
    throw StorageError(path_, e);
  } catch (const RequestError&) {
    LetGo();
    throw;
  }
}

// All changes up to a commit are one transaction: without it Xapian would commit by itself now and
// then.
void IndexWriter::OpenDatabase(unsigned generation) {
  RenewDatabase(generation);
  if (!analyzer_) analyzer_ = std::make_unique<Analyzer>(language_);
  if (!database_) {
    const int how = HoldsDatabase(path_) ? Xapian::DB_OPEN : Xapian::DB_CREATE_OR_OPEN;
    database_ = std::make_unique<Xapian::WritableDatabase>(path_, how | Xapian::DB_BACKEND_GLASS);
    created_ = how != Xapian::DB_OPEN;
  }
  if (!in_transaction_) database_->begin_transaction();
  in_transaction_ = true;
}

// Lets go of files that are not those of the index any more.
void IndexWriter::RenewDatabase(unsigned generation) {
  if (std::exchange(generation_, generation) == generation || !database_) return;
  const bool changed = in_transaction_;
  LetGo();
  if (changed) {
    throw RequestError(Code::kStorage, path_ + ": somebody else has changed the files");
  }
}

void IndexWriter::ReopenLocked() {
  if (!reopen_ || in_transaction_ || closed_) return;
  reopen_ = false;
  LetGo();
  check_.Renew();
}

void IndexWriter::Drop(const std::string& cause) {
  LetGo();
  TakeQueue();
  const std::lock_guard lock(queue_mutex_);
  failure_ = "uncommitted changes were lost: " + cause;
}

void IndexWriter::LetGo() {
  database_.reset();
  in_transaction_ = false;
  unflushed_ = false;
  new_terms_.clear();
}

}  // namespace searchd
