#include "bench/quality/kinds.h"

#include <set>

#include "appindex/utils_internal.h"
#include "bench/quality/text.h"
#include "bench/quality/typos.h"

namespace bench::quality {
namespace {

using icu::UnicodeString;

std::vector<Typed> TypeTitle(const Item& item, const Language&) {
  const UnicodeString title = FromUtf8(item.title);
  return {{title, title}};
}

std::vector<Typed> TypeWords(const Item& item, const Language& language) {
  const UnicodeString title = FromUtf8(item.title);
  std::vector<Typed> typed;
  for (const Range& range : Words(title, language.locale)) {
    const UnicodeString word(title, range.start, range.length);
    typed.push_back({word, word});
  }
  return typed;
}

// People who write with characters for whole syllables or words expect something from the first.
std::size_t ShortestPrefix(const Language& language) {
  static const std::set<std::string> kFromOne = {"chs", "cht", "jpn", "krn", "tha"};
  return kFromOne.count(language.code) != 0 ? 1 : 2;
}

std::vector<Typed> TypePrefixes(const Item& item, const Language& language) {
  std::vector<Typed> typed;
  UnicodeString prefix;
  std::size_t length = 0;
  for (const UnicodeString& character : Characters(FromUtf8(item.title))) {
    prefix.append(character);
    if (++length >= ShortestPrefix(language)) typed.push_back({prefix, prefix});
  }
  return typed;
}

// The parts of `length` characters, but for the one at the beginning.
void AppendInnerParts(std::vector<Typed>& typed, const std::vector<UnicodeString>& word,
                      std::size_t length) {
  for (std::size_t start = 1; start + length <= word.size(); ++start) {
    UnicodeString part;
    for (std::size_t i = 0; i < length; ++i) part.append(word[start + i]);
    typed.push_back({part, part});
  }
}

// The stretches of a text that are written without spaces, as characters.
std::vector<std::vector<UnicodeString>> UnspacedRuns(const UnicodeString& text) {
  std::vector<std::vector<UnicodeString>> runs(1);
  for (const UnicodeString& character : Characters(text)) {
    if (IsUnspaced(character)) {
      runs.back().push_back(character);
    } else if (!runs.back().empty()) {
      runs.emplace_back();
    }
  }
  return runs;
}

std::vector<Typed> TypeInside(const Item& item, const Language& language) {
  const UnicodeString title = FromUtf8(item.title);
  std::vector<Typed> typed;
  for (const auto& run : UnspacedRuns(title)) AppendInnerParts(typed, run, 2);
  for (const Range& range : Words(title, language.locale)) {
    const auto word = Characters(UnicodeString(title, range.start, range.length));
    if (IsUnspaced(word.front())) continue;
    if (IsHangul(word.front())) {
      AppendInnerParts(typed, word, 2);
      continue;
    }
    for (const std::size_t length : {3U, 4U, 5U}) AppendInnerParts(typed, word, length);
  }
  return typed;
}

std::vector<Typed> TypeKeywords(const Item& item, const Language&) {
  std::vector<Typed> typed;
  for (const std::string& keyword : item.keywords) {
    const UnicodeString text = FromUtf8(keyword);
    typed.push_back({text, text});
  }
  return typed;
}

std::vector<Typed> TypeEnglishTitle(const Item& item, const Language& language) {
  if (language.code == velkor::appindex::kEnglish) return {};
  const UnicodeString title = FromUtf8(item.english_title);
  return {{title, title}};
}

// A variant that is the title itself tells nothing new.
void AppendVariant(std::vector<Typed>& typed, const UnicodeString& variant,
                   const UnicodeString& title) {
  if (variant != title) typed.push_back({variant, title});
}

std::vector<Typed> TypeWithoutAccents(const Item& item, const Language&) {
  const UnicodeString title = FromUtf8(item.title);
  std::vector<Typed> typed;
  AppendVariant(typed, WithoutAccents(title), title);
  return typed;
}

std::vector<Typed> TypeUpperCase(const Item& item, const Language& language) {
  const UnicodeString title = FromUtf8(item.title);
  std::vector<Typed> typed;
  AppendVariant(typed, UnicodeString(title).toUpper(language.locale), title);
  AppendVariant(typed, UnicodeString(title).toUpper(icu::Locale::getRoot()), title);
  return typed;
}

// Hiragana both as input methods give it, with the long vowel mark, and with vowels in its place.
constexpr const char* kKanaAndWidth[] = {
    "[\\u30A1-\\u30FA] Katakana-Hiragana",
    "Katakana-Hiragana",
    "Hiragana-Katakana",
    "[A-Za-z0-9] Halfwidth-Fullwidth",
    "[\\u30A1-\\u30FE] Fullwidth-Halfwidth",
};

std::vector<Typed> TypeKanaAndWidth(const Item& item, const Language&) {
  const UnicodeString title = FromUtf8(item.title);
  std::vector<Typed> typed;
  for (const char* transliterator : kKanaAndWidth) {
    AppendVariant(typed, Transliterated(title, transliterator), title);
  }
  return typed;
}

}  // namespace

Language MakeLanguage(const std::string& code, const std::vector<Item>& items) {
  std::set<UnicodeString> letters;
  for (const Item& item : items) {
    for (const UnicodeString& character : Characters(FromUtf8(item.title))) {
      if (IsLetter(character)) letters.insert(character);
    }
  }
  return {code, LocaleOf(code), {letters.begin(), letters.end()}};
}

const std::array<Kind, kKindCount> kKinds = {{
    {"title", 99, Fit::kTitleContains, TypeTitle},
    {"word", 99, Fit::kTitleContains, TypeWords},
    {"prefix", 99, Fit::kTitleBegins, TypePrefixes},
    {"inside", 99, Fit::kTitleContains, TypeInside},
    {"keyword", 99, Fit::kTitleOrKeywordsContain, TypeKeywords},
    {"english", 99, Fit::kTitleOrKeywordsContain, TypeEnglishTitle},
    {"accents", 97, Fit::kTitleContains, TypeWithoutAccents},
    {"upper", 97, Fit::kTitleContains, TypeUpperCase},
    {"kana", 97, Fit::kTitleContains, TypeKanaAndWidth},
    {"typo", 95, Fit::kTitleContains, TypeWithTypo},
}};

}  // namespace bench::quality
