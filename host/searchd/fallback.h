// What is looked for when what was typed is found nowhere.
#pragma once

#include <vector>

#include "host/searchd/analyzer.h"
#include "host/searchd/plan.h"
#include "host/searchd/planner.h"
#include "host/searchd/vocabulary.h"

namespace searchd {

// Each adds ways to a plan, in the order in which they are tried, and returns whether there are
// any: words that are alike without any marks; words that contain what was typed; and what is
// nearly what was typed, or is so when spaces do not count.
bool AddMarkless(Plan& plan, const std::vector<Field>& fields, Analyzer& analyzer);
bool AddContaining(Plan& plan, const std::vector<Field>& fields, Analyzer& analyzer,
                   const Vocabulary& vocabulary);
bool AddNearly(Plan& plan, const std::vector<Field>& fields, Analyzer& analyzer,
               const Vocabulary& vocabulary);

}  // namespace searchd
