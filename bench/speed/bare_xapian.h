// The same documents written by a program that does nothing else.
#pragma once

#include <cstddef>
#include <vector>

#include "bench/speed/process.h"
#include "bench/speed/texts.h"

namespace bench {

struct BareXapian {
  std::vector<double> seconds;  // of writing and committing, for each of the sizes
  double megabytes = 0;         // by which the process's own memory has grown in the end
  double peak_megabytes = 0;    // by which it had grown at most
};

// Fills a database per language below `dir`, growing to each of the sizes, and commits all of them
// each time. Making the documents is not measured.
BareXapian WriteWithBareXapian(const ProcessList& processes, const Texts& texts,
                               const std::vector<std::size_t>& sizes, const std::string& dir);

}  // namespace bench
