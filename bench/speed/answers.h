// What came of asking some queries one after the other.
#pragma once

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <numeric>
#include <vector>

namespace bench {

struct Answers {
  std::vector<double> seconds;  // for each query
  std::vector<std::size_t> hits;

  double TotalSeconds() const { return std::accumulate(seconds.begin(), seconds.end(), 0.0); }

  // The time within which this part (0 to 1) of the queries was answered.
  double SecondsWithin(double part) const {
    std::vector<double> ordered = seconds;
    std::sort(ordered.begin(), ordered.end());
    const double place = std::ceil(part * static_cast<double>(ordered.size())) - 1;
    return ordered[static_cast<std::size_t>(std::max(place, 0.0))];
  }
};

}  // namespace bench
