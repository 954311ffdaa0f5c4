#include "device/tovo_webui.h"

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "host/sdk/keep_errno.h"
#include "host/sdk/regular_file.h"
#include "host/sdk/text.h"

namespace sdk = host::sdk;

namespace {

// Far above any real language of any package.
constexpr std::size_t kLongestFile = std::size_t{1024} * 1024;
constexpr std::string_view kCommentMarks = "#;";

std::optional<char> Unescape(char c) {
  if (c == '"' || c == '\\') return c;
  if (c == 'n') return '\n';
  return std::nullopt;
}

bool IsSectionHeader(std::string_view line) {
  return line.size() > 2 && line.front() == '[' && line.back() == ']';
}

std::string_view WithoutByteOrderMark(std::string_view content) {
  constexpr std::string_view kMark = "\xEF\xBB\xBF";
  if (content.substr(0, kMark.size()) == kMark) content.remove_prefix(kMark.size());
  return content;
}

// A section appears with its first text; texts of one section may stand in several places.
Json::Value ParseStrings(std::string_view rest) {
  Json::Value texts;
  std::string section;
  Json::Value* section_texts = nullptr;  // once it has one
  while (!rest.empty()) {
    const std::string_view line = sdk::TakeLine(rest);
    if (line.empty() || kCommentMarks.find(line.front()) != std::string_view::npos) continue;
    if (IsSectionHeader(line)) {
      section = line.substr(1, line.size() - 2);
      section_texts = nullptr;
      continue;
    }
    const std::optional<sdk::Assignment> split = sdk::SplitAssignment(line);
    if (section.empty() || !split || split->value.empty() || split->value.front() != '"') continue;
    const std::optional<std::string> text = sdk::Unquote(split->value, {Unescape, kCommentMarks});
    if (!text) continue;
    if (section_texts == nullptr) section_texts = &texts[section];
    const std::string_view key = split->key;
    *section_texts->demand(key.data(), key.data() + key.size()) = *text;
  }
  return texts;
}

}  // namespace

// Reads one UTF-8 file `strings`, of at most 1 MiB, in the language's directory:
//
//   # a comment; so is a line that starts with ";"
//   [section]
//   key="text with \", \\ and \n"
//
// Any other backslash is an ordinary character. The last text of a key holds. Lines of any other
// form, and texts before the first section, are skipped. Line ends may be "\r\n".
Json::Value TOVO::PMX::LocalizedStringParser::ParseTexts(std::string dir) {
  const sdk::KeepErrno keep;
  dir += "/strings";
  const std::optional<std::string> content = sdk::ReadRegularFile(dir, kLongestFile);
  return content ? ParseStrings(WithoutByteOrderMark(*content)) : Json::Value();
}
