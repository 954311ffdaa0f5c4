// An index in memory, filled and searched as the daemon fills and searches its own.
#pragma once

#include <gtest/gtest.h>
#include <json/value.h>
#include <xapian.h>

#include <set>
#include <string>
#include <vector>

#include "host/searchd/analyzer.h"
#include "host/searchd/document.h"
#include "host/searchd/json_text.h"
#include "host/searchd/mapping.h"
#include "host/searchd/searcher.h"
#include "host/searchd/terms.h"
#include "host/searchd/vocabulary.h"
#include "tests/support/searchd_requests.h"

namespace searchd {

using Strings = std::vector<std::string>;

constexpr unsigned kAllHits = 1000;

// A search's result with its hits as they are read from its text.
struct Found {
  Xapian::doccount total;
  Json::Value hits;
  std::string matched;
  bool cut;
};

class MemoryIndex {
 public:
  explicit MemoryIndex(const std::string& language = "enu",
                       const Json::Value& mappings = test::Mappings())
      : mapping_(Mapping::Parse(mappings)),
        language_(LanguageOfIndex("index_" + language)),
        analyzer_(language_),
        searcher_(mapping_, language_) {}

  // Of a document that the mapping does not accept, the test hears by an exception.
  void Add(const Json::Value& document) {
    const std::string id = document[mapping_.KeyField()].asString();
    CheckDocument(mapping_, id, document);
    const Xapian::Document built = BuildDocument(mapping_, analyzer_, id, document);
    database_.replace_document(KeyTerm(id), built);
    std::set<std::string> new_terms;
    AddWordsAndTitles(new_terms, built);
    searcher_.Update(new_terms);
  }

  void Add(const std::string& id, const std::string& title, const std::string& keywords = "",
           const std::string& desc = "", const std::string& owner = "") {
    Add(test::Document(id, title, desc, keywords, owner));
  }

  Found Search(const std::string& query) { return Search({query, 0, kAllHits, false}); }
  Found Search(const SearchRequest& request) {
    const SearchResult result = searcher_.Search(database_, request);
    return {result.total, ParseJson(result.hits), result.matched, result.cut};
  }

  // The keys of what is found, in order.
  Strings Find(const SearchRequest& request) {
    Strings ids;
    const Found found = Search(request);
    for (const Json::Value& hit : found.hits) {
      ids.push_back(hit[mapping_.KeyField()].asString());
    }
    return ids;
  }
  Strings Find(const std::string& query) { return Find({query, 0, kAllHits, false}); }

  bool Finds(const std::string& query, const std::string& id) {
    for (const std::string& found : Find(query)) {
      if (found == id) return true;
    }
    return false;
  }

  std::string MatchedBy(const std::string& query) { return Search(query).matched; }

  const Mapping& GetMapping() const { return mapping_; }
  const Xapian::Database& Database() const { return database_; }
  Analyzer& GetAnalyzer() { return analyzer_; }

 private:
  const Mapping mapping_;
  const Language language_;
  Analyzer analyzer_;
  Searcher searcher_;
  Xapian::WritableDatabase database_{"", Xapian::DB_BACKEND_INMEMORY};
};

// What stands in the search box while a text is being typed, but for what ends in a space.
inline Strings WhileTyping(const std::string& text) {
  Strings typed;
  for (std::size_t i = 1; i <= text.size(); ++i) {
    const bool inside_character = i < text.size() && (text[i] & 0xC0) == 0x80;
    if (!inside_character && text[i - 1] != ' ') typed.push_back(text.substr(0, i));
  }
  return typed;
}

}  // namespace searchd
