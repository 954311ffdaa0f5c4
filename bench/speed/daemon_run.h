// The search daemon filled, searched, and searched while somebody writes.
#pragma once

#include <cstddef>
#include <vector>

#include "bench/speed/answers.h"
#include "bench/speed/queries.h"
#include "bench/speed/texts.h"

namespace bench {

// Makes the empty index of each language.
void CreateIndexes(const Texts& texts);

// What things cost with so many applications on the device.
struct Costs {
  std::size_t applications = 0;
  std::size_t written = 0;    // documents in this portion
  double fill_seconds = 0;    // of writing the portion at full speed and committing it
  double commit_seconds = 0;  // of one language, after all documents of one application
  double bytes_per_document = 0;
  Answers searches;
};

// Writes the applications from `begin` to before `end`, commits each language, and looks at what
// writing and searching costs then.
Costs Grow(const Texts& texts, std::size_t begin, std::size_t end,
           const std::vector<Query>& queries);

// Asks the queries one after the other, each twice; the second time is measured, from connecting
// to having read the reply's JSON.
Answers SearchDaemon(const Texts& texts, const std::vector<Query>& queries);

// The same while another client writes applications again and again, as fast as it can, and commits
// each language of each.
struct BusySearches {
  Answers searches;
  double writes_per_second = 0;
};
BusySearches SearchBusyDaemon(const Texts& texts, std::size_t applications,
                              const std::vector<Query>& queries);

// What an exchange takes in which nothing is searched for: the median.
double SecondsOfEmptySearch(const Texts& texts);

}  // namespace bench
