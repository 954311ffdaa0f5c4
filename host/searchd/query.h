// From what a person types to what an index is asked.
#pragma once

#include <xapian.h>

#include <string>

#include "host/searchd/analyzer.h"
#include "host/searchd/mapping.h"

namespace searchd {

constexpr std::size_t kMaxQueryCharacters = 256;
constexpr std::size_t kMaxQueryWords = 16;

struct ParsedQuery {
  Xapian::Query query;  // empty when the text holds no word
  bool cut = false;     // the text was longer than is looked at
};

// All words of `text` must be found, each in any of the members that are searched when none is
// named; the last one may be the beginning of a word.
ParsedQuery ParseQuery(const Mapping& mapping, Analyzer& analyzer, const std::string& text);

}  // namespace searchd
