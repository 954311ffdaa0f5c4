// The words and titles of an index, kept in memory to look through for what is nearly what was
// typed.
#pragma once

#include <xapian.h>

#include <cstdint>
#include <functional>
#include <set>
#include <string>
#include <vector>

#include "host/searchd/planner.h"

namespace searchd {

// A text as what people take for its letters: each with the marks that go with it, as one number.
// The same letter is the same number in any text.
std::u32string Letters(const std::string& utf8);

// Adds those terms of a document that a vocabulary may have to know.
void AddWordsAndTitles(std::set<std::string>& terms, const Xapian::Document& document);

class Vocabulary {
 public:
  // Reads the terms of the members that are searched.
  Vocabulary(const Xapian::Database& database, const std::vector<Field>& fields);

  // Adds terms that documents have brought with them. Terms that went with documents stay, which
  // finds nothing but costs time: returns false when so much was added that reading it all anew is
  // the better way.
  bool Learn(const std::set<std::string>& terms);

  // What is looked for: texts that hold these letters in a row, as they are or but for one edit.
  // Most others are passed over; of those that are left `worth` says what they are worth, 0 for
  // nothing.
  struct Wanted {
    const std::u32string& letters;
    bool but_for_one_edit;
    std::function<double(const std::u32string& text)> worth;
  };
  struct Found {
    std::string term;
    double worth;
  };

  // The terms of the wanted words of field `field`, by its place among the fields; where there are
  // more than are looked for at once, those that are worth most.
  std::vector<Found> FindWords(std::size_t field, const Wanted& wanted) const;

  // The same for titles, which have neither accents nor spaces.
  std::vector<Found> FindTitles(const Wanted& wanted) const;

 private:
  class Shelf {
   public:
    // Adds all terms that begin with `prefix`, in the order of prefixes.
    void Read(const Xapian::Database& database, const std::string& prefix);
    // Adds those of the terms that begin with a prefix that was read and are not known yet.
    void Learn(const std::set<std::string>& terms);
    std::vector<Found> Find(const Wanted& wanted) const;
    std::size_t Size() const { return terms_.size(); }

   private:
    bool Knows(const std::string& term) const;
    void Add(const std::string& term, const std::string& prefix);

    std::vector<std::string> prefixes_;
    std::set<std::string> learnt_;
    std::vector<std::string> terms_;  // those that were read in order, behind them those in learnt_
    std::vector<std::u32string> letters_;   // of what follows the prefix of each term
    std::vector<std::uint64_t> summaries_;  // of the letters, to pass most of them over quickly
  };

  std::vector<Shelf> words_;  // by field
  Shelf titles_;
  std::size_t learnt_ = 0;  // how many terms were given to Learn
};

}  // namespace searchd
