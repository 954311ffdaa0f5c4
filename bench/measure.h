// Measuring time.
#pragma once

#include <chrono>
#include <ctime>

namespace bench {

using Clock = std::chrono::steady_clock;

template <typename Work>
double SecondsOf(const Work& work) {
  const Clock::time_point start = Clock::now();
  work();
  return std::chrono::duration<double>(Clock::now() - start).count();
}

// What this process has taken of the processors until now.
inline double ProcessorSeconds() {
  timespec time{};
  clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &time);
  return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) / 1e9;
}

template <typename Work>
double ProcessorSecondsOf(const Work& work) {
  const double start = ProcessorSeconds();
  work();
  return ProcessorSeconds() - start;
}

}  // namespace bench
