#include "host/searchd/index_writer.h"

#include <utility>

#include "host/searchd/document.h"
#include "host/searchd/index_directory.h"
#include "host/searchd/request_error.h"
#include "host/searchd/storage_error.h"
#include "host/searchd/terms.h"

namespace searchd {
namespace {

constexpr std::size_t kManyQueued = 16;
constexpr std::size_t kMaxQueued = 64;
constexpr std::size_t kMaxQueuedBytes = 8 * 1024 * 1024;

}  // namespace

IndexWriter::IndexWriter(std::string path, const Mapping& mapping, const Language& language,
                         DatabaseCheck& check)
    : path_(std::move(path)), mapping_(mapping), language_(language), check_(check) {}

bool IndexWriter::Queue(Change change) {
  bool many = false;
  bool full = false;
  {
    const std::lock_guard lock(queue_mutex_);
    ThrowFailure();
    queued_bytes_ += change.bytes;
    queue_.push_back(std::move(change));
    queued_ = true;
    many = queue_.size() >= kManyQueued;
    full = queue_.size() >= kMaxQueued || queued_bytes_ >= kMaxQueuedBytes;
  }
  if (!full) return many;
  const std::lock_guard lock(write_mutex_);
  ApplyQueuedLocked();
  return false;
}

void IndexWriter::ApplyQueued() {
  // Whoever holds the lock looks at the queue again after letting go of it.
  while (queued_) {
    const std::unique_lock lock(write_mutex_, std::try_to_lock);
    if (!lock) return;
    ApplyQueuedLocked();
  }
}

void IndexWriter::DoWork() {
  ApplyQueued();
  {
    const std::unique_lock lock(write_mutex_, std::try_to_lock);
    if (!lock || !unflushed_) return;
    unflushed_ = false;
    try {
      // Listing the terms makes Xapian merge the changes that it keeps in memory.
      if (database_) database_->allterms_begin();
    } catch (const Xapian::Error& e) {
      Drop(e.get_description());
    }
  }
  ApplyQueued();
}

bool IndexWriter::Commit() {
  bool changed = false;
  {
    const std::lock_guard lock(write_mutex_);
    ApplyQueuedLocked();
    {
      const std::lock_guard queue_lock(queue_mutex_);
      ThrowFailure();
    }
    changed = in_transaction_;
    if (changed) {
      try {
        database_->commit_transaction();
        in_transaction_ = false;
        unflushed_ = false;
        SyncIndexDirectory(path_, std::exchange(created_, false));
      } catch (const Xapian::Error& e) {
        database_.reset();
        in_transaction_ = false;
        throw StorageError(path_, e);
      }
    }
  }
  ApplyQueued();
  return changed;
}

void IndexWriter::Close() {
  const std::lock_guard lock(write_mutex_);
  closed_ = true;
  ApplyQueuedLocked();
  database_.reset();
  in_transaction_ = false;
  unflushed_ = false;
}

void IndexWriter::ThrowFailure() {
  if (!failure_) return;
  const std::string failure = *std::exchange(failure_, std::nullopt);
  throw RequestError(Code::kStorage, failure);
}

void IndexWriter::ApplyQueuedLocked() {
  for (;;) {
    std::deque<Change> changes;
    {
      const std::lock_guard lock(queue_mutex_);
      changes.swap(queue_);
      queued_ = false;
      queued_bytes_ = 0;
    }
    if (changes.empty() || closed_) return;
    try {
      OpenDatabase();
      for (const Change& change : changes) Apply(change);
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
    database_->replace_document(
        key, BuildDocument(mapping_, *analyzer_, change.document_id, *change.document));
  } else {
    database_->delete_document(key);
  }
  unflushed_ = true;
}

// All changes up to a commit are one transaction: without it Xapian would commit by itself now and
// then.
void IndexWriter::OpenDatabase() {
  if (!analyzer_) analyzer_ = std::make_unique<Analyzer>(language_);
  if (!database_) {
    check_.Await();
    const int how = HoldsDatabase(path_) ? Xapian::DB_OPEN : Xapian::DB_CREATE_OR_OPEN;
    database_ = std::make_unique<Xapian::WritableDatabase>(path_, how | Xapian::DB_BACKEND_GLASS);
    created_ = how != Xapian::DB_OPEN;
  }
  if (!in_transaction_) database_->begin_transaction();
  in_transaction_ = true;
}

void IndexWriter::Drop(const std::string& cause) {
  database_.reset();
  in_transaction_ = false;
  unflushed_ = false;
  const std::lock_guard lock(queue_mutex_);
  failure_ = "uncommitted changes were lost: " + cause;
}

}  // namespace searchd
