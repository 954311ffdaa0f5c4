#include "tests/crash/runs.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <iostream>
#include <map>
#include <set>

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
  const char* const faults = std::getenv("CRASH_FAULTS");
  runs.faults_by_kind = faults != nullptr && std::strcmp(faults, "kinds") == 0;
  if (!runs.faults_by_kind) runs.faults = NumberFrom("CRASH_FAULTS", otherwise.faults);
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

std::vector<std::size_t> Runs::SampleOfKinds(const std::vector<std::string>& kinds) const {
  std::map<std::string, std::vector<std::size_t>> of_kind;
  for (std::size_t i = 0; i < kinds.size(); ++i) of_kind[kinds[i]].push_back(i);
  std::set<std::size_t> chosen;
  for (const auto& [kind, all] : of_kind) {
    chosen.insert(all.front());
    chosen.insert(all[seed % all.size()]);
    chosen.insert(all.back());
  }
  return {chosen.begin(), chosen.end()};
}

void Tally::Print() const {
  const std::chrono::duration<double> seconds = std::chrono::steady_clock::now() - begin;
  std::cout << "ROW " << subject << " " << points << " " << killed << " " << survived << " "
            << possible << " " << injected << " " << seconds.count() << std::endl;
}

}  // namespace test
