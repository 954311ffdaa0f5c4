#include "host/searchd/vocabulary.h"

#include <unicode/uchar.h>
#include <unicode/unistr.h>

#include <algorithm>
#include <cstdint>
#include <utility>

#include "host/searchd/terms.h"

namespace searchd {
namespace {

// More terms than this are not asked for in place of one that was typed.
constexpr std::size_t kMaxFound = 200;

constexpr std::uint32_t kNotACharacter = 0x80000000;

bool IsMark(UChar32 c) { return (U_GET_GC_MASK(c) & U_GC_M_MASK) != 0; }

// A letter with marks, as a number that is no character's.
char32_t WithMark(char32_t letter, UChar32 mark) {
  constexpr std::uint32_t kPrime = 0x01000193;
  return static_cast<char32_t>(((letter ^ static_cast<std::uint32_t>(mark)) * kPrime) |
                               kNotACharacter);
}

// A bit for each letter; several letters may share one.
std::uint64_t Summary(const std::u32string& letters) {
  constexpr std::uint32_t kSpread = 0x9E3779B1;
  std::uint64_t summary = 0;
  for (const char32_t letter : letters) {
    summary |= std::uint64_t{1} << ((static_cast<std::uint32_t>(letter) * kSpread) >> 26U);
  }
  return summary;
}

bool HasSeveralBits(std::uint64_t bits) { return (bits & (bits - 1)) != 0; }

bool IsAscii(const std::string& text) {
  return std::all_of(text.begin(), text.end(), [](char c) { return (c & 0x80) == 0; });
}

}  // namespace

std::u32string Letters(const std::string& utf8) {
  if (IsAscii(utf8)) return {utf8.begin(), utf8.end()};
  const icu::UnicodeString text = icu::UnicodeString::fromUTF8(utf8);
  std::u32string letters;
  for (int32_t i = 0; i < text.length(); i = text.moveIndex32(i, 1)) {
    const UChar32 c = text.char32At(i);
    if (IsMark(c) && !letters.empty()) {
      letters.back() = WithMark(letters.back(), c);
    } else {
      letters.push_back(static_cast<char32_t>(c));
    }
  }
  return letters;
}

void AddWordsAndTitles(std::set<std::string>& terms, const Xapian::Document& document) {
  for (auto term = document.termlist_begin(); term != document.termlist_end(); ++term) {
    if (IsWordOrTitle(*term)) terms.insert(*term);
  }
}

Vocabulary::Vocabulary(const Xapian::Database& database, const std::vector<Field>& fields) {
  titles_.Read(database, kSkeletonPrefix);
  for (const Field& field : fields) {
    Shelf words;
    words.Read(database, FieldPrefix(field.member, Space::kPlainWords));
    words.Read(database, FieldPrefix(field.member, Space::kWords));
    words_.push_back(std::move(words));
  }
}

std::vector<Vocabulary::Found> Vocabulary::FindWords(std::size_t field,
                                                     const Wanted& wanted) const {
  return words_[field].Find(wanted);
}

std::vector<Vocabulary::Found> Vocabulary::FindTitles(const Wanted& wanted) const {
  return titles_.Find(wanted);
}

bool Vocabulary::Learn(const std::set<std::string>& terms) {
  std::size_t size = titles_.Size();
  for (const Shelf& words : words_) size += words.Size();
  learnt_ += terms.size();
  if (learnt_ > size) return false;
  titles_.Learn(terms);
  for (Shelf& words : words_) words.Learn(terms);
  return true;
}

void Vocabulary::Shelf::Read(const Xapian::Database& database, const std::string& prefix) {
  for (auto term = database.allterms_begin(prefix); term != database.allterms_end(prefix); ++term) {
    Add(*term, prefix);
  }
  prefixes_.push_back(prefix);
}

void Vocabulary::Shelf::Learn(const std::set<std::string>& terms) {
  for (const std::string& prefix : prefixes_) {
    for (auto term = terms.lower_bound(prefix);
         term != terms.end() && term->compare(0, prefix.size(), prefix) == 0; ++term) {
      if (Knows(*term)) continue;
      Add(*term, prefix);
      learnt_.insert(*term);
    }
  }
}

bool Vocabulary::Shelf::Knows(const std::string& term) const {
  const auto read_end = terms_.end() - static_cast<std::ptrdiff_t>(learnt_.size());
  return std::binary_search(terms_.begin(), read_end, term) || learnt_.count(term) != 0;
}

void Vocabulary::Shelf::Add(const std::string& term, const std::string& prefix) {
  terms_.push_back(term);
  letters_.push_back(Letters(term.substr(prefix.size())));
  summaries_.push_back(Summary(letters_.back()));
}

std::vector<Vocabulary::Found> Vocabulary::Shelf::Find(const Wanted& wanted) const {
  const std::uint64_t needed = Summary(wanted.letters);
  std::vector<Found> found;
  for (std::size_t i = 0; i < terms_.size(); ++i) {
    const std::uint64_t lacking = needed & ~summaries_[i];
    if (wanted.but_for_one_edit ? HasSeveralBits(lacking) : lacking != 0) continue;
    const double worth = wanted.worth(letters_[i]);
    if (worth > 0) found.push_back({terms_[i], worth});
  }
  if (found.size() > kMaxFound) {
    std::stable_sort(found.begin(), found.end(),
                     [](const Found& a, const Found& b) { return a.worth > b.worth; });
    found.resize(kMaxFound);
  }
  return found;
}

}  // namespace searchd
