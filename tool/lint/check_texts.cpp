#include <algorithm>
#include <cctype>
#include <cerrno>
#include <iterator>
#include <limits>
#include <set>
#include <sstream>
#include <utility>

#include "appindex/device_identity.h"
#include "appindex/utilities/file_utils.h"
#include "appindex/utils_internal.h"
#include "common/dir_reader.h"
#include "common/file_io.h"
#include "tool/lint/checks.h"

namespace tool::lint {
namespace {

using velkor::appindex::GetSupportedLangs;
using velkor::appindex::kEnglish;
using Langs = std::vector<std::string>;

// So many words are not the same in two languages by chance, as a name or a term is.
constexpr int kSentenceWords = 3;

// The references that are resolved in one texts root.
struct RootUse {
  std::string root;
  Node entry;                 // the first one that uses it
  std::vector<TextUse> uses;  // each reference once
};

std::vector<RootUse> CollectReferences(const Package& package, const ParsedDescriptor& descriptor) {
  std::vector<RootUse> roots;
  for (const Item& item : ItemsOf(descriptor.root)) {
    const std::string root = TextsRootOf(package, descriptor, item);
    if (root.empty()) continue;
    for (const TextUse& use : TextsOf(item)) {
      if (!Reference::Is(use.text)) continue;
      auto found = std::find_if(roots.begin(), roots.end(),
                                [&](const RootUse& known) { return known.root == root; });
      if (found == roots.end()) found = roots.insert(roots.end(), RootUse{root, item.entry, {}});
      const bool is_new = std::none_of(found->uses.begin(), found->uses.end(),
                                       [&](const TextUse& old) { return old.text == use.text; });
      if (is_new) found->uses.push_back(use);
    }
  }
  return roots;
}

bool IsSentence(const std::string& text) {
  std::istringstream words(text);
  std::string word;
  int count = 0;
  while (words >> word) {
    if (std::any_of(word.begin(), word.end(), [](unsigned char c) { return std::islower(c); })) {
      ++count;
    }
  }
  return count >= kSentenceWords;
}

TextRow MakeRow(const Texts& texts, const std::string& text) {
  const Reference reference(text);
  TextRow row{text, {}, {}};
  const std::string english = texts.TextOf(kEnglish, reference);
  const bool is_sentence = IsSentence(english);
  for (const std::string& lang : GetSupportedLangs()) {
    row.states[lang] = texts.StateOf(lang, reference);
    if (is_sentence && lang != kEnglish && texts.TextOf(lang, reference) == english) {
      row.untranslated.insert(lang);
    }
  }
  return row;
}

// The languages but English that are in this state.
Langs InState(const TextRow& row, TextState state) {
  Langs langs;
  for (const auto& [lang, lang_state] : row.states) {
    if (lang_state == state && lang != kEnglish) langs.push_back(lang);
  }
  return langs;
}

// The languages as a person says them.
std::string Named(const Langs& langs) {
  const std::set<std::string>& all = GetSupportedLangs();
  if (langs.size() <= all.size() / 2) return Listed(langs);
  const std::set<std::string> given(langs.begin(), langs.end());
  Langs others;
  std::set_difference(all.begin(), all.end(), given.begin(), given.end(),
                      std::back_inserter(others));
  return others.empty() ? "every language" : "every language but " + Listed(others);
}

void AddForLangs(Report& report, const char* tag, const Node& at, const std::string& what,
                 const Langs& langs, const std::string& consequence) {
  if (!langs.empty()) report.Add(tag, at, what + " in " + Named(langs) + consequence, langs);
}

void ReportUnresolved(Report& report, const TextUse& use) {
  const Reference reference(use.text);
  const bool is_prose = use.text.find(' ') != std::string::npos;
  report.Add("reference-unresolved", use.node,
             Quoted(use.text) + " has no text in any language" +
                 (is_prose ? ": a text with a colon is always looked up as section:key" : ""));
}

void ReportRow(Report& report, const Texts& texts, const TextUse& use, const TextRow& row) {
  const bool resolves = std::any_of(row.states.begin(), row.states.end(), [](const auto& state) {
    return state.second == TextState::kPresent;
  });
  if (!resolves) {
    ReportUnresolved(report, use);
    return;
  }
  const std::string what = Quoted(use.text);
  if (texts.HasLanguage(kEnglish) && row.states.at(kEnglish) != TextState::kPresent) {
    report.Add("english-missing", use.node,
               what + " has no English text, which stands in for other languages", {kEnglish});
  }
  AddForLangs(report, "text-missing", use.node, what + " is missing",
              InState(row, TextState::kNoKey), ": nothing is shown");
  AddForLangs(report, "text-empty", use.node, what + " is empty", InState(row, TextState::kEmpty),
              ": nothing is shown");
  AddForLangs(report, "text-untranslated", use.node, what + " is the English text",
              Langs(row.untranslated.begin(), row.untranslated.end()), "");
}

// The languages that have texts, but not this section.
Langs Lacking(const Texts& texts, const std::string& section) {
  Langs langs;
  for (const std::string& lang : GetSupportedLangs()) {
    if (texts.HasLanguage(lang) && !texts.HasSection(lang, section)) langs.push_back(lang);
  }
  return langs;
}

bool IsInSomeLanguage(const Texts& texts, const std::string& section) {
  const std::set<std::string>& langs = GetSupportedLangs();
  return std::any_of(langs.begin(), langs.end(),
                     [&](const std::string& lang) { return texts.HasSection(lang, section); });
}

void ReportSections(Report& report, const Texts& texts, const RootUse& root) {
  std::set<std::string> used;
  for (const TextUse& use : root.uses) {
    const std::string section = Reference(use.text).section;
    if (!used.insert(section).second) continue;
    if (!IsInSomeLanguage(texts, section)) continue;  // each reference is unresolved
    AddForLangs(report, "section-missing", use.node, "the section [" + section + "] is missing",
                Lacking(texts, section), ": the references themselves are shown");
  }
  for (const std::string& section : texts.Sections()) {
    if (used.count(section) > 0) continue;
    AddForLangs(report, "section-uneven", root.entry, "the section [" + section + "] is missing",
                Lacking(texts, section), "");
  }
}

void ReportAbsent(Report& report, const Texts& texts, const RootUse& root) {
  Langs absent;
  Langs present;
  for (const std::string& lang : GetSupportedLangs()) {
    (texts.HasLanguage(lang) ? present : absent).push_back(lang);
  }
  if (absent.empty()) return;
  const std::string what =
      present.size() < absent.size()
          ? "there are texts only in " + Listed(present) + ": other languages show English"
          : "there are no texts in " + Listed(absent) + ": the English ones are shown";
  report.Add("language-absent", root.entry, what, absent);
}

// Whether nobody meant the file to hold texts: there is none, or nothing but comments in it.
bool IsMeantToBeEmpty(const std::string& file) {
  std::string content;
  if (!velkor::ReadRegularFile(file, std::numeric_limits<std::size_t>::max(), content)) {
    return errno == ENOENT || errno == ENOTDIR;
  }
  std::istringstream lines(content);
  for (std::string line; std::getline(lines, line);) {
    const std::size_t first = line.find_first_not_of(" \t\r");
    if (first != std::string::npos && line[first] != '#' && line[first] != ';') return false;
  }
  return true;
}

void ReportUnread(Report& report, const Texts& texts, const RootUse& root) {
  for (const std::string& lang : GetSupportedLangs()) {
    const std::string file = root.root + lang + "/strings";
    if (texts.HasLanguage(lang) || IsMeantToBeEmpty(file)) continue;
    report.Add("texts-unread", root.entry, DisplayPath(file) + " gives no texts", {lang});
  }
}

void ReportLanguages(Report& report, const Texts& texts, const RootUse& root) {
  ReportUnread(report, texts, root);
  if (texts.Sections().empty()) return;  // every reference is unresolved
  if (texts.HasLanguage(kEnglish)) {
    ReportAbsent(report, texts, root);
  } else {
    report.Add("english-missing", root.entry,
               "there are no English texts, which stand in for other languages", {kEnglish});
  }
  velkor::DirReader reader(root.root);
  std::set<std::string> names;
  std::string name;
  while (reader.IsOpen() && reader.Next(name)) names.insert(name);
  for (const std::string& lang : names) {
    const bool is_lang = GetSupportedLangs().count(lang) > 0;
    if (is_lang || !velkor::IsDirExist(root.root + lang, true)) continue;
    report.Add("language-unknown", root.entry,
               DisplayPath(root.root) + lang + " is never read: there is no such language");
  }
}

}  // namespace

bool TextRow::HasGaps() const {
  return !untranslated.empty() || std::any_of(states.begin(), states.end(), [](const auto& state) {
    return state.second != TextState::kPresent && state.second != TextState::kNoLanguage;
  });
}

std::vector<TextTable> CheckTexts(Report& report, const Package& package,
                                  const ParsedDescriptor& descriptor, TextsCache& cache) {
  std::vector<TextTable> tables;
  for (const RootUse& root : CollectReferences(package, descriptor)) {
    const Texts& texts = cache.Of(root.root);
    TextTable table{descriptor.file, root.root, {}};
    for (const TextUse& use : root.uses) {
      table.rows.push_back(MakeRow(texts, use.text));
      ReportRow(report, texts, use, table.rows.back());
    }
    tables.push_back(std::move(table));
    ReportSections(report, texts, root);
    ReportLanguages(report, texts, root);
  }
  return tables;
}

}  // namespace tool::lint
