#include "bench/quality/text.h"

#include <unicode/brkiter.h>
#include <unicode/normalizer2.h>
#include <unicode/translit.h>
#include <unicode/uchar.h>
#include <unicode/uscript.h>

#include <map>
#include <memory>
#include <stdexcept>

namespace bench::quality {
namespace {

const std::map<std::string, const char*> kLocales = {
    {"chs", "zh_Hans"}, {"cht", "zh_Hant"}, {"csy", "cs"}, {"dan", "da"}, {"enu", "en"},
    {"fre", "fr"},      {"ger", "de"},      {"hun", "hu"}, {"ita", "it"}, {"jpn", "ja"},
    {"krn", "ko"},      {"nld", "nl"},      {"nor", "nb"}, {"plk", "pl"}, {"ptb", "pt_BR"},
    {"ptg", "pt_PT"},   {"rus", "ru"},      {"spn", "es"}, {"sve", "sv"}, {"tha", "th"},
    {"trk", "tr"},
};

void Require(UErrorCode status, const char* what) {
  if (U_FAILURE(status)) throw std::runtime_error(std::string(what) + ": " + u_errorName(status));
}

std::vector<Range> Parts(std::unique_ptr<icu::BreakIterator> breaks,
                         const icu::UnicodeString& text) {
  std::vector<Range> parts;
  breaks->setText(text);
  int32_t start = breaks->first();
  for (int32_t end = breaks->next(); end != icu::BreakIterator::DONE; end = breaks->next()) {
    parts.push_back({start, end - start});
    start = end;
  }
  return parts;
}

template <typename Test>
bool AnyOf(const icu::UnicodeString& text, Test test) {
  for (int32_t i = 0; i < text.length(); i = text.moveIndex32(i, 1)) {
    if (test(text.char32At(i))) return true;
  }
  return false;
}

bool IsUnspacedCodePoint(UChar32 c) {
  // By what scripts it is used in: the long vowel mark belongs to both kana.
  return uscript_hasScript(c, USCRIPT_HAN) || uscript_hasScript(c, USCRIPT_HIRAGANA) ||
         uscript_hasScript(c, USCRIPT_KATAKANA) || uscript_hasScript(c, USCRIPT_THAI);
}

icu::UnicodeString KatakanaAsHiragana(const icu::UnicodeString& text) {
  constexpr UChar kFirst = 0x30A1;
  constexpr UChar kLast = 0x30F6;
  constexpr UChar kDistance = 0x60;
  icu::UnicodeString result(text);
  for (int32_t i = 0; i < result.length(); ++i) {
    const UChar unit = result.charAt(i);
    if (unit >= kFirst && unit <= kLast) {
      result.setCharAt(i, static_cast<UChar>(unit - kDistance));
    }
  }
  return result;
}

}  // namespace

icu::Locale LocaleOf(const std::string& lang) {
  const auto found = kLocales.find(lang);
  if (found == kLocales.end()) throw std::runtime_error("no such language: " + lang);
  return icu::Locale(found->second);
}

icu::UnicodeString FromUtf8(const std::string& text) { return icu::UnicodeString::fromUTF8(text); }

std::string ToUtf8(const icu::UnicodeString& text) {
  std::string utf8;
  text.toUTF8String(utf8);
  return utf8;
}

std::vector<icu::UnicodeString> Characters(const icu::UnicodeString& text) {
  UErrorCode status = U_ZERO_ERROR;
  std::unique_ptr<icu::BreakIterator> breaks(
      icu::BreakIterator::createCharacterInstance(icu::Locale::getRoot(), status));
  Require(status, "characters");
  std::vector<icu::UnicodeString> characters;
  for (const Range& part : Parts(std::move(breaks), text)) {
    characters.emplace_back(text, part.start, part.length);
  }
  return characters;
}

std::vector<Range> Words(const icu::UnicodeString& text, const icu::Locale& locale) {
  UErrorCode status = U_ZERO_ERROR;
  std::unique_ptr<icu::BreakIterator> breaks(
      icu::BreakIterator::createWordInstance(locale, status));
  Require(status, "words");
  std::vector<Range> words;
  for (const Range& part : Parts(std::move(breaks), text)) {
    if (HasLetterOrDigit(text.tempSubString(part.start, part.length))) words.push_back(part);
  }
  return words;
}

bool HasLetterOrDigit(const icu::UnicodeString& text) {
  return AnyOf(text, [](UChar32 c) { return u_isalnum(c) != 0; });
}

bool IsLetter(const icu::UnicodeString& character) { return u_isalpha(character.char32At(0)) != 0; }

bool IsUnspaced(const icu::UnicodeString& character) {
  return IsUnspacedCodePoint(character.char32At(0));
}

bool HasUnspaced(const icu::UnicodeString& text) { return AnyOf(text, IsUnspacedCodePoint); }

bool IsHangul(const icu::UnicodeString& character) {
  return uscript_hasScript(character.char32At(0), USCRIPT_HANGUL) != 0;
}

icu::UnicodeString WithoutAccents(const icu::UnicodeString& text) {
  UErrorCode status = U_ZERO_ERROR;
  const icu::UnicodeString apart =
      icu::Normalizer2::getNFDInstance(status)->normalize(text, status);
  icu::UnicodeString bare;
  for (int32_t i = 0; i < apart.length(); i = apart.moveIndex32(i, 1)) {
    const UChar32 c = apart.char32At(i);
    if (u_charType(c) != U_NON_SPACING_MARK || u_getCombiningClass(c) == 0) bare.append(c);
  }
  icu::UnicodeString result = icu::Normalizer2::getNFCInstance(status)->normalize(bare, status);
  Require(status, "accents");
  return result;
}

icu::UnicodeString Folded(const icu::UnicodeString& text, bool turkic) {
  UErrorCode status = U_ZERO_ERROR;
  icu::UnicodeString folded(text);
  if (turkic) folded.foldCase(U_FOLD_CASE_EXCLUDE_SPECIAL_I);
  folded = icu::Normalizer2::getNFKCCasefoldInstance(status)->normalize(folded, status);
  Require(status, "folding");
  return KatakanaAsHiragana(WithoutAccents(folded));
}

icu::UnicodeString Transliterated(const icu::UnicodeString& text, const char* transliterator) {
  static std::map<std::string, std::unique_ptr<icu::Transliterator>> made;
  std::unique_ptr<icu::Transliterator>& transform = made[transliterator];
  if (!transform) {
    UErrorCode status = U_ZERO_ERROR;
    transform.reset(icu::Transliterator::createInstance(
        icu::UnicodeString::fromUTF8(transliterator), UTRANS_FORWARD, status));
    Require(status, transliterator);
  }
  icu::UnicodeString result(text);
  transform->transliterate(result);
  return result;
}

}  // namespace bench::quality
