// Whether two texts are alike but for one slip of the finger: a letter too many, too few or another
// one, or two neighbours swapped.
#pragma once

#include <string_view>

namespace searchd {

bool IsWithinOneEdit(std::u32string_view a, std::u32string_view b);

// Whether `typed` is so alike to some beginning of `text`, or to some part of it.
bool BeginsWithinOneEdit(std::u32string_view text, std::u32string_view typed);
bool ContainsWithinOneEdit(std::u32string_view text, std::u32string_view typed);

// False only where none of the above holds, and quick to say so.
bool MayContainWithinOneEdit(std::u32string_view text, std::u32string_view typed);

}  // namespace searchd
