#include "host/searchd/assessment.h"

#include <algorithm>
#include <utility>

#include "host/searchd/terms.h"

namespace searchd {
namespace {

bool Holds(const DocumentTerms& terms, const Match& match, Xapian::termcount& count) {
  if (!match.beginning) {
    const auto found = terms.find(match.term);
    if (found == terms.end()) return false;
    count = found->second;
    return true;
  }
  bool any = false;
  count = 0;
  for (auto it = terms.lower_bound(match.term);
       it != terms.end() && it->first.compare(0, match.term.size(), match.term) == 0; ++it) {
    any = true;
    count += it->second;
  }
  return any;
}

// What a way is worth in a document; 0 when it is not there.
double WorthIn(const DocumentTerms& terms, const Way& way) {
  double worth = 0;
  for (const Match& match : way.matches) {
    Xapian::termcount count = 0;
    if (!Holds(terms, match, count)) return 0;
    worth += RepetitionFactor(count);
  }
  return worth * way.worth / static_cast<double>(way.matches.size());
}

// The best of some ways to find a text.
Assessment AssessWays(const std::string& text, const std::vector<Way>& ways,
                      bool (*counts)(Role role), const DocumentTerms& terms) {
  Assessment best;
  for (const Way& way : ways) {
    if (!counts(way.role)) continue;
    const double worth = WorthIn(terms, way);
    if (worth > best.worth) best = {worth, way.how, {{&text, &way, worth}}};
  }
  return best;
}

Assessment AssessView(const View& view, const DocumentTerms& terms) {
  Assessment sum;
  for (const Clause& clause : *view.reading) {
    const Assessment best = AssessWays(clause.text, clause.ways, view.counts, terms);
    if (best.worth == 0 && !clause.optional) return {};
    sum.worth += best.worth;
    sum.how = std::max(sum.how, best.how);
    sum.findings.insert(sum.findings.end(), best.findings.begin(), best.findings.end());
  }
  sum.worth *= view.factor / static_cast<double>(view.reading->size());
  return sum;
}

}  // namespace

Json::Value Assessment::Reasons() const {
  Json::Value reasons(Json::arrayValue);
  for (const Finding& finding : findings) {
    Json::Value& reason = reasons.append(Json::Value(Json::objectValue));
    reason["text"] = *finding.text;
    reason["member"] = finding.way->member;
    reason["found"] = NameOf(finding.way->how);
    reason["worth"] = finding.worth;
  }
  return reasons;
}

Assessment Assess(const Plan& plan, const DocumentTerms& terms) {
  Assessment best = AssessWays(plan.text, plan.whole, IsAny, terms);
  for (const View& view : ViewsOf(plan)) {
    Assessment assessment = AssessView(view, terms);
    if (assessment.worth > best.worth) best = std::move(assessment);
  }
  if (best.worth > 0 && terms.count(kApplicationTerm) != 0) best.worth += kApplicationWorth;
  return best;
}

}  // namespace searchd
