// What made-up words of a language are put together from.
#pragma once

#include <string>
#include <vector>

namespace bench {

// Each part is a list of texts with blanks between them, of which a syllable takes one; "-" is one
// that is not written.
struct Syllables {
  const char* onsets;
  const char* nuclei;
  const char* codas;
  unsigned least;  // syllables in a word
  unsigned most;
};

struct Writing {
  std::vector<Syllables> kinds;  // each word is of one of them
  const char* separator;         // between words
};

// Throws std::out_of_range for a language that the library does not know.
const Writing& WritingOf(const std::string& lang);

}  // namespace bench
