#include "tool/wrap.h"

#include <unicode/brkiter.h>
#include <unicode/uchar.h>
#include <unicode/unistr.h>

#include <memory>

namespace tool {
namespace {

std::size_t WidthOf(UChar32 c) {
  if ((U_GET_GC_MASK(c) & (U_GC_MN_MASK | U_GC_ME_MASK | U_GC_CF_MASK)) != 0) return 0;
  const int width = u_getIntPropertyValue(c, UCHAR_EAST_ASIAN_WIDTH);
  return width == U_EA_WIDE || width == U_EA_FULLWIDTH ? 2 : 1;
}

std::size_t WidthOf(const icu::UnicodeString& text) {
  std::size_t width = 0;
  for (int32_t i = 0; i < text.length(); i = text.moveIndex32(i, 1)) {
    width += WidthOf(text.char32At(i));
  }
  return width;
}

std::string Trimmed(icu::UnicodeString text) {
  std::string utf8;
  text.trim().toUTF8String(utf8);
  return utf8;
}

}  // namespace

std::vector<std::string> Wrapped(const std::string& text, std::size_t columns) {
  const icu::UnicodeString unicode = icu::UnicodeString::fromUTF8(text);
  UErrorCode status = U_ZERO_ERROR;
  const std::unique_ptr<icu::BreakIterator> breaks(
      icu::BreakIterator::createLineInstance(icu::Locale::getRoot(), status));
  if (U_FAILURE(status) != 0) return {text};
  breaks->setText(unicode);

  std::vector<std::string> lines;
  icu::UnicodeString line;
  int32_t begin = breaks->first();
  for (int32_t end = breaks->next(); end != icu::BreakIterator::DONE; end = breaks->next()) {
    const icu::UnicodeString piece(unicode, begin, end - begin);
    icu::UnicodeString longer = line + piece;
    if (!line.isEmpty() && WidthOf(longer.trim()) > columns) {
      lines.push_back(Trimmed(line));
      line.remove();
    }
    line += piece;
    begin = end;
  }
  lines.push_back(Trimmed(line));
  return lines;
}

}  // namespace tool
