#include "tests/crash/runs.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <iostream>

namespace test {
namespace {

std::optional<std::size_t> NumberFrom(const char* name, std::optional<std::size_t> otherwise) {
  const char* const text = std::getenv(name);
  if (text == nullptr) return otherwise;
  if (std::strcmp(text, "all") == 0) return std::nullopt;
  return std::stoul(text);
}

}  // namespace

Runs Runs::FromEnvironment(const Runs& otherwise) {
  Runs runs;
  runs.kills = NumberFrom("CRASH_KILLS", otherwise.kills);
  runs.faults = NumberFrom("CRASH_FAULTS", otherwise.faults);
  runs.seed = NumberFrom("CRASH_SEED", otherwise.seed).value_or(otherwise.seed);
  std::cout << "CRASH_SEED=" << runs.seed << std::endl;
  return runs;
}

std::vector<std::size_t> Runs::Sample(std::size_t count, std::optional<std::size_t> wanted) const {
  std::size_t every = 1;
  if (wanted) {
    if (*wanted == 0) return {};
    every = std::max<std::size_t>(1, (count + *wanted - 1) / *wanted);
  }
  std::vector<std::size_t> chosen;
  for (std::size_t i = seed % every; i < count; i += every) chosen.push_back(i);
  return chosen;
}

void Tally::Print() const {
  const std::chrono::duration<double> seconds = std::chrono::steady_clock::now() - begin;
  std::cout << "ROW " << subject << " " << points << " " << killed << " " << survived << " "
            << possible << " " << injected << " " << seconds.count() << std::endl;
}

}  // namespace test
