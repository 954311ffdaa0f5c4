#include "bench/quality/typos.h"

#include <unicode/uchar.h>
#include <unicode/uscript.h>

#include <algorithm>
#include <optional>
#include <utility>

#include "bench/quality/text.h"

namespace bench::quality {
namespace {

using Letters = std::vector<icu::UnicodeString>;

constexpr std::size_t kLeastLetters = 5;

// FNV-1a: the same number for the same word everywhere.
std::size_t HashOf(const icu::UnicodeString& word, std::size_t seed) {
  constexpr std::uint64_t kBasis = 14695981039346656037U;
  constexpr std::uint64_t kPrime = 1099511628211U;
  std::uint64_t hash = (kBasis ^ seed) * kPrime;
  for (int32_t i = 0; i < word.length(); ++i) hash = (hash ^ word.charAt(i)) * kPrime;
  return static_cast<std::size_t>(hash ^ (hash >> 32U));
}

icu::UnicodeString Joined(const Letters& letters) {
  icu::UnicodeString text;
  for (const icu::UnicodeString& letter : letters) text.append(letter);
  return text;
}

bool IsSame(const icu::UnicodeString& a, const icu::UnicodeString& b) {
  return Folded(a, false) == Folded(b, false);
}

bool IsSameSort(const icu::UnicodeString& a, const icu::UnicodeString& b) {
  UErrorCode status = U_ZERO_ERROR;
  const UChar32 first = a.char32At(0);
  const UChar32 second = b.char32At(0);
  return u_charType(first) == u_charType(second) &&
         uscript_getScript(first, &status) == uscript_getScript(second, &status);
}

// Each slip takes the characters of a word and a position at which there is a letter; it gives
// false where it cannot happen.
using Slip = bool (*)(Letters& word, std::size_t at, const Letters& alphabet, std::size_t choice);

bool LeaveOut(Letters& word, std::size_t at, const Letters&, std::size_t) {
  word.erase(word.begin() + static_cast<std::ptrdiff_t>(at));
  return true;
}

bool Double(Letters& word, std::size_t at, const Letters&, std::size_t) {
  const icu::UnicodeString letter = word[at];
  word.insert(word.begin() + static_cast<std::ptrdiff_t>(at), letter);
  return true;
}

bool Replace(Letters& word, std::size_t at, const Letters& alphabet, std::size_t choice) {
  for (std::size_t i = 0; i < alphabet.size(); ++i) {
    const icu::UnicodeString& other = alphabet[(choice + i) % alphabet.size()];
    if (!IsSameSort(word[at], other) || IsSame(word[at], other)) continue;
    word[at] = other;
    return true;
  }
  return false;
}

bool Swap(Letters& word, std::size_t at, const Letters&, std::size_t) {
  const std::size_t next = at + 1;
  if (next == word.size() || !IsLetter(word[next]) || IsSame(word[at], word[next])) return false;
  std::swap(word[at], word[next]);
  return true;
}

constexpr Slip kSlips[] = {LeaveOut, Double, Replace, Swap};

// The word with the slip at the first position from a certain one on at which it can happen.
std::optional<icu::UnicodeString> Mistyped(const Letters& word, std::size_t slip,
                                           const Letters& alphabet) {
  const std::size_t hash = HashOf(Joined(word), slip);
  for (std::size_t i = 0; i < word.size(); ++i) {
    const std::size_t at = (hash + i) % word.size();
    Letters mistyped = word;
    if (IsLetter(word[at]) && kSlips[slip](mistyped, at, alphabet, hash / word.size())) {
      return Joined(mistyped);
    }
  }
  return std::nullopt;
}

std::vector<Range> Units(const icu::UnicodeString& title, const Language& language) {
  if (HasUnspaced(title)) return {{0, title.length()}};
  return Words(title, language.locale);
}

}  // namespace

std::vector<Typed> TypeWithTypo(const Item& item, const Language& language) {
  const icu::UnicodeString title = FromUtf8(item.title);
  std::vector<Typed> typed;
  for (const Range& unit : Units(title, language)) {
    const icu::UnicodeString word(title, unit.start, unit.length);
    const Letters letters = Characters(word);
    if (std::count_if(letters.begin(), letters.end(), IsLetter) <
        static_cast<std::ptrdiff_t>(kLeastLetters)) {
      continue;
    }
    for (std::size_t slip = 0; slip < std::size(kSlips); ++slip) {
      const auto mistyped = Mistyped(letters, slip, language.letters);
      if (!mistyped) continue;
      icu::UnicodeString whole(title);
      typed.push_back({whole.replace(unit.start, unit.length, *mistyped), title});
      typed.push_back({*mistyped, word});
    }
  }
  return typed;
}

}  // namespace bench::quality
