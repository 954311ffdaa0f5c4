// From what a person types to the plan of a search.
#pragma once

#include <xapian.h>

#include <set>
#include <string>
#include <vector>

#include "host/searchd/analyzer.h"
#include "host/searchd/mapping.h"
#include "host/searchd/plan.h"
#include "host/searchd/terms.h"

namespace searchd {

constexpr std::size_t kMaxQueryCharacters = 256;
constexpr std::size_t kMaxQueryWords = 16;

// A member that is searched when none is named.
struct Field {
  std::string member;
  FieldRule rule;
  Role role;
  std::set<Space> absent = {};  // of which no document has a term: nobody need look there
};

std::vector<Field> SearchedFields(const Mapping& mapping);

// Finds out what is absent in a database.
void FindAbsent(std::vector<Field>& fields, const Xapian::Database& database);

// The terms of words with a stem. A word that is its own stem has no other term for it.
std::vector<std::string> StemTerms(const Field& field, const std::string& stem);

// Adds to a plan the other forms of the words that its last word may become, as far as the database
// knows such words.
void AddUnfinishedForms(Plan& plan, const std::vector<Field>& fields, Analyzer& analyzer,
                        const Xapian::Database& database);

// The last word may be the beginning of one. An empty plan when the text holds no word.
Plan MakePlan(const std::vector<Field>& fields, Analyzer& analyzer, const std::string& text);

}  // namespace searchd
