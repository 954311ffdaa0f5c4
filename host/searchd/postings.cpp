#include "host/searchd/postings.h"

#include <algorithm>

namespace searchd {

PostingReader::PostingReader(const Xapian::Database& database) : database_(database) {}

const std::vector<Posting>& PostingReader::Read(const Match& match) {
  auto& known = match.beginning ? beginnings_ : terms_;
  const auto [entry, is_new] = known.try_emplace(match.term);
  if (!is_new) return entry->second;
  if (match.beginning) {
    ReadBeginning(match.term, entry->second);
  } else {
    ReadTerm(match.term, entry->second);
  }
  return entry->second;
}

void PostingReader::ReadTerm(const std::string& term, std::vector<Posting>& postings) const {
  for (auto it = database_.postlist_begin(term); it != database_.postlist_end(term); ++it) {
    postings.push_back({*it, it.get_wdf()});
  }
}

void PostingReader::ReadBeginning(const std::string& beginning, std::vector<Posting>& postings) {
  std::vector<Posting> found;
  std::size_t terms = 0;
  for (auto term = database_.allterms_begin(beginning); term != database_.allterms_end(beginning);
       ++term, ++terms) {
    ReadTerm(*term, found);
  }
  if (terms <= 1) {
    postings.swap(found);
    return;
  }
  // One for each document: a document may hold several of the terms.
  counts_.resize(database_.get_lastdocid() + 1);
  for (const Posting& posting : found) {
    // 1 more than there are, since 0 says that the document has not been seen.
    Xapian::termcount& count = counts_[posting.document];
    if (count == 0) postings.push_back({posting.document, count++});
    count += posting.count;
  }
  std::sort(postings.begin(), postings.end(),
            [](const Posting& a, const Posting& b) { return a.document < b.document; });
  for (Posting& posting : postings) {
    posting.count = counts_[posting.document] - 1;
    counts_[posting.document] = 0;
  }
}

}  // namespace searchd
