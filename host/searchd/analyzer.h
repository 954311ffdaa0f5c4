// From text to words: the same cutting and folding for documents and for queries.
#pragma once

#include <unicode/brkiter.h>
#include <unicode/coll.h>
#include <xapian.h>

#include <memory>
#include <string>
#include <vector>

#include "host/searchd/language.h"
#include "host/searchd/mapping.h"

namespace searchd {

// A word or a text in its folded form, in the form without accents, and in that without any marks.
// The three are often equal.
struct Word {
  std::string raw;
  std::string plain;
  std::string bare;
};

// Holds break iterators, which remember a text: one thread at a time.
class Analyzer {
 public:
  explicit Analyzer(const Language& language);

  // The words of a text under a field's rule, before a step "ngram", in the order of the text.
  std::vector<Word> Words(const FieldRule& rule, const std::string& text);

  // The stems of a word, without accents; none where the language has no stemmer, and none of words
  // in a script without spaces.
  std::vector<std::string> Stems(const Word& word) const;

  // A whole text as one folded word with single spaces, to compare titles with.
  Word WholeText(const std::string& text) const;

  // A whole text without accents, spaces and punctuation.
  std::string Skeleton(const std::string& text) const;

  // Bytes that order texts as the language's dictionaries do.
  std::string SortKey(const std::string& text);

 private:
  std::vector<Word> StandardWords(const icu::UnicodeString& folded);
  std::vector<Word> WhiteSpaceWords(const icu::UnicodeString& text, bool folded) const;

  Language language_;
  Xapian::Stem stem_;
  std::unique_ptr<icu::BreakIterator> breaks_;
  std::unique_ptr<icu::Collator> collator_;  // made when first needed
};

// How many characters a text of UTF-8 has.
std::size_t CountCharacters(const std::string& text);

// What a text begins with, one and two characters: what is typed first is looked up as a term, and
// not in all the terms that begin so.
constexpr std::size_t kMaxBeginning = 2;
std::vector<std::string> Beginnings(const std::string& text);

// The n-grams of a word: for each of its characters, what begins with it, `least` to `most`
// characters.
std::vector<std::string> Grams(const std::string& word, std::size_t least, std::size_t most);

// The characters of a word of which one alone says something.
std::vector<std::string> DenseCharacters(const std::string& word);

// Those n-grams of a word that together stand for a typed part of it, of `least` characters or
// more. One that is shorter than `most` is the beginning of an n-gram.
std::vector<std::string> QueryGrams(const std::string& part, std::size_t most);

// What stands behind an apostrophe that joins a short word to the next, as in "l'album"; empty for
// any other word, such as "anna's".
std::string BehindApostrophe(const std::string& word);

// The parts of a text that white space separates.
std::vector<std::string> SplitWhiteSpace(const std::string& text);

// The longest parts of a folded text that are in a script without spaces.
std::vector<std::string> DenseRuns(const std::string& folded);

// The same of a text with its form without accents; `bare` is left empty.
std::vector<Word> DenseRuns(const Word& text);

}  // namespace searchd
