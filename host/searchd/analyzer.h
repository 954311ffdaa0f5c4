// From text to words: the same cutting and folding for documents and for queries.
#pragma once

#include <unicode/brkiter.h>
#include <unicode/coll.h>

#include <memory>
#include <string>
#include <vector>

#include "host/searchd/language.h"
#include "host/searchd/mapping.h"

namespace searchd {

// A word in its folded form and in the form without accents; the two are often equal.
struct Word {
  std::string raw;
  std::string plain;
};

// Holds break iterators, which remember a text: one thread at a time.
class Analyzer {
 public:
  explicit Analyzer(const Language& language);

  // The words of a text under a field's rule, before a step "ngram", in the order of the text.
  std::vector<Word> Words(const FieldRule& rule, const std::string& text);

  // A whole text as one folded, accent-free word with single spaces, to compare titles with.
  std::string WholeText(const std::string& text) const;

  // Bytes that order texts as the language's dictionaries do.
  std::string SortKey(const std::string& text) const;

 private:
  std::vector<Word> StandardWords(const icu::UnicodeString& folded);
  std::vector<Word> WhiteSpaceWords(const icu::UnicodeString& text, bool folded) const;

  Language language_;
  std::unique_ptr<icu::BreakIterator> breaks_;
  std::unique_ptr<icu::Collator> collator_;
};

// The n-grams that a word is indexed by: all its parts of up to three characters. Single
// characters only of scripts in which one says something.
std::vector<std::string> IndexGrams(const std::string& word);

// The n-grams that together stand for a typed part of a word: itself up to three characters, its
// parts of three beyond. Each is among IndexGrams of any word that contains the part.
std::vector<std::string> QueryGrams(const std::string& part);

// The parts of a text that white space separates.
std::vector<std::string> SplitWhiteSpace(const std::string& text);

}  // namespace searchd
