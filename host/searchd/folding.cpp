#include "host/searchd/folding.h"

#include <unicode/normalizer2.h>
#include <unicode/uchar.h>
#include <unicode/uscript.h>

#include <stdexcept>

namespace searchd {
namespace {

using icu::Normalizer2;
using icu::UnicodeString;

UnicodeString Normalize(const Normalizer2* (*get)(UErrorCode&), const UnicodeString& text) {
  UErrorCode status = U_ZERO_ERROR;
  UnicodeString result = get(status)->normalize(text, status);
  if (U_FAILURE(status)) throw std::runtime_error(u_errorName(status));
  return result;
}

const Normalizer2* Nfc(UErrorCode& status) { return Normalizer2::getNFCInstance(status); }
const Normalizer2* Nfd(UErrorCode& status) { return Normalizer2::getNFDInstance(status); }
const Normalizer2* FoldingNfkc(UErrorCode& status) {
  return Normalizer2::getNFKCCasefoldInstance(status);
}

bool IsAscii(const UnicodeString& text) {
  for (int32_t i = 0; i < text.length(); ++i) {
    if (text[i] >= 0x80) return false;
  }
  return true;
}

bool IsAccent(UChar32 c) { return c >= 0x0300 && c <= 0x036F; }

// Letters that people type without their mark but that have no decomposition.
const char16_t* PlainLetters(UChar32 c) {
  switch (c) {
    case 0x00E6:
      return u"ae";
    case 0x00F0:
    case 0x0111:
      return u"d";
    case 0x00F8:
      return u"o";
    case 0x00FE:
      return u"th";
    case 0x0127:
      return u"h";
    case 0x0131:
      return u"i";
    case 0x0142:
      return u"l";
    case 0x0153:
      return u"oe";
    case 0x0167:
      return u"t";
    default:
      return nullptr;
  }
}

UChar32 AsHiragana(UChar32 c) {
  constexpr UChar32 kFirstKatakana = 0x30A1;
  constexpr UChar32 kLastKatakana = 0x30F6;
  constexpr UChar32 kDistance = 0x60;
  return c >= kFirstKatakana && c <= kLastKatakana ? c - kDistance : c;
}

constexpr UChar32 kProlongedSound = 0x30FC;

// The vowel that a hiragana ends in, as a hiragana; 0 for what has none.
UChar32 VowelOf(UChar32 c) {
  constexpr UChar32 kFirst = 0x3041;
  constexpr char16_t kVowels[] =
      u"ああいいううええおおああいいううええおおああいいううええおおああいいうううええおお"
      u"あいうえおあああいいいうううえええおおおあいうえおああううおおあいうえおああいえお";
  constexpr UChar32 kCount = sizeof(kVowels) / sizeof(kVowels[0]) - 1;
  return c >= kFirst && c < kFirst + kCount ? kVowels[c - kFirst] : 0;
}

}  // namespace

void LoadFolding() {
  for (const auto get : {Nfc, Nfd, FoldingNfkc}) Normalize(get, UnicodeString());
}

UnicodeString Fold(const UnicodeString& text, bool turkic) {
  UnicodeString folded = text;
  folded.findAndReplace(UnicodeString(static_cast<UChar32>(0x200B)), UnicodeString(u' '));
  for (const UChar32 apostrophe : {0x2018, 0x2019, 0x02BC}) {
    folded.findAndReplace(UnicodeString(apostrophe), UnicodeString(u'\''));
  }
  if (turkic) {
    folded = Normalize(Nfc, folded);
    folded.foldCase(U_FOLD_CASE_EXCLUDE_SPECIAL_I);
  }
  return Normalize(FoldingNfkc, folded);
}

UnicodeString WithoutAccents(const UnicodeString& folded) {
  if (IsAscii(folded)) return folded;
  const UnicodeString parts = Normalize(Nfd, folded);
  UnicodeString plain;
  for (int32_t i = 0; i < parts.length(); i = parts.moveIndex32(i, 1)) {
    const UChar32 c = parts.char32At(i);
    if (IsAccent(c)) continue;
    if (const char16_t* letters = PlainLetters(c)) {
      plain.append(UnicodeString(letters));
    } else {
      plain.append(AsHiragana(c));
    }
  }
  return Normalize(Nfc, plain);
}

UnicodeString WithoutMarks(const UnicodeString& plain) {
  if (IsAscii(plain)) return plain;
  const UnicodeString parts = Normalize(Nfd, plain);
  UnicodeString bare;
  for (int32_t i = 0; i < parts.length(); i = parts.moveIndex32(i, 1)) {
    const UChar32 c = parts.char32At(i);
    const UChar32 vowel = c == kProlongedSound && i > 0 ? VowelOf(bare[bare.length() - 1]) : 0;
    if (u_charType(c) != U_NON_SPACING_MARK) bare.append(vowel != 0 ? vowel : c);
  }
  return Normalize(Nfc, bare);
}

bool IsDense(UChar32 c) {
  constexpr UChar32 kFirst = 0x0E00;  // Thai, the first such script
  if (c < kFirst) return false;
  if (c == kProlongedSound) return true;
  UErrorCode status = U_ZERO_ERROR;
  switch (uscript_getScript(c, &status)) {
    case USCRIPT_BOPOMOFO:
    case USCRIPT_HAN:
    case USCRIPT_HANGUL:
    case USCRIPT_HIRAGANA:
    case USCRIPT_KATAKANA:
    case USCRIPT_KHMER:
    case USCRIPT_LAO:
    case USCRIPT_MYANMAR:
    case USCRIPT_THAI:
      return true;
    default:
      return false;
  }
}

std::string ToUtf8(const UnicodeString& text) {
  std::string utf8;
  text.toUTF8String(utf8);
  return utf8;
}

}  // namespace searchd
