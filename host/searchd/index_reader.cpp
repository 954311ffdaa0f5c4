#include "host/searchd/index_reader.h"

#include <utility>

#include "host/searchd/document.h"
#include "host/searchd/index_directory.h"
#include "host/searchd/json_text.h"
#include "host/searchd/query.h"
#include "host/searchd/ranking.h"
#include "host/searchd/storage_error.h"

namespace searchd {
namespace {

// How often a reader starts again because the writer has overtaken it.
constexpr int kAttempts = 5;

Json::Value StoredDocument(const std::string& text) {
  try {
    return ParseJson(text);
  } catch (const RequestError& e) {
    throw Xapian::DatabaseCorruptError(std::string("stored document: ") + e.what());
  }
}

Json::Value MakeHit(const Xapian::MSetIterator& match) {
  const Json::Value stored = StoredDocument(match.get_document().get_data());
  Json::Value hit(Json::objectValue);
  for (auto it = stored.begin(); it != stored.end(); ++it) {
    if (IsShownInHits(it.name())) hit[it.name()] = *it;
  }
  hit["score"] = match.get_weight();
  return hit;
}

}  // namespace

IndexReader::IndexReader(std::string path, const Mapping& mapping, const Language& language,
                         DatabaseCheck& check)
    : path_(std::move(path)), mapping_(mapping), language_(language), check_(check) {}

SearchResult IndexReader::Search(const std::string& query, unsigned offset, unsigned limit) {
  SearchResult result;
  Read([&](Xapian::Database& database) {
    result = SearchResult();
    if (!analyzer_) analyzer_ = std::make_unique<Analyzer>(language_);
    const ParsedQuery parsed = ParseQuery(mapping_, *analyzer_, query);
    result.cut = parsed.cut;
    Xapian::Enquire enquire(database);
    enquire.set_query(parsed.query);
    enquire.set_weighting_scheme(WorthWeight());
    enquire.set_sort_by_relevance_then_value(kOrderSlot, false);
    // Looking at all documents makes the total exact.
    const Xapian::MSet matches = enquire.get_mset(offset, limit, database.get_doccount());
    result.total = matches.get_matches_estimated();
    for (auto it = matches.begin(); it != matches.end(); ++it) result.hits.append(MakeHit(it));
  });
  return result;
}

Xapian::doccount IndexReader::DocumentCount() {
  Xapian::doccount count = 0;
  Read([&](Xapian::Database& database) { count = database.get_doccount(); });
  return count;
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

void IndexReader::OpenDatabase() {
  const bool stale = stale_.exchange(false);
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
