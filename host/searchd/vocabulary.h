// The words and titles of an index, kept in memory to look through for what is nearly what was
// typed.
#pragma once

#include <xapian.h>

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "host/searchd/planner.h"

namespace searchd {

// A text as what people take for its letters: each with the marks that go with it, as one number.
// The same letter is the same number in any text.
std::u32string Letters(const std::string& utf8);

class Vocabulary {
 public:
  // Reads the terms of the members that are searched.
  Vocabulary(const Xapian::Database& database, const std::vector<Field>& fields);

  // What is looked for. Texts that lack one of the letters `some_of`, or two where one may be
  // lacking, are passed over; of the others `accept` says whether they are wanted.
  struct Wanted {
    const std::u32string& some_of;
    bool may_lack_one;
    std::function<bool(const std::u32string& letters)> accept;
  };

  // The terms of the wanted words of field `field`, by its place among the fields; not more than
  // are looked for at once.
  std::vector<std::string> FindWords(std::size_t field, const Wanted& wanted) const;

  // The terms of wanted titles, which have neither accents nor spaces.
  std::vector<std::string> FindTitles(const Wanted& wanted) const;

 private:
  class Shelf {
   public:
    // Adds all terms that begin with `prefix`.
    void Read(const Xapian::Database& database, const std::string& prefix);
    std::vector<std::string> Find(const Wanted& wanted) const;

   private:
    std::vector<std::string> terms_;
    std::vector<std::u32string> letters_;   // of what follows the prefix of each term
    std::vector<std::uint64_t> summaries_;  // of the letters, to pass most of them over quickly
  };

  std::vector<Shelf> words_;  // by field
  Shelf titles_;
};

}  // namespace searchd
