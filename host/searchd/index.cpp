#include "host/searchd/index.h"

#include <optional>
#include <set>
#include <string>
#include <utility>

#include "host/searchd/document.h"
#include "host/searchd/request_error.h"

namespace searchd {

Index::Index(IndexDefinition definition, CheckProcess& process, DatabaseCheck::Files files,
             std::atomic<int>& crowded)
    : definition_(std::move(definition)),
      mapping_(Mapping::Parse(definition_.mappings)),
      check_(definition_.path, process, files),
      writer_(definition_.path, mapping_, LanguageOfIndex(definition_.id), check_, crowded) {}

bool Index::Upsert(const std::string& document_id, Json::Value document, std::size_t bytes) {
  CheckDocument(mapping_, document_id, document);
  return Writer().Queue({document_id, std::move(document), bytes});
}

bool Index::Delete(const std::string& document_id) { return Writer().Queue({document_id, {}, 0}); }

void Index::ApplyChanges() { writer_.ApplyQueued(); }

void Index::Commit() {
  std::optional<std::set<std::string>> new_terms = Writer().Commit();
  if (!new_terms) return;
  const std::lock_guard lock(reader_mutex_);
  if (reader_) reader_->Refresh(std::move(*new_terms));
}

bool Index::HasWork() const { return writer_.HasWork(); }

void Index::DoWork() { writer_.DoWork(); }

SearchResult Index::Search(const SearchRequest& request) { return Reader()->Search(request); }

Xapian::doccount Index::DocumentCount() { return Reader()->DocumentCount(); }

void Index::Reopen() { writer_.Reopen(); }

void Index::Close() {
  closed_ = true;
  writer_.Close();
  const std::lock_guard lock(reader_mutex_);
  if (reader_) reader_->Close();
}

IndexWriter& Index::Writer() {
  CheckOpen();
  return writer_;
}

// A reader of its own for each time that the files have to be opened again.
std::shared_ptr<IndexReader> Index::Reader() {
  CheckOpen();
  const unsigned generation = check_.Await();
  const std::lock_guard lock(reader_mutex_);
  if (!reader_ || std::exchange(reader_generation_, generation) != generation) {
    reader_ = std::make_shared<IndexReader>(definition_.path, mapping_,
                                            LanguageOfIndex(definition_.id), check_);
  }
  return reader_;
}

void Index::CheckOpen() const {
  if (closed_) throw RequestError(Code::kNoSuchIndex, "no such index: " + definition_.id);
}

}  // namespace searchd
