#include "host/sdk/text.h"

#include <cstddef>

namespace host::sdk {

std::string_view Trim(std::string_view text) {
  constexpr std::string_view kBlanks = " \t\r";
  const std::size_t first = text.find_first_not_of(kBlanks);
  if (first == std::string_view::npos) return {};
  return text.substr(first, text.find_last_not_of(kBlanks) - first + 1);
}

std::string_view TakeLine(std::string_view& rest) {
  const std::size_t end = rest.find('\n');
  const std::string_view line = Trim(rest.substr(0, end));
  rest.remove_prefix(end == std::string_view::npos ? rest.size() : end + 1);
  return line;
}

std::optional<Assignment> SplitAssignment(std::string_view line) {
  const std::size_t equals = line.find('=');
  if (equals == std::string_view::npos) return std::nullopt;
  const Assignment split{Trim(line.substr(0, equals)), Trim(line.substr(equals + 1))};
  if (split.key.empty()) return std::nullopt;
  return split;
}

std::optional<std::string> Unquote(std::string_view quoted, const Quoting& quoting) {
  const char mark = quoted.front();
  std::string text;
  for (std::size_t at = 1; at < quoted.size(); ++at) {
    const char c = quoted[at];
    if (c == mark) {
      const std::string_view rest = Trim(quoted.substr(at + 1));
      if (!rest.empty() && quoting.comment_marks.find(rest.front()) == std::string_view::npos) {
        return std::nullopt;
      }
      return text;
    }
    if (c != '\\' || at + 1 == quoted.size()) {
      text += c;
      continue;
    }
    const char next = quoted[++at];
    const std::optional<char> meant = quoting.unescape(next);
    if (meant) {
      text += *meant;
    } else {
      text += {c, next};
    }
  }
  return std::nullopt;
}

}  // namespace host::sdk
