// Measuring and judging a ratio.
#pragma once

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <vector>

namespace bench {

using Clock = std::chrono::steady_clock;

template <typename Work>
double SecondsOf(const Work& work) {
  const Clock::time_point start = Clock::now();
  work();
  return std::chrono::duration<double>(Clock::now() - start).count();
}

inline double Median(std::vector<double> values) {
  std::sort(values.begin(), values.end());
  return values[values.size() / 2];
}

// Prints one line and returns the program's exit status: 0 when the ratio keeps to the limit.
inline int Judge(const char* what, double ratio, double limit) {
  std::printf("%s: %.3f (limit %.2f)%s\n", what, ratio, limit, ratio <= limit ? "" : "  TOO HIGH");
  return ratio <= limit ? 0 : 1;
}

}  // namespace bench
