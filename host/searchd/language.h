// The language of an index.
#pragma once

#include <string>

namespace searchd {

struct Language {
  std::string locale;   // as ICU names it; empty: no particular language
  std::string stemmer;  // as Xapian names it; empty: none
  bool turkic = false;  // I and i are two letters: I folds to dotless i, dotted I to i
};

// The language that the code after the last "_" of an index id names, such as "ger" in
// "appindex_ger"; no language for any other id.
Language LanguageOfIndex(const std::string& index_id);

}  // namespace searchd
