// What a search asks an index for: the ways in which a typed text may stand in a document.
#pragma once

#include <string>
#include <vector>

#include "host/searchd/ranking.h"

namespace searchd {

struct Match {
  std::string term;
  bool beginning = false;  // any term that begins so
};

// One way to find a text in one member of a document. All of its matches must be there.
struct Way {
  std::string member;  // empty: one that the mapping does not name
  Role role = Role::kBody;
  How how = How::kWord;
  double worth = 0;
  std::vector<Match> matches;
};

// One of the typed words and the ways to find it, the best of which counts.
struct Clause {
  std::string text;
  bool optional = false;  // says so little that documents with one of the others are hits too
  std::vector<Way> ways;
};

// Clauses that must all be met but for the optional ones, and one of these where there are no
// others. What they are worth is the mean over them.
using Reading = std::vector<Clause>;

struct Plan {
  std::string text;        // what was typed, or as much of it as is looked at
  std::vector<Way> whole;  // ways to find all of it at once
  Reading parts;           // what stands between spaces
  Reading words;           // words as the language knows them; empty if these are the parts
  bool cut = false;        // more was typed than is looked at

  bool IsEmpty() const { return whole.empty() && parts.empty() && words.empty(); }
};

// A reading, and in which members it counts. Words that are found in one member's texts are worth
// more than words from all over the document.
struct View {
  const Reading* reading;
  bool (*counts)(Role role);
  double factor;  // of what the reading is worth
};

bool IsAny(Role role);

std::vector<View> ViewsOf(const Plan& plan);

}  // namespace searchd
