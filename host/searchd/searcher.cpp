#include "host/searchd/searcher.h"

#include <algorithm>
#include <cstdio>
#include <utility>

#include "host/searchd/assessment.h"
#include "host/searchd/common_words.h"
#include "host/searchd/document.h"
#include "host/searchd/fallback.h"
#include "host/searchd/json_text.h"
#include "host/searchd/matcher.h"

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
std::string HitText(const Xapian::Document& document, double score) {
  std::string text = document.get_data();
  if (text.size() < 2 || text.front() != '{' || text.back() != '}') {
    throw Xapian::DatabaseCorruptError("a stored document is none");
  }
  text.pop_back();
  if (text.size() > 1) text += ',';
  return text + "\"score\":" + ScoreText(score);
}

std::string HitTexts(const Xapian::Database& database, const std::vector<Hit>& hits,
                     const Plan& plan, bool explain) {
  std::string texts = "[";
  for (const Hit& hit : hits) {
    const Xapian::Document document = database.get_document(hit.document);
    if (texts.size() > 1) texts += ',';
    texts += HitText(document, hit.worth);
    if (explain) texts += ",\"explain\":" + JsonText(AssessDocument(plan, document).Reasons());
    texts += '}';
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

}  // namespace

Searcher::Searcher(const Mapping& mapping, const Language& language)
    : analyzer_(language), fields_(SearchedFields(mapping)) {}

void Searcher::Update(const std::set<std::string>& new_terms) {
  if (vocabulary_ && !vocabulary_->Learn(new_terms)) vocabulary_.reset();
  knows_fields_ = false;
}

SearchResult Searcher::Search(const Xapian::Database& database, const SearchRequest& request) {
  if (!knows_fields_) FindAbsent(fields_, database);
  knows_fields_ = true;
  Plan plan = MakePlan(fields_, analyzer_, request.query);
  AddUnfinishedForms(plan, fields_, analyzer_, database);
  MarkCommonWords(plan, fields_, analyzer_, database);
  const std::vector<Hit> hits = FindByAnyStep(database, plan);

  SearchResult result;
  result.cut = plan.cut;
  result.total = static_cast<Xapian::doccount>(hits.size());
  if (hits.empty()) return result;
  const std::size_t end = std::size_t{request.offset} + request.limit;
  std::vector<Hit> page = FirstOf(database, hits, std::max<std::size_t>(end, 1));
  const Xapian::Document first = database.get_document(page.front().document);
  result.matched = NameOfStep(AssessDocument(plan, first).how);
  page.resize(std::min(page.size(), end));
  const std::size_t before = std::min<std::size_t>(request.offset, page.size());
  page.erase(page.begin(), page.begin() + static_cast<std::ptrdiff_t>(before));
  result.hits = HitTexts(database, page, plan, request.explain);
  return result;
}

// The hits by the first step that finds any. The plan is then that of this step.
std::vector<Hit> Searcher::FindByAnyStep(const Xapian::Database& database, Plan& plan) {
  Matcher matcher(database, notes_);
  std::vector<Hit> hits = matcher.Find(plan);
  if (!hits.empty() || plan.IsEmpty()) return hits;
  if (MarkUnfinishedCommonWord(plan, analyzer_)) hits = matcher.Find(plan);
  if (!hits.empty()) return hits;
  if (AddMarkless(plan, fields_, analyzer_)) hits = matcher.Find(plan);
  if (!hits.empty()) return hits;
  if (!vocabulary_) vocabulary_ = std::make_unique<Vocabulary>(database, fields_);
  if (AddContaining(plan, fields_, analyzer_, *vocabulary_)) hits = matcher.Find(plan);
  if (!hits.empty()) return hits;
  if (AddNearly(plan, fields_, analyzer_, *vocabulary_)) hits = matcher.Find(plan);
  return hits;
}

}  // namespace searchd
