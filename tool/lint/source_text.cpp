#include "tool/lint/source_text.h"

#include <json/reader.h>

#include <algorithm>
#include <boost/locale/utf.hpp>
#include <cstdio>
#include <memory>
#include <utility>

#include "appindex/utilities/json_helpers.h"

namespace tool::lint {
namespace {

constexpr char kByteOrderMark[] = "\xEF\xBB\xBF";

bool IsContinuation(char c) { return (static_cast<unsigned char>(c) & 0xC0U) == 0x80U; }

// The offset of the innermost opening bracket.
std::size_t DeepestBracket(const std::string& text) {
  std::size_t depth = 0;
  std::size_t most = 0;
  std::size_t at = 0;
  bool in_text = false;
  for (std::size_t i = 0; i < text.size(); ++i) {
    const char c = text[i];
    if (in_text) {
      if (c == '\\') ++i;
      if (c == '"') in_text = false;
    } else if (c == '"') {
      in_text = true;
    } else if (c == '[' || c == '{') {
      if (++depth > most) {
        most = depth;
        at = i;
      }
    } else if ((c == ']' || c == '}') && depth > 0) {
      --depth;
    }
  }
  return at;
}

bool FollowsComma(const std::string& text, std::size_t offset) {
  const std::size_t before =
      offset == 0 ? std::string::npos : text.find_last_not_of(" \t\r\n", offset - 1);
  return before != std::string::npos && text[before] == ',';
}

// What people do most often, said plainly; otherwise what the reader says.
std::string Explain(const std::string& text, std::size_t offset, const std::string& said) {
  if (text.compare(0, 3, kByteOrderMark) == 0 && offset == 0) {
    return "the file begins with a byte order mark; save it without one";
  }
  if (text.find_first_not_of(" \t\r\n") == std::string::npos) return "the file is empty";
  if (offset >= text.size()) return "the text ends too early: a bracket is not closed";
  const char c = text[offset];
  if (c == '/' || c == '#') return "comments are not allowed";
  if (c == '\'') return "texts stand in double quotes";
  if ((c == ']' || c == '}') && FollowsComma(text, offset)) {
    return std::string("there is a comma before the closing \"") + c + "\"";
  }
  if (c == '"' && said.find("value, object or array expected") != std::string::npos) {
    return "the text that begins here is not closed";
  }
  return said;
}

// The first of the reader's messages: "* Line L, Column C\n  MESSAGE\n...".
SyntaxError ReadMessages(const SourceText& source, const std::string& messages) {
  std::size_t line = 1;
  std::size_t column = 1;
  std::sscanf(messages.c_str(), "* Line %zu, Column %zu", &line, &column);
  const std::size_t begin = std::min(messages.find('\n'), messages.size());
  const std::size_t text = std::min(messages.find_first_not_of("\n ", begin), messages.size());
  const std::string said = messages.substr(text, messages.find('\n', text) - text);
  const std::size_t offset = source.OffsetOf(line, column);
  return {offset, Explain(source.Text(), offset, said)};
}

// Why the library does not take the text. The verdict is the library's: this reader is only asked
// for the place, with the same strictness but for the depth.
SyntaxError FindSyntaxError(const SourceText& source) {
  const std::string& text = source.Text();
  const std::size_t nul = text.find('\0');
  if (nul != std::string::npos) return {nul, "there is a NUL byte"};
  Json::CharReaderBuilder builder;
  Json::CharReaderBuilder::strictMode(&builder.settings_);
  builder.settings_["strictRoot"] = false;
  builder.settings_["skipBom"] = false;
  const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
  Json::Value ignored;
  std::string messages;
  try {
    if (!reader->parse(text.data(), text.data() + text.size(), &ignored, &messages)) {
      return ReadMessages(source, messages);
    }
  } catch (const Json::Exception&) {
    // Far too deep.
  }
  return {DeepestBracket(text), "the values are nested too deeply"};
}

}  // namespace

SourceText::SourceText(std::string text) : text_(std::move(text)), line_starts_{0} {
  for (std::size_t i = 0; i < text_.size(); ++i) {
    const bool ends_line =
        text_[i] == '\n' || (text_[i] == '\r' && (i + 1 == text_.size() || text_[i + 1] != '\n'));
    if (ends_line) line_starts_.push_back(i + 1);
  }
}

Position SourceText::At(std::size_t offset) const {
  offset = std::min(offset, text_.size());
  const auto after = std::upper_bound(line_starts_.begin(), line_starts_.end(), offset);
  const std::size_t start = *(after - 1);
  std::size_t column = 1;
  for (std::size_t i = start; i < offset; ++i) {
    if (!IsContinuation(text_[i])) ++column;
  }
  return {static_cast<std::size_t>(after - line_starts_.begin()), column};
}

std::size_t SourceText::OffsetOf(std::size_t line, std::size_t byte_column) const {
  const std::size_t start = line_starts_[std::min(line, line_starts_.size()) - 1];
  return std::min(start + byte_column - 1, text_.size());
}

std::optional<SyntaxError> ParseJson(const SourceText& source, Json::Value& value) {
  if (velkor::fromString(value, source.Text())) return std::nullopt;
  return FindSyntaxError(source);
}

std::optional<std::size_t> FindWrongUtf8(const std::string& text) {
  using Utf8 = boost::locale::utf::utf_traits<char>;
  const char* const begin = text.data();
  const char* const end = begin + text.size();
  for (const char* p = begin; p != end;) {
    const char* next = p;
    if (!boost::locale::utf::is_valid_codepoint(Utf8::decode(next, end))) {
      return static_cast<std::size_t>(p - begin);
    }
    p = next;
  }
  return std::nullopt;
}

}  // namespace tool::lint
