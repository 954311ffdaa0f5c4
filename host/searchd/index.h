// One index: what it is and what can be done with it.
#pragma once

#include <json/value.h>

#include <atomic>
#include <memory>
#include <mutex>
#include <string>

#include "host/searchd/database_check.h"
#include "host/searchd/index_reader.h"
#include "host/searchd/index_writer.h"
#include "host/searchd/language.h"
#include "host/searchd/mapping.h"

namespace searchd {

// What index_create was given and the registry keeps.
struct IndexDefinition {
  std::string id;
  std::string path;      // as CheckedIndexPath returns it
  Json::Value mappings;  // accepted by Mapping::Parse
};

// Any thread may call. Searches see committed changes alone. After Close every call throws
// RequestError(kNoSuchIndex).
class Index {
 public:
  // `crowded` counts the indexes in which the next change is likely to wait until others have taken
  // place. It and `process` must outlive the object.
  Index(IndexDefinition definition, CheckProcess& process, DatabaseCheck::Files files,
        std::atomic<int>& crowded);

  const IndexDefinition& Definition() const { return definition_; }

  // Accepts a change; it takes place with ApplyChanges or DoWork, at the latest with Commit.
  // `bytes` is the size of the request. Returns whether to call ApplyChanges soon, because many
  // changes wait.
  bool Upsert(const std::string& document_id, Json::Value document, std::size_t bytes);
  bool Delete(const std::string& document_id);
  void ApplyChanges();
  void Commit();

  // Whether there is work that later requests need not do if it is done before, and doing it.
  bool HasWork() const;
  void DoWork();

  SearchResult Search(const SearchRequest& request);
  Xapian::doccount DocumentCount();

  // Lets go of the files and has them checked before they are opened again. What was not committed
  // is kept, unless somebody else has changed the files.
  void Reopen();

  // Drops what was not committed and lets go of the files.
  void Close();

 private:
  void CheckOpen() const;
  IndexWriter& Writer();
  std::shared_ptr<IndexReader> Reader();

  const IndexDefinition definition_;
  const Mapping mapping_;
  DatabaseCheck check_;
  IndexWriter writer_;
  std::mutex reader_mutex_;  // guards what follows
  std::shared_ptr<IndexReader> reader_;
  unsigned reader_generation_ = 0;  // of the files that it reads
  std::atomic<bool> closed_ = false;
};

}  // namespace searchd
