// Carrying out a plan on a database.
#pragma once

#include <xapian.h>

#include <cstdint>
#include <vector>

#include "host/searchd/plan.h"
#include "host/searchd/postings.h"

namespace searchd {

struct Hit {
  Xapian::docid document = 0;
  double worth = 0;
};

// What documents are worth: a number for each, most of them 0.
class Worths {
 public:
  void Begin(std::size_t documents);  // all worth 0, and their numbers below `documents`
  void Raise(Xapian::docid document, double worth);  // unless it is as high already
  void Add(Xapian::docid document, double worth);
  void Clear();

  double Of(Xapian::docid document) const { return worths_[document]; }
  const std::vector<Xapian::docid>& Documents() const { return documents_; }  // that are worth > 0

 private:
  double& At(Xapian::docid document);

  std::vector<double> worths_;
  std::vector<Xapian::docid> documents_;
};

// What a Matcher notes down by document. To keep it from one search to the next spares each the
// time to make room for all documents of an index.
struct MatcherNotes {
  Worths plan;
  Worths reading;
  Worths clause;
  std::vector<std::uint32_t> met;  // how many of the reading's required clauses
};

// Goes through the plan term by term and keeps what documents are worth so far: the ways to find a
// text are many, the documents that hold it few. What is read from the database stays with the
// object, for a plan that goes on where one has found nothing. Throws what Xapian throws.
class Matcher {
 public:
  // One Matcher at a time has the notes.
  Matcher(const Xapian::Database& database, MatcherNotes& notes);

  // All documents that the plan finds, in no order.
  std::vector<Hit> Find(const Plan& plan);

 private:
  void RaiseByWays(Worths& best, const std::vector<Way>& ways, bool (*counts)(Role role));
  void RaiseByWay(Worths& best, const Way& way);
  std::vector<Hit> FindAll(const std::vector<Match>& matches);
  void RaiseByView(const View& view);
  std::vector<Hit> TakeHits();

  PostingReader postings_;
  MatcherNotes& notes_;
};

// Up to `count` of the hits: the best first, and where they are worth the same, in the order that
// documents have.
std::vector<Hit> FirstOf(const Xapian::Database& database, std::vector<Hit> hits,
                         std::size_t count);

}  // namespace searchd
