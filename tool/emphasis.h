// Showing a reader where in a text the words are that were searched for.
#pragma once

#include <string>
#include <vector>

namespace tool {

// How a text was found by what was typed.
enum class Likeness {
  kSame,  // it is written there
  kForm,  // another form of the word is, such as "photo" for "photos"
  kSlip,  // what differs in one letter is
};

struct Sought {
  std::string text;
  Likeness likeness = Likeness::kSame;
};

// `text` with the words of what was sought emphasised wherever a word of it begins with one, or,
// where none does, wherever they stand. Case, accents and width do not matter, as for the search
// itself. A word that is not there gives way to those that are most like it in the way that is
// said. All texts are UTF-8.
std::string Emphasised(const std::string& text, const std::vector<Sought>& sought);

}  // namespace tool
