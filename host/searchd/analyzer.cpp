#include "host/searchd/analyzer.h"

#include <unicode/uchar.h>
#include <unicode/utf8.h>

#include <stdexcept>

#include "host/searchd/folding.h"

namespace searchd {
namespace {

using icu::UnicodeString;

constexpr std::size_t kGramSize = 3;
// Below this are the alphabets in which a single letter says nothing; from Thai on it does.
constexpr UChar32 kFirstTellingCharacter = 0x0E00;

UnicodeString FromUtf8(const std::string& text) { return UnicodeString::fromUTF8(text); }

std::vector<UnicodeString> Split(const UnicodeString& text) {
  std::vector<UnicodeString> parts;
  int32_t start = 0;
  for (int32_t i = 0; i <= text.length(); ++i) {
    if (i < text.length() && u_isUWhiteSpace(text[i]) == 0) continue;
    if (i > start) parts.push_back(UnicodeString(text, start, i - start));
    start = i + 1;
  }
  return parts;
}

Word MakeWord(const UnicodeString& folded) {
  return {ToUtf8(folded), ToUtf8(WithoutAccents(folded))};
}

// The byte offsets at which the characters of a word begin, and its end.
std::vector<std::size_t> CharacterBounds(const std::string& word) {
  std::vector<std::size_t> bounds;
  for (std::size_t i = 0; i < word.size(); ++i) {
    if (!U8_IS_TRAIL(static_cast<uint8_t>(word[i]))) bounds.push_back(i);
  }
  bounds.push_back(word.size());
  return bounds;
}

bool IsTelling(const std::string& character) {
  UChar32 c = 0;
  int32_t at = 0;
  U8_NEXT(reinterpret_cast<const uint8_t*>(character.data()), at,
          static_cast<int32_t>(character.size()), c);
  return c >= kFirstTellingCharacter;
}

}  // namespace

Analyzer::Analyzer(const Language& language) : language_(language) {
  const icu::Locale locale(language.locale.c_str());
  UErrorCode status = U_ZERO_ERROR;
  breaks_.reset(icu::BreakIterator::createWordInstance(locale, status));
  collator_.reset(icu::Collator::createInstance(locale, status));
  if (U_FAILURE(status)) {
    throw std::runtime_error("no text analysis for locale \"" + language.locale +
                             "\": " + u_errorName(status));
  }
}

std::vector<Word> Analyzer::Words(const FieldRule& rule, const std::string& text) {
  const UnicodeString unicode = FromUtf8(text);
  switch (rule.analyzer) {
    case AnalyzerKind::kStandard:
      return StandardWords(Fold(unicode, language_.turkic));
    case AnalyzerKind::kWhiteSpace:
      return rule.lower_case ? WhiteSpaceWords(Fold(unicode, language_.turkic), true)
                             : WhiteSpaceWords(unicode, false);
    case AnalyzerKind::kKeyword:
      break;
  }
  if (text.empty()) return {};
  if (rule.lower_case) return {MakeWord(Fold(unicode, language_.turkic))};
  return {{text, text}};
}

std::vector<Word> Analyzer::StandardWords(const UnicodeString& folded) {
  std::vector<Word> words;
  breaks_->setText(folded);
  int32_t start = breaks_->first();
  for (int32_t end = breaks_->next(); end != icu::BreakIterator::DONE; end = breaks_->next()) {
    if (breaks_->getRuleStatus() >= UBRK_WORD_NONE_LIMIT) {
      words.push_back(MakeWord(UnicodeString(folded, start, end - start)));
    }
    start = end;
  }
  return words;
}

std::vector<Word> Analyzer::WhiteSpaceWords(const UnicodeString& text, bool folded) const {
  std::vector<Word> words;
  for (const UnicodeString& part : Split(text)) {
    if (folded) {
      words.push_back(MakeWord(part));
    } else {
      words.push_back({ToUtf8(part), ToUtf8(part)});
    }
  }
  return words;
}

std::string Analyzer::WholeText(const std::string& text) const {
  std::string whole;
  for (const UnicodeString& part : Split(Fold(FromUtf8(text), language_.turkic))) {
    if (!whole.empty()) whole += ' ';
    whole += ToUtf8(WithoutAccents(part));
  }
  return whole;
}

std::string Analyzer::SortKey(const std::string& text) const {
  const UnicodeString unicode = FromUtf8(text);
  std::string key(128, '\0');
  for (;;) {
    const auto room = static_cast<int32_t>(key.size());
    // The length counts the NUL at the end, which parts the key from what is put behind it.
    const int32_t size =
        collator_->getSortKey(unicode, reinterpret_cast<uint8_t*>(key.data()), room);
    key.resize(static_cast<std::size_t>(size));
    if (size <= room) return key;
  }
}

std::vector<std::string> IndexGrams(const std::string& word) {
  std::vector<std::string> grams;
  const std::vector<std::size_t> bounds = CharacterBounds(word);
  const std::size_t characters = bounds.size() - 1;
  for (std::size_t i = 0; i < characters; ++i) {
    for (std::size_t size = 1; size <= kGramSize && i + size <= characters; ++size) {
      std::string gram = word.substr(bounds[i], bounds[i + size] - bounds[i]);
      if (size > 1 || IsTelling(gram)) grams.push_back(std::move(gram));
    }
  }
  return grams;
}

std::vector<std::string> QueryGrams(const std::string& part) {
  const std::vector<std::size_t> bounds = CharacterBounds(part);
  const std::size_t characters = bounds.size() - 1;
  if (characters <= kGramSize) return {part};
  std::vector<std::string> grams;
  for (std::size_t i = 0; i + kGramSize <= characters; ++i) {
    grams.push_back(part.substr(bounds[i], bounds[i + kGramSize] - bounds[i]));
  }
  return grams;
}

std::vector<std::string> SplitWhiteSpace(const std::string& text) {
  std::vector<std::string> parts;
  for (const UnicodeString& part : Split(FromUtf8(text))) parts.push_back(ToUtf8(part));
  return parts;
}

}  // namespace searchd
