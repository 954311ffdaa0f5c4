// The applications of a device that does not exist: the same ones in every run, in all languages.
#pragma once

#include <json/value.h>

#include <cstddef>
#include <string>
#include <vector>

#include "bench/speed/random.h"
#include "bench/speed/syllables.h"

namespace bench {

constexpr std::size_t kItemsPerApplication = 22;

// The characters of a UTF-8 text.
std::vector<std::string> Characters(const std::string& text);

// The made-up words of one language, ordered from the most common to the rarest.
class Vocabulary {
 public:
  explicit Vocabulary(const std::string& lang);

  const std::string& Word(std::size_t rank) const { return words_[rank]; }

  // Words as a text of the language.
  std::string Join(const std::vector<std::size_t>& ranks) const;

  // A word of the same letters that is not in the vocabulary.
  std::string Unknown(Random& random) const;

 private:
  const Writing& writing_;
  std::vector<std::string> words_;
};

// What an item is about, as ranks of words: the same ones in every language.
struct Item {
  struct Keyword {
    std::size_t word;
    int weight;
  };
  std::string id;
  std::string owner;
  std::vector<std::size_t> title;
  std::vector<std::size_t> desc;
  std::vector<Keyword> keywords;
};

// The first item of an application is the application itself, the others are its modules.
Item MakeItem(std::size_t application, std::size_t item);

// The texts of all languages; safe to read from several threads.
class Texts {
 public:
  explicit Texts(std::vector<std::string> langs);

  const std::vector<std::string>& Langs() const { return langs_; }
  const Vocabulary& Words(std::size_t lang) const { return vocabularies_[lang]; }

  // The document that the library would send for an item in a language.
  Json::Value Document(std::size_t lang, const Item& item) const;

 private:
  std::vector<std::string> langs_;
  std::vector<Vocabulary> vocabularies_;
  Vocabulary english_;
};

}  // namespace bench
