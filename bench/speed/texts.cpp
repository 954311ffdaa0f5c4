#include "bench/speed/texts.h"

#include <algorithm>
#include <cctype>
#include <numeric>
#include <set>
#include <sstream>
#include <utility>

namespace bench {
namespace {

constexpr std::size_t kWords = 4000;
constexpr std::size_t kKeywords = 5;

std::vector<std::string> SplitBlanks(const char* text) {
  std::istringstream stream(text);
  std::vector<std::string> parts;
  for (std::string part; stream >> part;) parts.push_back(part == "-" ? "" : part);
  return parts;
}

// A kind of words, ready to make some.
class WordMaker {
 public:
  explicit WordMaker(const Syllables& syllables) : least_(syllables.least), most_(syllables.most) {
    for (const char* part : {syllables.onsets, syllables.nuclei, syllables.codas}) {
      if (*part != '\0') parts_.push_back(SplitBlanks(part));
    }
  }

  std::string Make(Random& random) const {
    std::string word;
    for (std::size_t left = random.Between(least_, most_); left > 0; --left) {
      for (const std::vector<std::string>& part : parts_) word += part[random.Below(part.size())];
    }
    return word;
  }

 private:
  std::size_t least_;
  std::size_t most_;
  std::vector<std::vector<std::string>> parts_;
};

std::vector<WordMaker> MakersOf(const Writing& writing) {
  return {writing.kinds.begin(), writing.kinds.end()};
}

std::uint64_t Seed(const std::string& text) {
  return std::accumulate(text.begin(), text.end(), std::uint64_t{0},
                         [](std::uint64_t seed, char c) { return seed * 131 + std::size_t(c); });
}

void Capitalize(std::string& text) {
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (i == 0 || text[i - 1] == ' ') {
      const auto c = static_cast<unsigned char>(text[i]);
      if (c < 0x80) text[i] = static_cast<char>(std::toupper(c));
    }
  }
}

std::vector<std::size_t> Ranks(Random& random, std::size_t least, std::size_t most) {
  std::vector<std::size_t> ranks(random.Between(least, most));
  for (std::size_t& rank : ranks) rank = random.Rank(kWords);
  return ranks;
}

std::string ApplicationId(std::size_t application) {
  return "SYS.Application" + std::to_string(application) + ".Instance";
}

}  // namespace

std::vector<std::string> Characters(const std::string& text) {
  std::vector<std::string> characters;
  for (const char c : text) {
    const bool continues = (static_cast<unsigned char>(c) & 0xC0U) == 0x80U;
    if (continues && !characters.empty()) {
      characters.back() += c;
    } else {
      characters.emplace_back(1, c);
    }
  }
  return characters;
}

Vocabulary::Vocabulary(const std::string& lang) : writing_(WritingOf(lang)) {
  Random random(Seed(lang));
  const std::vector<WordMaker> makers = MakersOf(writing_);
  std::set<std::string> known;
  while (words_.size() < kWords) {
    std::string word = makers[random.Below(makers.size())].Make(random);
    if (known.insert(word).second) words_.push_back(std::move(word));
  }
}

std::string Vocabulary::Join(const std::vector<std::size_t>& ranks) const {
  std::string text;
  for (const std::size_t rank : ranks) {
    if (!text.empty()) text += writing_.separator;
    text += words_[rank];
  }
  return text;
}

std::string Vocabulary::Unknown(Random& random) const {
  const std::vector<WordMaker> makers = MakersOf(writing_);
  for (;;) {
    std::string word = makers.front().Make(random) + makers.front().Make(random);
    if (std::find(words_.begin(), words_.end(), word) == words_.end()) return word;
  }
}

Item MakeItem(std::size_t application, std::size_t item) {
  Random random(application * kItemsPerApplication + item);
  Item made;
  made.id = ApplicationId(application);
  if (item > 0) {
    made.owner = made.id;
    made.id += "?page=" + std::to_string(item);
  }
  made.title = Ranks(random, 1, 4);
  made.desc = Ranks(random, 8, 20);
  for (std::size_t i = 0; i < kKeywords; ++i) {
    // Most keywords of a descriptor have no weight of their own.
    const int weight = random.Below(3) == 0 ? static_cast<int>(random.Between(2, 5)) : 1;
    made.keywords.push_back({random.Rank(kWords), weight});
  }
  return made;
}

Texts::Texts(std::vector<std::string> langs) : langs_(std::move(langs)), english_("enu") {
  for (const std::string& lang : langs_) vocabularies_.emplace_back(lang);
}

Json::Value Texts::Document(std::size_t lang, const Item& item) const {
  const Vocabulary& words = vocabularies_[lang];
  std::string title = words.Join(item.title);
  std::string desc = words.Join(item.desc);
  std::string keywords = english_.Join(item.title);
  Capitalize(title);
  Capitalize(keywords);
  keywords += ' ';
  for (const Item::Keyword& keyword : item.keywords) {
    const std::string pair = words.Word(keyword.word) + " " + english_.Word(keyword.word) + " ";
    for (int i = 0; i < keyword.weight; ++i) keywords += pair;
  }
  Json::Value document(Json::objectValue);
  document["id"] = item.id;
  document["owner"] = item.owner;
  document["title"] = title;
  document["desc"] = std::move(desc);
  document["keywords"] = std::move(keywords);
  document["search_title"] = std::move(title);
  return document;
}

}  // namespace bench
