// Titles with one slip of the fingers.
#pragma once

#include <vector>

#include "bench/quality/kinds.h"

namespace bench::quality {

// In each title word of five or more letters, or in a whole title written without spaces: a letter
// left out, doubled, replaced and swapped with its neighbour. Each as the whole title and as the
// word alone. Where the slip happens depends on the word and on nothing else.
std::vector<Typed> TypeWithTypo(const Item& item, const Language& language);

}  // namespace bench::quality
