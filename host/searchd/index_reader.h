// Searching one index, in its last committed state.
#pragma once

#include <xapian.h>

#include <atomic>
#include <functional>
#include <memory>
#include <mutex>
#include <set>
#include <string>

#include "host/searchd/database_check.h"
#include "host/searchd/mapping.h"
#include "host/searchd/searcher.h"

namespace searchd {

// Any thread may call. Both queries throw RequestError when the index cannot be read.
class IndexReader {
 public:
  IndexReader(std::string path, const Mapping& mapping, const Language& language,
              DatabaseCheck& check);

  SearchResult Search(const SearchRequest& request);
  Xapian::doccount DocumentCount();

  // Makes the next call look at the files again. The words and titles are those that have been
  // committed since the last time.
  void Refresh(std::set<std::string> new_terms);

  // Lets go of the files; later calls find nothing.
  void Close();

 private:
  // Runs `read` on the open database; does nothing when nothing was ever committed or after Close.
  void Read(const std::function<void(Xapian::Database&)>& read);
  void OpenDatabase();
  void LearnNewTerms();

  const std::string path_;
  const Mapping& mapping_;
  const Language language_;
  DatabaseCheck& check_;

  std::mutex mutex_;
  std::unique_ptr<Searcher> searcher_;
  std::unique_ptr<Xapian::Database> database_;
  bool closed_ = false;
  std::atomic<bool> stale_ = false;

  std::mutex new_terms_mutex_;
  std::set<std::string> new_terms_;
};

}  // namespace searchd
