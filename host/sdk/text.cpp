#include "host/sdk/text.h"

#include <cstddef>

namespace host::sdk {

namespace {

bool IsBlank(char c) { return c == ' ' || c == '\t' || c == '\r'; }

}  // namespace

std::string_view Trim(std::string_view text) {
  while (!text.empty() && IsBlank(text.front())) text.remove_prefix(1);
  while (!text.empty() && IsBlank(text.back())) text.remove_suffix(1);
  return text;
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
  std::size_t run = 1;  // from here to `at`: not yet in `text`
  for (std::size_t at = 1; at < quoted.size(); ++at) {
    const char c = quoted[at];
    if (c == mark) {
      const std::string_view rest = Trim(quoted.substr(at + 1));
      if (!rest.empty() && quoting.comment_marks.find(rest.front()) == std::string_view::npos) {
        return std::nullopt;
      }
      text += quoted.substr(run, at - run);
      return text;
    }
    if (c != '\\' || at + 1 == quoted.size()) continue;
    const std::optional<char> meant = quoting.unescape(quoted[at + 1]);
    if (meant) {
      text += quoted.substr(run, at - run);
      text += *meant;
      run = at + 2;
    }
    ++at;
  }
  return std::nullopt;
}

}  // namespace host::sdk
