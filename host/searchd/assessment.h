// What a plan says of one document, term by term, for people who ask why it was found.
#pragma once

#include <json/value.h>
#include <xapian.h>

#include <map>
#include <string>
#include <vector>

#include "host/searchd/plan.h"

namespace searchd {

// The terms of a document, and how often each stands in it.
using DocumentTerms = std::map<std::string, Xapian::termcount>;

// A typed text and the way in which it was found. Valid as long as the plan.
struct Finding {
  const std::string* text;
  const Way* way;
  double worth;
};

struct Assessment {
  double worth = 0;           // 0: the plan does not find the document
  How how = How::kWholeText;  // the least that one of the typed words was found by
  std::vector<Finding> findings;

  Json::Value Reasons() const;  // for people: what was found, where and how
};

// The worth is the one that a Matcher gives the document.
Assessment Assess(const Plan& plan, const DocumentTerms& terms);

}  // namespace searchd
