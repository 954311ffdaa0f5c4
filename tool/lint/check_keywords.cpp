#include <algorithm>
#include <cctype>

#include "appindex/utils_internal.h"
#include "tool/lint/checks.h"

namespace tool::lint {
namespace {

// The English text, in lower case where it is ASCII: searches do not tell the cases apart.
std::string EnglishOf(const Texts& texts, const std::string& text) {
  std::string english =
      Reference::Is(text) ? texts.TextOf(velkor::appindex::kEnglish, Reference(text)) : text;
  std::transform(english.begin(), english.end(), english.begin(),
                 [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
  return english;
}

}  // namespace

void CheckKeywords(Report& report, const Package& package, const ParsedDescriptor& descriptor,
                   TextsCache& cache) {
  for (const Item& item : ItemsOf(descriptor.root)) {
    const std::optional<TextUse> title = TitleOf(item);
    if (!title) continue;
    const Texts& texts = cache.Of(TextsRootOf(package, descriptor, item));
    const std::string english_title = EnglishOf(texts, title->text);
    for (const TextUse& keyword : KeywordsOf(item)) {
      const bool is_title =
          keyword.text == title->text ||
          (!english_title.empty() && EnglishOf(texts, keyword.text) == english_title);
      if (is_title) {
        report.Add(
            "keyword-repeats-title", keyword.node,
            "the keyword " + Quoted(keyword.text) + " is the title, which is searched anyway");
      }
    }
  }
}

}  // namespace tool::lint
