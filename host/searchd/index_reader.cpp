#include "host/searchd/index_reader.h"

#include <utility>

#include "host/searchd/index_directory.h"
#include "host/searchd/storage_error.h"

namespace searchd {
namespace {

// How often a reader starts again because the writer has overtaken it.
constexpr int kAttempts = 5;

}  // namespace

IndexReader::IndexReader(std::string path, const Mapping& mapping, const Language& language,
                         DatabaseCheck& check)
    : path_(std::move(path)), mapping_(mapping), language_(language), check_(check) {}

SearchResult IndexReader::Search(const SearchRequest& request) {
  SearchResult result;
  Read([&](Xapian::Database& database) {
    if (!searcher_) searcher_ = std::make_unique<Searcher>(mapping_, language_);
    result = searcher_->Search(database, request);
  });
  return result;
}

Xapian::doccount IndexReader::DocumentCount() {
  Xapian::doccount count = 0;
  Read([&](Xapian::Database& database) { count = database.get_doccount(); });
  return count;
}

void IndexReader::Refresh(std::set<std::string> new_terms) {
  const std::lock_guard lock(new_terms_mutex_);
  new_terms_.merge(new_terms);
  stale_ = true;
}

void IndexReader::Close() {
  const std::lock_guard lock(mutex_);
  closed_ = true;
  database_.reset();
}

void IndexReader::Read(const std::function<void(Xapian::Database&)>& read) {
  const std::lock_guard lock(mutex_);
  for (int attempt = 1;; ++attempt) {
    try {
      if (!closed_) OpenDatabase();
      if (database_) read(*database_);
      return;
    } catch (const Xapian::DatabaseModifiedError& e) {
      stale_ = true;
      if (attempt == kAttempts) throw StorageError(path_, e);
    } catch (const Xapian::Error& e) {
      database_.reset();
      throw StorageError(path_, e);
    }
  }
}

void IndexReader::LearnNewTerms() {
  const std::lock_guard lock(new_terms_mutex_);
  if (searcher_) searcher_->Update(new_terms_);
  new_terms_.clear();
}

void IndexReader::OpenDatabase() {
  const bool stale = stale_.exchange(false);
  if (stale) LearnNewTerms();
  if (database_) {
    if (stale) database_->reopen();
    return;
  }
  check_.Await();
  if (HoldsDatabase(path_)) {
    database_ = std::make_unique<Xapian::Database>(path_, Xapian::DB_BACKEND_GLASS);
  }
}

}  // namespace searchd
