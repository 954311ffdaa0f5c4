// The tables that are printed.
#pragma once

#include <string>
#include <vector>

#include "bench/speed/answers.h"
#include "bench/speed/daemon_run.h"
#include "bench/speed/queries.h"

namespace bench {

// One line of the table of ratios: what was measured here, what the same run measured as the yard
// stick, and how the one must stand to the other.
struct Ratio {
  std::string what;
  double value;
  double yardstick;
  const char* unit;
  double target;
  bool at_least;     // else at most
  std::string note;  // what exactly was measured

  double Get() const { return value / yardstick; }
  bool IsHeld() const { return at_least ? Get() >= target : Get() <= target; }
};

void PrintRatios(const std::vector<Ratio>& ratios);
void PrintGrowth(const std::vector<Costs>& growth, const std::vector<double>& bare_seconds);
void PrintKinds(const std::vector<Query>& queries, const Answers& daemon, const Answers& sqlite);

// The queries that took the daemon longest, with what they took.
void PrintSlowest(const Texts& texts, const std::vector<Query>& queries, const Answers& daemon,
                  const Answers& sqlite, std::size_t count);

}  // namespace bench
