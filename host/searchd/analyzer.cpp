#include "host/searchd/analyzer.h"

#include <unicode/uchar.h>
#include <unicode/utf8.h>

#include <algorithm>
#include <stdexcept>

#include "host/searchd/folding.h"

namespace searchd {
namespace {

using icu::UnicodeString;

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
  const UnicodeString plain = WithoutAccents(folded);
  return {ToUtf8(folded), ToUtf8(plain), ToUtf8(WithoutMarks(plain))};
}

Word Unfolded(const std::string& text) { return {text, text, text}; }

// The byte offsets at which the characters of a word begin, and its end.
std::vector<std::size_t> CharacterBounds(const std::string& word) {
  std::vector<std::size_t> bounds;
  for (std::size_t i = 0; i < word.size(); ++i) {
    if (!U8_IS_TRAIL(static_cast<uint8_t>(word[i]))) bounds.push_back(i);
  }
  bounds.push_back(word.size());
  return bounds;
}

bool IsDenseCharacter(const std::string& character) {
  return IsDense(FromUtf8(character).char32At(0));
}

icu::Locale LocaleOf(const Language& language) { return icu::Locale(language.locale.c_str()); }

void ThrowFailure(const Language& language, UErrorCode status) {
  if (U_SUCCESS(status)) return;
  throw std::runtime_error("no text analysis for locale \"" + language.locale +
                           "\": " + u_errorName(status));
}

}  // namespace

Analyzer::Analyzer(const Language& language) : language_(language), stem_(language.stemmer) {
  UErrorCode status = U_ZERO_ERROR;
  breaks_.reset(icu::BreakIterator::createWordInstance(LocaleOf(language), status));
  ThrowFailure(language, status);
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
  return {Unfolded(text)};
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
      words.push_back(Unfolded(ToUtf8(part)));
    }
  }
  return words;
}

std::vector<std::string> Analyzer::Stems(const Word& word) const {
  if (stem_.is_none() || !DenseCharacters(word.raw).empty()) return {};
  // Stemmers look for accents, and people leave them out.
  std::vector<std::string> stems = {
      ToUtf8(WithoutAccents(FromUtf8(stem_(word.raw)))),
      stem_(word.plain),
  };
  if (stems[1] == stems[0]) stems.pop_back();
  return stems;
}

Word Analyzer::WholeText(const std::string& text) const {
  UnicodeString whole;
  for (const UnicodeString& part : Split(Fold(FromUtf8(text), language_.turkic))) {
    if (!whole.isEmpty()) whole.append(u' ');
    whole.append(part);
  }
  return MakeWord(whole);
}

std::string Analyzer::Skeleton(const std::string& text) const {
  const UnicodeString plain = WithoutAccents(Fold(FromUtf8(text), language_.turkic));
  UnicodeString skeleton;
  for (int32_t i = 0; i < plain.length(); i = plain.moveIndex32(i, 1)) {
    const UChar32 c = plain.char32At(i);
    if (u_isalnum(c) != 0 || (U_GET_GC_MASK(c) & U_GC_M_MASK) != 0) skeleton.append(c);
  }
  return ToUtf8(skeleton);
}

std::string Analyzer::SortKey(const std::string& text) {
  if (!collator_) {
    UErrorCode status = U_ZERO_ERROR;
    collator_.reset(icu::Collator::createInstance(LocaleOf(language_), status));
    ThrowFailure(language_, status);
  }
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

std::size_t CountCharacters(const std::string& text) { return CharacterBounds(text).size() - 1; }

std::vector<std::string> Beginnings(const std::string& text) {
  const std::vector<std::size_t> bounds = CharacterBounds(text);
  std::vector<std::string> beginnings;
  for (std::size_t n = 1; n <= kMaxBeginning && n < bounds.size(); ++n) {
    beginnings.push_back(text.substr(0, bounds[n]));
  }
  return beginnings;
}

std::vector<std::string> Grams(const std::string& word, std::size_t least, std::size_t most) {
  std::vector<std::string> grams;
  const std::vector<std::size_t> bounds = CharacterBounds(word);
  for (std::size_t i = 0; i + least < bounds.size(); ++i) {
    const std::size_t size = std::min(most, bounds.size() - 1 - i);
    grams.push_back(word.substr(bounds[i], bounds[i + size] - bounds[i]));
  }
  return grams;
}

std::vector<std::string> DenseCharacters(const std::string& word) {
  std::vector<std::string> characters = Grams(word, 1, 1);
  const auto says_little = [](const std::string& c) { return !IsDenseCharacter(c); };
  characters.erase(std::remove_if(characters.begin(), characters.end(), says_little),
                   characters.end());
  return characters;
}

std::vector<std::string> QueryGrams(const std::string& part, std::size_t most) {
  if (CountCharacters(part) <= most) return {part};
  return Grams(part, most, most);
}

std::string BehindApostrophe(const std::string& word) {
  constexpr std::size_t kLeastCharacters = 3;
  const std::size_t apostrophe = word.rfind('\'');
  if (apostrophe == std::string::npos) return {};
  std::string behind = word.substr(apostrophe + 1);
  return CountCharacters(behind) < kLeastCharacters ? std::string() : behind;
}

std::vector<std::string> SplitWhiteSpace(const std::string& text) {
  std::vector<std::string> parts;
  for (const UnicodeString& part : Split(FromUtf8(text))) parts.push_back(ToUtf8(part));
  return parts;
}

std::vector<std::string> DenseRuns(const std::string& folded) {
  const UnicodeString text = FromUtf8(folded);
  std::vector<std::string> runs;
  int32_t start = -1;
  for (int32_t i = 0; i <= text.length(); i = i < text.length() ? text.moveIndex32(i, 1) : i + 1) {
    // A mark belongs to the letter before it.
    const bool dense =
        i < text.length() && (IsDense(text.char32At(i)) ||
                              (start >= 0 && (U_GET_GC_MASK(text.char32At(i)) & U_GC_M_MASK) != 0));
    if (dense && start < 0) start = i;
    if (dense || start < 0) continue;
    runs.push_back(ToUtf8(UnicodeString(text, start, i - start)));
    start = -1;
  }
  return runs;
}

std::vector<Word> DenseRuns(const Word& text) {
  const std::vector<std::string> raw = DenseRuns(text.raw);
  const std::vector<std::string> plain = DenseRuns(text.plain);
  std::vector<Word> runs;
  // There are as many of both, as accents stand within a run or outside of all.
  for (std::size_t i = 0; i < std::min(raw.size(), plain.size()); ++i) {
    runs.push_back({raw[i], plain[i], {}});
  }
  return runs;
}

}  // namespace searchd
