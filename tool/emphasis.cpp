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

#include "host/searchd/edit_distance.h"
#include "host/searchd/folding.h"
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

// The words of a text as its language knows them.
std::vector<Part> WordsIn(const icu::UnicodeString& text) {
  UErrorCode status = U_ZERO_ERROR;
  const std::unique_ptr<icu::BreakIterator> breaks(
      icu::BreakIterator::createWordInstance(icu::Locale::getRoot(), status));
  std::vector<Part> words;
  if (U_FAILURE(status) != 0) return words;
  breaks->setText(text);
  int begin = breaks->first();
  for (int end = breaks->next(); end != icu::BreakIterator::DONE; end = breaks->next()) {
    if (breaks->getRuleStatus() != UBRK_WORD_NONE) words.emplace_back(begin, end);
    begin = end;
  }
  return words;
}

std::u32string Folded(const icu::UnicodeString& word) {
  const icu::UnicodeString folded = searchd::WithoutAccents(searchd::Fold(word, false));
  std::u32string letters;
  for (int at = 0; at < folded.length(); at = folded.moveIndex32(at, 1)) {
    letters += static_cast<char32_t>(folded.char32At(at));
  }
  return letters;
}

// How many letters two forms of a word begin with together; 0 for two words.
std::size_t SharedBeginning(const std::u32string& a, const std::u32string& b) {
  constexpr std::size_t kLeast = 3;
  const std::size_t most = std::min(a.size(), b.size());
  std::size_t shared = 0;
  while (shared < most && a[shared] == b[shared]) ++shared;
  return shared >= kLeast && 2 * shared >= most ? shared : 0;
}

std::size_t Alike(const std::u32string& word, const std::u32string& sought, Likeness likeness) {
  if (likeness == Likeness::kForm) return SharedBeginning(word, sought);
  return likeness == Likeness::kSlip && searchd::BeginsWithinOneEdit(word, sought) ? 1 : 0;
}

// The words of the text that are most like the one that is sought.
std::vector<Part> FindAlike(const icu::UnicodeString& text, const icu::UnicodeString& word,
                            Likeness likeness) {
  std::vector<Part> parts;
  std::size_t most = 1;
  const std::u32string sought = Folded(word);
  for (const Part& part : WordsIn(text)) {
    const icu::UnicodeString found = text.tempSubStringBetween(part.first, part.second);
    const std::size_t alike = Alike(Folded(found), sought, likeness);
    if (alike > most) parts.clear();
    if (alike >= most) parts.push_back(part);
    most = std::max(most, alike);
  }
  return parts;
}

// The places to emphasise, in order; they may overlap.
std::vector<Part> Places(const icu::UnicodeString& text, const std::vector<Sought>& sought) {
  std::vector<Part> inside;
  std::vector<Part> beginnings;
  const std::unique_ptr<icu::Collator> collator = Letters();
  auto* letters = dynamic_cast<icu::RuleBasedCollator*>(collator.get());  // which others are not
  if (letters == nullptr) return beginnings;
  for (const Sought& one : sought) {
    for (const icu::UnicodeString& word : Words(icu::UnicodeString::fromUTF8(one.text))) {
      std::vector<Part> found = Find(text, word, *letters);
      if (found.empty()) found = FindAlike(text, word, one.likeness);
      for (const Part& part : found) {
        (BeginsWord(text, part.first) ? beginnings : inside).push_back(part);
      }
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

std::string Emphasised(const std::string& text, const std::vector<Sought>& sought) {
  const icu::UnicodeString unicode = icu::UnicodeString::fromUTF8(text);
  std::string emphasised;
  int done = 0;
  for (const auto& [begin, end] : Places(unicode, sought)) {
    if (begin < done) continue;
    emphasised += Utf8(unicode.tempSubStringBetween(done, begin));
    emphasised += Styled(Utf8(unicode.tempSubStringBetween(begin, end)), Look::kBold, true);
    done = end;
  }
  return emphasised + Utf8(unicode.tempSubString(done));
}

}  // namespace tool
