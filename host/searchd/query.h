// A plan as Xapian carries it out, and what it says of one document.
#pragma once

#include <json/value.h>
#include <xapian.h>

#include <map>
#include <string>

#include "host/searchd/plan.h"

namespace searchd {

// The query whose weights, under WorthWeight, are what Assess says of each document that it finds.
Xapian::Query ToQuery(const Plan& plan);

// The terms of a document, and how often each stands in it.
using DocumentTerms = std::map<std::string, Xapian::termcount>;

struct Assessment {
  double worth = 0;           // 0: the plan does not find the document
  How how = How::kWholeText;  // the least that one of the typed words was found by
  Json::Value reasons = Json::Value(Json::arrayValue);  // for people: what was found, where and how
};

Assessment Assess(const Plan& plan, const DocumentTerms& terms);

}  // namespace searchd
