// What the programs of this directory print: one line for each number measured. `scripts/bench`
// makes the tables of them and says what must hold.
#pragma once

#include <cstdio>
#include <string>

namespace bench {

// The library's side of a cost, and what it is measured against.
constexpr char kSubject[] = "this";
constexpr char kLimit[] = "limit";

// `size` is how large the work was, in the unit by which the cost grows.
inline void PrintSample(const std::string& name, long size, const char* side, double value,
                        const char* unit) {
  std::printf("sample %s %ld %s %.9g %s\n", name.c_str(), size, side, value, unit);
  std::fflush(stdout);
}

}  // namespace bench
