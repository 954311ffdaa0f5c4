// Numbers that are the same in every run and on every machine.
#pragma once

#include <cmath>
#include <cstddef>
#include <cstdint>

namespace bench {

class Random {
 public:
  explicit Random(std::uint64_t seed) : state_(seed) {}

  std::uint64_t Next() {
    state_ += 0x9E3779B97F4A7C15ULL;
    std::uint64_t x = state_;
    x = (x ^ (x >> 30U)) * 0xBF58476D1CE4E5B9ULL;
    x = (x ^ (x >> 27U)) * 0x94D049BB133111EBULL;
    return x ^ (x >> 31U);
  }

  std::size_t Below(std::size_t count) { return static_cast<std::size_t>(Next() % count); }

  std::size_t Between(std::size_t least, std::size_t most) {
    return least + Below(most - least + 1);
  }

  double Unit() { return static_cast<double>(Next() >> 11U) / 9007199254740992.0; }

  // A rank below `count`. As with the words of a language, a few ranks come often and most come
  // seldom; the shift keeps the first ones from taking everything.
  std::size_t Rank(std::size_t count) {
    constexpr double kShift = 5;
    const double most = (static_cast<double>(count) + kShift) / kShift;
    const double rank = (std::exp(Unit() * std::log(most)) - 1) * kShift;
    return static_cast<std::size_t>(rank) % count;
  }

 private:
  std::uint64_t state_;
};

}  // namespace bench
