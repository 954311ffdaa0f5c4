#include "host/searchd/edit_distance.h"

#include <algorithm>

namespace searchd {
namespace {

using View = std::u32string_view;

std::size_t CommonBeginning(View a, View b) {
  const std::size_t most = std::min(a.size(), b.size());
  std::size_t n = 0;
  while (n < most && a[n] == b[n]) ++n;
  return n;
}

bool StartsWith(View text, View beginning) { return text.substr(0, beginning.size()) == beginning; }

// Whether some beginning of `text` is `typed` but for one edit, given that they part at `at`.
bool BeginsAfterEdit(View text, View typed, std::size_t at) {
  const View rest = typed.substr(at);
  const View ahead = text.substr(std::min(at, text.size()));
  if (rest.size() <= 1) return true;  // the last letter is wrong or too many
  const View after = rest.substr(1);
  if (StartsWith(ahead, after)) return true;                                 // one too many
  if (!ahead.empty() && StartsWith(ahead.substr(1), rest)) return true;      // one too few
  if (!ahead.empty() && StartsWith(ahead.substr(1), after)) return true;     // another one
  return ahead.size() >= 2 && ahead[0] == rest[1] && ahead[1] == rest[0] &&  // swapped
         StartsWith(ahead.substr(2), rest.substr(2));
}

}  // namespace

bool IsWithinOneEdit(View a, View b) {
  const View longer = a.size() < b.size() ? b : a;
  const View shorter = a.size() < b.size() ? a : b;
  if (longer.size() - shorter.size() > 1) return false;
  const std::size_t at = CommonBeginning(longer, shorter);
  if (at == longer.size()) return true;
  if (longer.size() > shorter.size()) return longer.substr(at + 1) == shorter.substr(at);
  if (longer.substr(at + 1) == shorter.substr(at + 1)) return true;
  return longer.size() - at >= 2 && longer[at] == shorter[at + 1] &&
         longer[at + 1] == shorter[at] && longer.substr(at + 2) == shorter.substr(at + 2);
}

bool BeginsWithinOneEdit(View text, View typed) {
  const std::size_t at = CommonBeginning(text, typed);
  return at == typed.size() || BeginsAfterEdit(text, typed, at);
}

bool MayContainWithinOneEdit(View text, View typed) {
  // One edit leaves what stands before the middle letter as it is, or what stands behind it.
  const std::size_t middle = typed.size() / 2;
  return text.find(typed.substr(0, middle)) != View::npos ||
         text.find(typed.substr(std::min(middle + 1, typed.size()))) != View::npos;
}

bool ContainsWithinOneEdit(View text, View typed) {
  for (std::size_t start = 0; start < text.size(); ++start) {
    if (BeginsWithinOneEdit(text.substr(start), typed)) return true;
  }
  return false;
}

}  // namespace searchd
