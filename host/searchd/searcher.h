// Carrying out a search on an open database.
#pragma once

#include <xapian.h>

#include <memory>
#include <set>
#include <string>
#include <vector>

#include "host/searchd/analyzer.h"
#include "host/searchd/mapping.h"
#include "host/searchd/matcher.h"
#include "host/searchd/planner.h"
#include "host/searchd/vocabulary.h"

namespace searchd {

struct SearchRequest {
  std::string query;
  unsigned offset = 0;
  unsigned limit = 0;
  bool explain = false;
};

struct SearchResult {
  Xapian::doccount total = 0;
  std::string hits = "[]";  // a JSON text
  std::string matched;      // by which step the hits were found; empty without hits
  bool cut = false;         // the query was longer than is looked at
};

// One thread at a time. Throws what Xapian throws.
class Searcher {
 public:
  Searcher(const Mapping& mapping, const Language& language);

  SearchResult Search(const Xapian::Database& database, const SearchRequest& request);

  // To be called when the database is in another state than before, with the words and titles of
  // the documents that were written since.
  void Update(const std::set<std::string>& new_terms);

 private:
  std::vector<Hit> FindByAnyStep(const Xapian::Database& database, Plan& plan);

  Analyzer analyzer_;
  std::vector<Field> fields_;
  bool knows_fields_ = false;
  MatcherNotes notes_;
  std::unique_ptr<Vocabulary> vocabulary_;  // read when first needed
};

}  // namespace searchd
