// The pieces of the line-by-line text formats: lines, assignments and quoted values.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace host::sdk {

// `text` without the blanks (space, tab, carriage return) at both ends.
std::string_view Trim(std::string_view text);

// Takes the first line, trimmed, off the front of `rest`, which must not be empty.
std::string_view TakeLine(std::string_view& rest);

struct Assignment {
  std::string_view key;    // never empty
  std::string_view value;  // as it stands, quotes included
};

// Splits a trimmed line at its first "=" and trims both sides; nothing when there is no "=" or
// nothing before it.
std::optional<Assignment> SplitAssignment(std::string_view line);

// How one format writes a text in quotes.
struct Quoting {
  // The character that a backslash followed by the given one stands for; nothing when the two stand
  // for themselves.
  std::optional<char> (*unescape)(char);
  // The characters that start a comment after the closing quote.
  std::string_view comment_marks;
};

// The text in `quoted`, which starts with its quotation mark. Nothing when the mark is not closed
// or when more than blanks and a comment follows.
std::optional<std::string> Unquote(std::string_view quoted, const Quoting& quoting);

}  // namespace host::sdk
