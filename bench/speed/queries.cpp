#include "bench/speed/queries.h"

#include <algorithm>
#include <numeric>
#include <utility>

namespace bench {
namespace {

constexpr std::size_t kQueriesPerKind = 12;
constexpr std::size_t kMinLettersForTypo = 4;

std::string Part(const std::vector<std::string>& characters, std::size_t begin, std::size_t size) {
  const auto from = characters.begin() + static_cast<std::ptrdiff_t>(begin);
  const std::size_t to = std::min(size, characters.size() - begin);
  return std::accumulate(from, from + static_cast<std::ptrdiff_t>(to), std::string());
}

// Makes the queries about one item in one language.
class Typist {
 public:
  Typist(const Texts& texts, std::size_t lang, const Item& item, Random& random)
      : words_(texts.Words(lang)),
        item_(item),
        title_(texts.Document(lang, item)["title"].asString()),
        random_(random) {}

  std::string Type(std::size_t kind) {
    switch (kind) {
      case 0:
        return title_;
      case 1:
        return TitleWord();
      case 2:
        return Part(Characters(title_), 0, random_.Between(2, 6));
      case 3:
        return InsideWord();
      case 4:
        return Keyword();
      case 5:
        return TitleWord() + " " + Keyword();
      case 6:
        return Typo();
      default:
        return words_.Unknown(random_);
    }
  }

 private:
  const std::string& TitleWord() {
    return words_.Word(item_.title[random_.Below(item_.title.size())]);
  }

  const std::string& Keyword() {
    return words_.Word(item_.keywords[random_.Below(item_.keywords.size())].word);
  }

  // From the second letter on; a word of one letter has no inside and is asked for as it is.
  std::string InsideWord() {
    const std::vector<std::string> letters = Characters(TitleWord());
    if (letters.size() < 2) return letters.front();
    const std::size_t begin = random_.Between(1, std::max<std::size_t>(1, letters.size() / 2));
    return Part(letters, begin, random_.Between(2, 5));
  }

  // Two neighbours change places, in a word that is long enough to be known nevertheless.
  std::string Typo() {
    std::vector<std::string> letters = Characters(TitleWord());
    if (letters.size() < kMinLettersForTypo) letters = Characters(title_);
    if (letters.size() > 1) std::swap(letters[letters.size() / 2 - 1], letters[letters.size() / 2]);
    return Part(letters, 0, letters.size());
  }

  const Vocabulary& words_;
  const Item& item_;
  const std::string title_;
  Random& random_;
};

}  // namespace

std::vector<Query> MakeQueries(const Texts& texts, std::size_t applications) {
  std::vector<Query> queries;
  Random random(applications);
  for (std::size_t i = 0; i < kQueriesPerKind; ++i) {
    for (std::size_t lang = 0; lang < texts.Langs().size(); ++lang) {
      for (std::size_t kind = 0; kind < kQueryKinds.size(); ++kind) {
        const Item item = MakeItem(random.Below(applications), random.Below(kItemsPerApplication));
        queries.push_back({lang, kind, Typist(texts, lang, item, random).Type(kind)});
      }
    }
  }
  return queries;
}

}  // namespace bench
