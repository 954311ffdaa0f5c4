#include "tool/emphasis.h"

#include <unicode/brkiter.h>
#include <unicode/coll.h>
#include <unicode/stsearch.h>
#include <unicode/tblcoll.h>
#include <unicode/unistr.h>

#include <algorithm>
#include <memory>
#include <utility>
#include <vector>

#include "tool/output.h"

namespace tool {
namespace {

using Part = std::pair<int, int>;  // begin and end, in UTF-16 units

// The words between white space.
std::vector<icu::UnicodeString> Words(const icu::UnicodeString& query) {
  std::vector<icu::UnicodeString> words;
  icu::UnicodeString word;
  for (int at = 0; at < query.length(); at = query.moveIndex32(at, 1)) {
    const UChar32 character = query.char32At(at);
    if (!u_isUWhiteSpace(character)) {
      word.append(character);
    } else if (!word.isEmpty()) {
      words.push_back(word);
      word.remove();
    }
  }
  if (!word.isEmpty()) words.push_back(word);
  return words;
}

// Compares letters and nothing else: the collation order's first level.
std::unique_ptr<icu::Collator> Letters() {
  UErrorCode status = U_ZERO_ERROR;
  std::unique_ptr<icu::Collator> collator(
      icu::Collator::createInstance(icu::Locale::getRoot(), status));
  if (U_FAILURE(status) != 0) return nullptr;
  collator->setStrength(icu::Collator::PRIMARY);
  return collator;
}

std::vector<Part> Find(const icu::UnicodeString& text, const icu::UnicodeString& word,
                       icu::RuleBasedCollator& letters) {
  UErrorCode status = U_ZERO_ERROR;
  icu::StringSearch search(word, text, &letters, nullptr, status);
  std::vector<Part> parts;
  if (U_FAILURE(status) != 0) return parts;
  for (int begin = search.first(status); begin != USEARCH_DONE && U_SUCCESS(status) != 0;
       begin = search.next(status)) {
    if (search.getMatchedLength() > 0) parts.emplace_back(begin, begin + search.getMatchedLength());
  }
  return parts;
}

bool BeginsWord(const icu::UnicodeString& text, int at) {
  return at == 0 || u_isalnum(text.char32At(text.moveIndex32(at, -1))) == 0;
}

// The places to emphasise, in order; they may overlap.
std::vector<Part> Places(const icu::UnicodeString& text, const icu::UnicodeString& query) {
  std::vector<Part> inside;
  std::vector<Part> beginnings;
  const std::unique_ptr<icu::Collator> collator = Letters();
  auto* letters = dynamic_cast<icu::RuleBasedCollator*>(collator.get());  // which others are not
  if (letters == nullptr) return beginnings;
  for (const icu::UnicodeString& word : Words(query)) {
    for (const Part& part : Find(text, word, *letters)) {
      (BeginsWord(text, part.first) ? beginnings : inside).push_back(part);
    }
  }
  std::vector<Part>& places = beginnings.empty() ? inside : beginnings;
  std::sort(places.begin(), places.end());
  return places;
}

std::string Utf8(const icu::UnicodeString& text) {
  std::string utf8;
  return text.toUTF8String(utf8);
}

}  // namespace

std::string Emphasised(const std::string& text, const std::string& query) {
  const icu::UnicodeString unicode = icu::UnicodeString::fromUTF8(text);
  std::string emphasised;
  int done = 0;
  for (const auto& [begin, end] : Places(unicode, icu::UnicodeString::fromUTF8(query))) {
    if (begin < done) continue;
    emphasised += Utf8(unicode.tempSubStringBetween(done, begin));
    emphasised += Styled(Utf8(unicode.tempSubStringBetween(begin, end)), Look::kBold, true);
    done = end;
  }
  return emphasised + Utf8(unicode.tempSubString(done));
}

}  // namespace tool
