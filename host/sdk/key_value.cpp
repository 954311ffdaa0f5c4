#include "host/sdk/key_value.h"

#include <utility>

#include "host/sdk/text.h"

namespace host::sdk {
namespace {

constexpr std::string_view kCommentMarks = "#";

std::optional<char> EscapedInDoubleQuotes(char c) {
  if (c == '"' || c == '\\' || c == '$' || c == '`') return c;
  return std::nullopt;
}

std::optional<char> NothingEscaped(char) { return std::nullopt; }

std::optional<std::string> ValueOf(std::string_view written) {
  if (written.empty()) return std::string();
  if (written.front() == '"') return Unquote(written, {EscapedInDoubleQuotes, kCommentMarks});
  if (written.front() == '\'') return Unquote(written, {NothingEscaped, kCommentMarks});
  return std::string(written);
}

}  // namespace

std::optional<std::string> LastValueOf(std::string_view key, std::string_view content) {
  std::optional<std::string> found;
  while (!content.empty()) {
    const std::string_view line = TakeLine(content);
    if (line.empty() || kCommentMarks.find(line.front()) != std::string_view::npos) continue;
    const std::optional<Assignment> split = SplitAssignment(line);
    if (!split || split->key != key) continue;
    if (std::optional<std::string> value = ValueOf(split->value)) found = std::move(value);
  }
  return found;
}

}  // namespace host::sdk
