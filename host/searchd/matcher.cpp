#include "host/searchd/matcher.h"

#include <algorithm>
#include <string>
#include <utility>

#include "host/searchd/document.h"
#include "host/searchd/terms.h"

namespace searchd {

void Worths::Begin(std::size_t documents) {
  Clear();
  worths_.resize(documents);
}

double& Worths::At(Xapian::docid document) {
  double& worth = worths_[document];
  if (worth == 0) documents_.push_back(document);
  return worth;
}

void Worths::Raise(Xapian::docid document, double worth) {
  double& kept = At(document);
  kept = std::max(kept, worth);
}

void Worths::Add(Xapian::docid document, double worth) { At(document) += worth; }

void Worths::Clear() {
  for (const Xapian::docid document : documents_) worths_[document] = 0;
  documents_.clear();
}

Matcher::Matcher(const Xapian::Database& database, MatcherNotes& notes)
    : postings_(database), notes_(notes) {
  const std::size_t documents = std::size_t{database.get_lastdocid()} + 1;
  for (Worths* worths : {&notes.plan, &notes.reading, &notes.clause}) worths->Begin(documents);
  notes.met.assign(documents, 0);
}

std::vector<Hit> Matcher::Find(const Plan& plan) {
  RaiseByWays(notes_.plan, plan.whole, IsAny);
  for (const View& view : ViewsOf(plan)) RaiseByView(view);
  return TakeHits();
}

std::vector<Hit> Matcher::TakeHits() {
  Worths& worths = notes_.plan;
  for (const Posting& application : postings_.Read({kApplicationTerm})) {
    if (worths.Of(application.document) > 0) worths.Add(application.document, kApplicationWorth);
  }
  std::vector<Hit> hits;
  hits.reserve(worths.Documents().size());
  for (const Xapian::docid document : worths.Documents()) {
    hits.push_back({document, worths.Of(document)});
  }
  worths.Clear();
  return hits;
}

// Raises the worth of documents in which required clauses are all met and any clause is.
void Matcher::RaiseByView(const View& view) {
  auto& [plan, reading, clause_worths, met] = notes_;
  for (const Xapian::docid document : reading.Documents()) met[document] = 0;
  reading.Clear();
  std::uint32_t required = 0;
  for (const Clause& clause : *view.reading) {
    clause_worths.Clear();
    RaiseByWays(clause_worths, clause.ways, view.counts);
    if (!clause.optional && clause_worths.Documents().empty()) return;
    if (!clause.optional) ++required;
    for (const Xapian::docid document : clause_worths.Documents()) {
      reading.Add(document, clause_worths.Of(document));
      if (!clause.optional) ++met[document];
    }
  }
  const double factor = view.factor / static_cast<double>(view.reading->size());
  for (const Xapian::docid document : reading.Documents()) {
    if (met[document] == required) plan.Raise(document, factor * reading.Of(document));
  }
}

void Matcher::RaiseByWays(Worths& best, const std::vector<Way>& ways, bool (*counts)(Role role)) {
  for (const Way& way : ways) {
    if (counts(way.role)) RaiseByWay(best, way);
  }
}

void Matcher::RaiseByWay(Worths& best, const Way& way) {
  if (way.matches.size() == 1) {
    for (const Posting& posting : postings_.Read(way.matches.front())) {
      best.Raise(posting.document, way.worth * RepetitionFactor(posting.count));
    }
    return;
  }
  const double worth = way.worth / static_cast<double>(way.matches.size());
  for (const Hit& hit : FindAll(way.matches)) best.Raise(hit.document, worth * hit.worth);
}

// The documents that hold the first match, and of these those that hold the others too.
std::vector<Hit> Matcher::FindAll(const std::vector<Match>& matches) {
  std::vector<Hit> found;
  for (const Posting& posting : postings_.Read(matches.front())) {
    found.push_back({posting.document, RepetitionFactor(posting.count)});
  }
  for (std::size_t i = 1; i < matches.size() && !found.empty(); ++i) {
    const std::vector<Posting>& postings = postings_.Read(matches[i]);
    auto posting = postings.begin();
    const auto is_missing = [&](Hit& hit) {
      while (posting != postings.end() && posting->document < hit.document) ++posting;
      if (posting == postings.end() || posting->document != hit.document) return true;
      hit.worth += RepetitionFactor(posting->count);
      return false;
    };
    found.erase(std::remove_if(found.begin(), found.end(), is_missing), found.end());
  }
  return found;
}

namespace {

bool IsBetter(const Hit& a, const Hit& b) { return a.worth > b.worth; }

// Those that may be among the first `count`: all hits that are not worth less than the last of
// them.
void KeepBest(std::vector<Hit>& hits, std::size_t count) {
  const auto last = hits.begin() + static_cast<std::ptrdiff_t>(count - 1);
  std::nth_element(hits.begin(), last, hits.end(), IsBetter);
  const double least = last->worth;
  hits.erase(
      std::partition(last + 1, hits.end(), [&](const Hit& hit) { return hit.worth == least; }),
      hits.end());
}

struct OrderedHit {
  Hit hit;
  std::string key;
};

std::vector<OrderedHit> WithKeys(const Xapian::Database& database, std::vector<Hit> hits) {
  std::sort(hits.begin(), hits.end(),
            [](const Hit& a, const Hit& b) { return a.document < b.document; });
  std::vector<OrderedHit> ordered;
  auto key = database.valuestream_begin(kOrderSlot);
  const auto end = database.valuestream_end(kOrderSlot);
  for (const Hit& hit : hits) {
    if (key != end) key.skip_to(hit.document);
    const bool has_key = key != end && key.get_docid() == hit.document;
    ordered.push_back({hit, has_key ? *key : std::string()});
  }
  return ordered;
}

}  // namespace

std::vector<Hit> FirstOf(const Xapian::Database& database, std::vector<Hit> hits,
                         std::size_t count) {
  count = std::min(count, hits.size());
  if (count == 0) return {};
  KeepBest(hits, count);
  std::vector<OrderedHit> ordered = WithKeys(database, std::move(hits));
  std::partial_sort(ordered.begin(), ordered.begin() + static_cast<std::ptrdiff_t>(count),
                    ordered.end(), [](const OrderedHit& a, const OrderedHit& b) {
                      if (a.hit.worth != b.hit.worth) return IsBetter(a.hit, b.hit);
                      return a.key < b.key;
                    });
  std::vector<Hit> first;
  for (std::size_t i = 0; i < count; ++i) first.push_back(ordered[i].hit);
  return first;
}

}  // namespace searchd
