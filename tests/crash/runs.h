// How many of all possible runs there are, and what came of them.
#pragma once

#include <chrono>
#include <cstddef>
#include <optional>
#include <string>
#include <vector>

namespace test {

// None given means all. From the environment, where CRASH_KILLS and CRASH_FAULTS are "all" or about
// how many, and CRASH_SEED chooses which.
struct Runs {
  std::optional<std::size_t> kills;
  std::optional<std::size_t> faults;
  std::size_t seed = 1;

  // What the environment does not say is as in `otherwise`.
  static Runs FromEnvironment(const Runs& otherwise);

  // Which of `count` things are done when about `wanted` are: evenly spread, from an offset on that
  // the seed gives.
  std::vector<std::size_t> Sample(std::size_t count, std::optional<std::size_t> wanted) const;
};

struct Tally {
  std::string subject;
  std::size_t points = 0;    // at which it may be killed
  std::size_t killed = 0;    // runs that were
  std::size_t survived = 0;  // runs that came to their end before the point
  std::size_t possible = 0;  // failures that there may be
  std::size_t injected = 0;
  std::chrono::steady_clock::time_point begin = std::chrono::steady_clock::now();

  // Writes "ROW", all of this in this order, and the seconds since the beginning, to the standard
  // output.
  void Print() const;
};

}  // namespace test
