// The table of gaps: a row for each reference that has any, a column for each language.
#include <algorithm>

#include "appindex/device_identity.h"
#include "tool/lint/output.h"
#include "tool/lint/package.h"
#include "tool/output.h"

namespace tool::lint {
namespace {

constexpr std::size_t kNameColumns = 37;  // 21 languages of two columns each fill 79 with it
constexpr std::size_t kCodeLetters = 3;

bool BeginsCharacter(char byte) { return (static_cast<unsigned char>(byte) & 0xC0U) != 0x80U; }

char Mark(const TextRow& row, const std::string& lang) {
  if (row.untranslated.count(lang) > 0) return '=';
  switch (row.states.at(lang)) {
    case TextState::kPresent:
      return '.';
    case TextState::kNoLanguage:
      return '-';
    case TextState::kNoSection:
      return 's';
    case TextState::kNoKey:
      return 'k';
    case TextState::kEmpty:
      return 'e';
  }
  return '?';
}

// The name in exactly kNameColumns columns, if its characters are one column wide.
std::string Fitted(const std::string& name) {
  const std::string shortened = Shortened(name, kNameColumns);
  const auto characters = std::count_if(shortened.begin(), shortened.end(), BeginsCharacter);
  return shortened + std::string(kNameColumns - static_cast<std::size_t>(characters), ' ');
}

// The codes of the languages stand upright, a letter in each line.
void WriteHead(std::ostream& out) {
  for (std::size_t letter = 0; letter < kCodeLetters; ++letter) {
    out << Fitted("");
    for (const std::string& lang : velkor::appindex::GetSupportedLangs())
      out << ' ' << lang[letter];
    out << '\n';
  }
}

void WriteRow(std::ostream& out, const TextRow& row) {
  out << Fitted(OneLine(row.reference));
  for (const std::string& lang : velkor::appindex::GetSupportedLangs()) {
    out << ' ' << Mark(row, lang);
  }
  out << '\n';
}

}  // namespace

void WriteTables(std::ostream& out, const Outcome& outcome) {
  bool any = false;
  for (const TextTable& table : outcome.tables) {
    bool has_head = false;
    for (const TextRow& row : table.rows) {
      if (!row.HasGaps()) continue;
      if (!has_head) {
        out << "\nTexts of " << OneLine(DisplayPath(table.file)) << " in "
            << OneLine(DisplayPath(table.root)) << "\n";
        WriteHead(out);
      }
      has_head = any = true;
      WriteRow(out, row);
    }
  }
  if (any) {
    out << "\n. there   s no such section   k no such key   e empty   = English\n"
           "- the language has no texts: English is shown\n";
  }
}

}  // namespace tool::lint
