#include "host/searchd/query.h"

#include <algorithm>
#include <utility>
#include <vector>

#include "host/searchd/terms.h"

namespace searchd {
namespace {

using Xapian::Query;

Query Scaled(const Query& query, double factor) {
  return Query(Query::OP_SCALE_WEIGHT, query, factor);
}

Query Best(const std::vector<Query>& queries) {
  return Query(Query::OP_MAX, queries.begin(), queries.end());
}

Query All(const std::vector<Query>& queries) {
  return Query(Query::OP_AND, queries.begin(), queries.end());
}

Query ToQuery(const Way& way) {
  std::vector<Query> matches;
  for (const Match& match : way.matches) {
    matches.push_back(match.beginning ? Query(Query::OP_WILDCARD, match.term) : Query(match.term));
  }
  return Scaled(All(matches), way.worth / static_cast<double>(matches.size()));
}

// A reading, and which members count. Words that are found in one member's texts are worth more
// than words from all over the document.
struct Weighed {
  const Reading* reading;
  bool (*counts)(Role role);
  double factor;
};

bool IsOfTitle(Role role) { return role == Role::kTitle || role == Role::kInsideTitle; }
bool IsOfKeywords(Role role) { return role == Role::kKeywords; }
bool IsAny(Role) { return true; }

void Weigh(std::vector<Weighed>& weighed, const Reading& reading, double factor) {
  if (reading.empty()) return;
  if (reading.size() > 1) {
    weighed.push_back({&reading, IsOfTitle, factor});
    weighed.push_back({&reading, IsOfKeywords, factor});
    factor *= kScattered;
  }
  weighed.push_back({&reading, IsAny, factor});
}

std::vector<Weighed> Weigh(const Plan& plan) {
  std::vector<Weighed> weighed;
  Weigh(weighed, plan.parts, 1);
  Weigh(weighed, plan.words, kApart);
  return weighed;
}

// Nothing where a required clause cannot be met.
Query ToQuery(const Weighed& weighed) {
  std::vector<Query> required;
  std::vector<Query> optional;
  for (const Clause& clause : *weighed.reading) {
    std::vector<Query> ways;
    for (const Way& way : clause.ways) {
      if (weighed.counts(way.role)) ways.push_back(ToQuery(way));
    }
    if (ways.empty() && clause.optional) continue;
    if (ways.empty()) return {};
    (clause.optional ? optional : required).push_back(Best(ways));
  }
  Query query =
      required.empty() ? Query(Query::OP_OR, optional.begin(), optional.end()) : All(required);
  if (query.empty()) return {};
  if (!required.empty()) {
    for (const Query& clause : optional) query = Query(Query::OP_AND_MAYBE, query, clause);
  }
  return Scaled(query, weighed.factor / static_cast<double>(weighed.reading->size()));
}

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

Json::Value Reason(const std::string& text, const Way& way, double worth) {
  Json::Value reason(Json::objectValue);
  reason["text"] = text;
  reason["member"] = way.member;
  reason["found"] = NameOf(way.how);
  reason["worth"] = worth;
  return reason;
}

// The best of some ways to find a text.
Assessment AssessWays(const std::string& text, const std::vector<Way>& ways,
                      bool (*counts)(Role role), const DocumentTerms& terms) {
  Assessment best;
  for (const Way& way : ways) {
    if (!counts(way.role)) continue;
    const double worth = WorthIn(terms, way);
    if (worth <= best.worth) continue;
    best.worth = worth;
    best.how = way.how;
    best.reasons = Json::Value(Json::arrayValue);
    best.reasons.append(Reason(text, way, worth));
  }
  return best;
}

Assessment AssessReading(const Weighed& weighed, const DocumentTerms& terms) {
  Assessment sum;
  for (const Clause& clause : *weighed.reading) {
    const Assessment best = AssessWays(clause.text, clause.ways, weighed.counts, terms);
    if (best.worth == 0 && !clause.optional) return {};
    sum.worth += best.worth;
    sum.how = std::max(sum.how, best.how);
    for (const Json::Value& reason : best.reasons) sum.reasons.append(reason);
  }
  sum.worth *= weighed.factor / static_cast<double>(weighed.reading->size());
  return sum;
}

}  // namespace

Query ToQuery(const Plan& plan) {
  std::vector<Query> ways;
  for (const Way& way : plan.whole) ways.push_back(ToQuery(way));
  for (const Weighed& weighed : Weigh(plan)) {
    Query query = ToQuery(weighed);
    if (!query.empty()) ways.push_back(std::move(query));
  }
  if (ways.empty()) return {};
  return Query(Query::OP_AND_MAYBE, Best(ways), Scaled(Query(kApplicationTerm), kApplicationWorth));
}

Assessment Assess(const Plan& plan, const DocumentTerms& terms) {
  Assessment best = AssessWays(plan.text, plan.whole, IsAny, terms);
  for (const Weighed& weighed : Weigh(plan)) {
    Assessment assessment = AssessReading(weighed, terms);
    if (assessment.worth > best.worth) best = std::move(assessment);
  }
  if (best.worth > 0 && terms.count(kApplicationTerm) != 0) best.worth += kApplicationWorth;
  return best;
}

}  // namespace searchd
