// What the scripts that run the long forms of these tests set.
#pragma once

#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <string>

namespace test {

// The number in an environment variable; `otherwise` where it is not set.
inline unsigned long NumberFrom(const char* variable, unsigned long otherwise) {
  const char* const text = std::getenv(variable);
  return text == nullptr || *text == '\0' ? otherwise : std::stoul(text);
}

// The seed of everything that a test leaves to chance: that of TEISEIGATRO_SEED, or one of its own
// for each run. Whoever uses it prints it.
inline unsigned Seed() {
  const auto now = std::chrono::system_clock::now().time_since_epoch().count();
  return static_cast<unsigned>(
      NumberFrom("TEISEIGATRO_SEED", static_cast<unsigned>(now) ^ static_cast<unsigned>(getpid())));
}

}  // namespace test
