// Words that say little about an application, so that a search does without them if it must.
#pragma once

#include <xapian.h>

#include <vector>

#include "host/searchd/analyzer.h"
#include "host/searchd/plan.h"
#include "host/searchd/planner.h"

namespace searchd {

// Whether it is one of the words for "application" and "settings" in any of the languages.
bool IsCommonWord(const Analyzer& analyzer, const std::string& word);

// The parts of a text that white space separates, or a common word of a script without spaces.
std::vector<std::string> PartCommonWords(const std::string& text);

// Makes the clauses of such words optional, and of words that stand in half of the titles.
void MarkCommonWords(Plan& plan, const std::vector<Field>& fields, const Analyzer& analyzer,
                     const Xapian::Database& database);

// Makes the last clause optional if it is the beginning of a common word, behind which no more was
// typed. Returns whether it is.
bool MarkUnfinishedCommonWord(Plan& plan, const Analyzer& analyzer);

}  // namespace searchd
