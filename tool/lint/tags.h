// The kinds of findings. A tag, once published, keeps its name and its meaning.
#pragma once

#include <string>
#include <vector>

#include "tool/lint/finding.h"

namespace tool::lint {

struct Tag {
  const char* name;
  Severity severity;
  bool in_schema;  // the schema of index.conf has the same rule
  const char* summary;
  const char* explanation;  // what it means, what the library does with it, how to mend it
};

const std::vector<Tag>& AllTags();

// The tag of that name, or null.
const Tag* FindTag(const std::string& name);

const char* SeverityName(Severity severity);

}  // namespace tool::lint
