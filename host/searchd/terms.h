// The terms that a document is indexed by. They begin with a byte that tells what they are:
//   "Q"              the key of the document
//   "A"              alone: the document is an application, not a part of one
//   "="              whole titles, "-" those without accents, "_" those without marks, "~" those
//                    without spaces and punctuation
//   "N"              the first words of the keywords, with which an application's English name
//   begins 0x80 + length    what stands in a member, the length being that of its name, which
//   follows, and
//                    then its Space; 0x80 alone stands for all members that the mapping does not
//                    name
#pragma once

#include <string>

namespace searchd {

std::string KeyTerm(const std::string& document_id);

constexpr char kApplicationTerm[] = "A";
constexpr char kTitlePrefix[] = "=";
constexpr char kPlainTitlePrefix[] = "-";
constexpr char kBareTitlePrefix[] = "_";
constexpr char kSkeletonPrefix[] = "~";
constexpr char kNamePrefix[] = "N";
constexpr char kTitleBeginningPrefix[] = "(";
constexpr char kPlainTitleBeginningPrefix[] = ")";
constexpr char kNameBeginningPrefix[] = "n";

// What the terms of a member are. Forms without accents and without marks are kept apart, and only
// where they differ, so that what is spelt as it was typed can come first.
enum class Space : char {
  kWords = 'w',
  kPlainWords = 'W',
  kBareWords = 'B',
  kBeginnings = 'b',  // of words, see Beginnings
  kPlainBeginnings = 'P',
  kStems = 's',
  kPairs = 'p',  // two words that follow each other
  kGrams = 'g',
  kPlainGrams = 'G',
  kLongGrams = 'l',
  kPlainLongGrams = 'L',
};

// How long n-grams are. In titles any part is found as it is: the long ones tell where its
// characters stand, and the short ones spare the shortest parts a look at all the long ones that
// begin so. In longer texts n-grams of three characters have to do.
constexpr std::size_t kShortGram = 2;
constexpr std::size_t kTextGram = 3;
constexpr std::size_t kLongGram = 8;

constexpr Space kSpaces[] = {Space::kWords,      Space::kPlainWords,      Space::kBareWords,
                             Space::kBeginnings, Space::kStems,           Space::kPairs,
                             Space::kGrams,      Space::kPlainBeginnings, Space::kLongGrams,
                             Space::kPlainGrams, Space::kPlainLongGrams};

// `member` is empty for all members that the mapping does not name.
std::string FieldPrefix(const std::string& member, Space space);

// The term of a word. A word too long for a term is cut, and told from others that begin alike.
std::string WordTerm(const std::string& prefix, const std::string& word);

// What the terms of all words that begin with `beginning` begin with.
std::string WordTermBeginning(const std::string& prefix, const std::string& beginning);

// Whether a term is that of a word, with or without accents, or of a title without spaces.
bool IsWordOrTitle(const std::string& term);

// Two words that follow each other, as one.
std::string Pair(const std::string& first, const std::string& second);

}  // namespace searchd
