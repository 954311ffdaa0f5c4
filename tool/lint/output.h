// The linter's outcome for people and for programs.
#pragma once

#include <json/value.h>

#include <ostream>
#include <string>

#include "tool/lint/lint.h"
#include "tool/lint/tags.h"

namespace tool::lint {

// How many findings there are of each severity.
struct Counts {
  std::size_t errors = 0;
  std::size_t warnings = 0;
  std::size_t notes = 0;
};
Counts Count(const std::vector<Finding>& findings);

// "FILE:LINE:COLUMN: SEVERITY: MESSAGE [TAG]", one line a finding; places that there are. The
// severity stands out where `emphasise` is set.
void WriteText(std::ostream& out, const Outcome& outcome, bool emphasise);

// For each descriptor with gaps a table of them, a column for each language, in 80 columns.
void WriteTables(std::ostream& out, const Outcome& outcome);

// Workflow commands, as a CI shows them beside the lines of a change.
void WriteAnnotations(std::ostream& out, const Outcome& outcome);

// {"checked": [FILE...], "findings": [...], "texts": [...], "errors": N, "warnings": N, "notes": N}
Json::Value ToJson(const Outcome& outcome);

Json::Value ToJson(const Tag& tag);

}  // namespace tool::lint
