// Bringing texts that mean the same into the same form, for documents and queries alike.
#pragma once

#include <unicode/unistr.h>

#include <string>

namespace searchd {

// Loads what the functions here share, so that no two threads do it at once. Throws
// std::runtime_error when ICU's data are missing.
void LoadFolding();

// Compatibility forms and width variants as one, case folded; with `turkic`, I becomes dotless i
// and dotted I becomes i. A zero-width space, which parts words in Thai and Khmer, becomes a space,
// and a typographic apostrophe the one that keyboards have.
icu::UnicodeString Fold(const icu::UnicodeString& text, bool turkic);

// A folded text without accents ("zurich", "istanbul", "oeuvre") and with katakana as hiragana.
// Marks that are letters of their own in a script, such as Thai vowels, stay.
icu::UnicodeString WithoutAccents(const icu::UnicodeString& folded);

// A text from WithoutAccents without any mark that combines with a letter, such as the voice marks
// of kana and the tones and vowels above and below Thai letters.
icu::UnicodeString WithoutMarks(const icu::UnicodeString& plain);

// Whether a character belongs to a script that is written without spaces between words, or in which
// two or three characters make a word: there each one tells a lot.
bool IsDense(UChar32 c);

std::string ToUtf8(const icu::UnicodeString& text);

}  // namespace searchd
