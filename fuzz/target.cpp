#include "fuzz/target.h"

#include <cstdio>
#include <cstdlib>

namespace fuzz {

void Require(bool holds, const char* property) {
  if (holds) return;
  std::fprintf(stderr, "does not hold: %s\n", property);
  std::abort();
}

}  // namespace fuzz
