// What the yardstick needs to know about writing: characters as people count them, words, scripts,
// and a form of a text in which case, accents, width and the two kana make no difference.
#pragma once

#include <unicode/locid.h>
#include <unicode/unistr.h>

#include <string>
#include <vector>

namespace bench::quality {

// The locale of one of the system's language codes. Throws std::runtime_error for another code.
icu::Locale LocaleOf(const std::string& lang);

icu::UnicodeString FromUtf8(const std::string& text);
std::string ToUtf8(const icu::UnicodeString& text);

// The user-perceived characters of a text, in order.
std::vector<icu::UnicodeString> Characters(const icu::UnicodeString& text);

// A stretch of a text, in UTF-16 units.
struct Range {
  int32_t start;
  int32_t length;
};

// The words of a text by the rules and dictionaries of the locale: those parts that hold a letter
// or a digit.
std::vector<Range> Words(const icu::UnicodeString& text, const icu::Locale& locale);

bool HasLetterOrDigit(const icu::UnicodeString& text);
bool IsLetter(const icu::UnicodeString& character);

// Written in Chinese characters, kana or Thai: without spaces between words.
bool IsUnspaced(const icu::UnicodeString& character);
bool HasUnspaced(const icu::UnicodeString& text);
bool IsHangul(const icu::UnicodeString& character);

// The text without its accents: the non-spacing marks of a combining class other than 0, which
// includes the voicing marks of kana, and the tone marks and two vowel signs of Thai.
icu::UnicodeString WithoutAccents(const icu::UnicodeString& text);

// The form for comparisons; `turkic` folds I to ı and İ to i.
icu::UnicodeString Folded(const icu::UnicodeString& text, bool turkic);

// The text after one of ICU's transliterators. For one thread only: each is made once and kept.
// Throws std::runtime_error for an unknown one.
icu::UnicodeString Transliterated(const icu::UnicodeString& text, const char* transliterator);

}  // namespace bench::quality
