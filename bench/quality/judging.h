// Questions to the daemon, and whether its answers are good enough. Nothing here knows how the
// daemon finds or scores.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "bench/quality/items.h"

namespace bench::quality {

struct Question {
  std::size_t kind;     // in kKinds
  std::size_t item;     // the wanted one
  std::string query;    // UTF-8
  std::size_t allowed;  // the last rank that counts as found
};

struct Hit {
  std::string id;
  std::string title;
  double score;
};

struct Verdict {
  std::size_t rank = 0;         // hits with at least the item's score; 0: it is no hit
  bool found = false;           // among the first, up to the rank allowed
  std::vector<Hit> first_hits;  // only when not found
};

// What people would ask for these items, by kind, then by item; of kind `only` alone unless it is
// kKindCount. An item may stand as low as third, and lower when more items fit the intended text.
std::vector<Question> MakeQuestions(const std::string& lang, const std::vector<Item>& items,
                                    std::size_t only);

// Puts the questions to the daemon, each text once, from several threads. The verdicts are in the
// order of the questions. Throws velkor::Error when an exchange fails.
std::vector<Verdict> Ask(const std::string& lang, const std::vector<Item>& items,
                         const std::vector<Question>& questions);

}  // namespace bench::quality
