#include "host/searchd/index.h"

#include <utility>

#include "host/searchd/document.h"
#include "host/searchd/request_error.h"

namespace searchd {

Index::Index(IndexDefinition definition, std::unique_ptr<DatabaseCheck> check)
    : definition_(std::move(definition)),
      mapping_(Mapping::Parse(definition_.mappings)),
      check_(std::move(check)),
      writer_(definition_.path, mapping_, LanguageOfIndex(definition_.id), *check_),
      reader_(definition_.path, mapping_, LanguageOfIndex(definition_.id), *check_) {}

bool Index::Upsert(const std::string& document_id, Json::Value document, std::size_t bytes) {
  CheckDocument(mapping_, document_id, document);
  return Writer().Queue({document_id, std::move(document), bytes});
}

bool Index::Delete(const std::string& document_id) { return Writer().Queue({document_id, {}, 0}); }

void Index::ApplyChanges() { writer_.ApplyQueued(); }

void Index::Commit() {
  if (Writer().Commit()) reader_.Refresh();
}

bool Index::HasWork() const { return writer_.HasWork(); }

void Index::DoWork() { writer_.DoWork(); }

SearchResult Index::Search(const std::string& query, unsigned offset, unsigned limit) {
  return Reader().Search(query, offset, limit);
}

Xapian::doccount Index::DocumentCount() { return Reader().DocumentCount(); }

void Index::Close() {
  closed_ = true;
  writer_.Close();
  reader_.Close();
}

IndexWriter& Index::Writer() {
  CheckOpen();
  return writer_;
}

IndexReader& Index::Reader() {
  CheckOpen();
  return reader_;
}

void Index::CheckOpen() const {
  if (closed_) throw RequestError(Code::kNoSuchIndex, "no such index: " + definition_.id);
}

}  // namespace searchd
