#include "host/searchd/searcher.h"

#include <cstdio>
#include <utility>

#include "host/searchd/common_words.h"
#include "host/searchd/document.h"
#include "host/searchd/fallback.h"
#include "host/searchd/json_text.h"
#include "host/searchd/query.h"

namespace searchd {
namespace {

Assessment AssessDocument(const Plan& plan, const Xapian::Document& document) {
  DocumentTerms terms;
  for (auto term = document.termlist_begin(); term != document.termlist_end(); ++term) {
    terms.emplace_hint(terms.end(), *term, term.get_wdf());
  }
  return Assess(plan, terms);
}

// Six digits tell any two ways to find a text apart, and none that differ by the machine's
// rounding.
std::string ScoreText(double score) {
  char text[32];
  std::snprintf(text, sizeof(text), "%.6g", score);
  return text;
}

// What is stored is the text of what is shown: parsing it would take most of the time of a search.
std::string HitText(const Xapian::MSetIterator& match, const Plan& plan, bool explain) {
  const Xapian::Document document = match.get_document();
  std::string hit = document.get_data();
  if (hit.size() < 2 || hit.front() != '{' || hit.back() != '}') {
    throw Xapian::DatabaseCorruptError("a stored document is none");
  }
  hit.pop_back();
  if (hit.size() > 1) hit += ',';
  hit += "\"score\":" + ScoreText(match.get_weight());
  if (explain) hit += ",\"explain\":" + JsonText(AssessDocument(plan, document).reasons);
  return hit + '}';
}

std::string HitTexts(const Xapian::MSet& matches, const Plan& plan, bool explain) {
  std::string texts = "[";
  for (auto it = matches.begin(); it != matches.end(); ++it) {
    if (texts.size() > 1) texts += ',';
    texts += HitText(it, plan, explain);
  }
  return texts + ']';
}

std::string NameOfStep(How how) {
  switch (how) {
    case How::kWholeText:
    case How::kWord:
    case How::kStem:
      return "exact";
    case How::kWholeBeginning:
    case How::kBeginning:
      return "prefix";
    case How::kInside:
      return "ngram";
    case How::kTypo:
      break;
  }
  return "fuzzy";
}

// The total of these, which Xapian knows exactly when it has looked at all documents.
Xapian::doccount TotalOf(const Xapian::MSet& matches) { return matches.get_matches_estimated(); }

Xapian::MSet Find(const Xapian::Database& database, const Plan& plan, unsigned offset,
                  unsigned limit) {
  if (plan.IsEmpty()) return {};
  Xapian::Enquire enquire(database);
  enquire.set_query(ToQuery(plan));
  enquire.set_weighting_scheme(WorthWeight());
  enquire.set_sort_by_relevance_then_value(kOrderSlot, false);
  // Looking at all documents makes the total exact.
  return enquire.get_mset(offset, limit, database.get_doccount());
}

}  // namespace

Searcher::Searcher(const Mapping& mapping, const Language& language)
    : analyzer_(language), fields_(SearchedFields(mapping)) {}

void Searcher::Forget() {
  vocabulary_.reset();
  knows_fields_ = false;
}

SearchResult Searcher::Search(const Xapian::Database& database, const SearchRequest& request) {
  if (!knows_fields_) FindAbsent(fields_, database);
  knows_fields_ = true;
  Plan plan = MakePlan(fields_, analyzer_, request.query);
  AddUnfinishedForms(plan, fields_, analyzer_, database);
  MarkCommonWords(plan, fields_, analyzer_, database);
  const bool first_page = request.offset == 0 && request.limit > 0;
  Xapian::MSet hits = FindByAnyStep(database, plan, first_page ? request.limit : 1);

  SearchResult result;
  result.cut = plan.cut;
  result.total = TotalOf(hits);
  if (hits.empty()) return result;
  result.matched = NameOfStep(AssessDocument(plan, hits.begin().get_document()).how);
  if (request.limit == 0) return result;
  if (!first_page) hits = Find(database, plan, request.offset, request.limit);
  result.hits = HitTexts(hits, plan, request.explain);
  return result;
}

// The first `limit` hits by the first step that finds any. The plan is then that of this step.
Xapian::MSet Searcher::FindByAnyStep(const Xapian::Database& database, Plan& plan, unsigned limit) {
  Xapian::MSet hits = Find(database, plan, 0, limit);
  if (!hits.empty() || plan.IsEmpty()) return hits;
  if (MarkUnfinishedCommonWord(plan, analyzer_)) hits = Find(database, plan, 0, limit);
  if (!hits.empty()) return hits;
  if (AddMarkless(plan, fields_, analyzer_)) hits = Find(database, plan, 0, limit);
  if (!hits.empty()) return hits;
  if (!vocabulary_) vocabulary_ = std::make_unique<Vocabulary>(database, fields_);
  if (AddContaining(plan, fields_, analyzer_, *vocabulary_)) hits = Find(database, plan, 0, limit);
  if (!hits.empty()) return hits;
  if (AddNearly(plan, fields_, analyzer_, *vocabulary_)) hits = Find(database, plan, 0, limit);
  return hits;
}

}  // namespace searchd
