// In which documents the matches of a plan stand.
#pragma once

#include <xapian.h>

#include <string>
#include <unordered_map>
#include <vector>

#include "host/searchd/plan.h"

namespace searchd {

// A document that holds a match, and how often.
struct Posting {
  Xapian::docid document;
  Xapian::termcount count;
};

// Reads each match once, however many ways to find a text name it, and keeps it. Throws what Xapian
// throws.
class PostingReader {
 public:
  explicit PostingReader(const Xapian::Database& database);

  // By document. The reference stays valid as long as the object.
  const std::vector<Posting>& Read(const Match& match);

 private:
  void ReadTerm(const std::string& term, std::vector<Posting>& postings) const;
  void ReadBeginning(const std::string& beginning, std::vector<Posting>& postings);

  const Xapian::Database& database_;
  std::unordered_map<std::string, std::vector<Posting>> terms_;
  std::unordered_map<std::string, std::vector<Posting>> beginnings_;
  std::vector<Xapian::termcount> counts_;  // by document, all 0 between two uses
};

}  // namespace searchd
