// JSON texts with the places of their values.
#pragma once

#include <json/value.h>

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "tool/lint/finding.h"

namespace tool::lint {

// A text and the beginnings of its lines.
class SourceText {
 public:
  explicit SourceText(std::string text);

  const std::string& Text() const { return text_; }

  // Where the byte at `offset` stands; offsets behind the text stand at its end.
  Position At(std::size_t offset) const;

  // The offset of a byte given by its line and its byte in the line, both counted from 1.
  std::size_t OffsetOf(std::size_t line, std::size_t byte_column) const;

 private:
  std::string text_;
  std::vector<std::size_t> line_starts_;
};

struct SyntaxError {
  std::size_t offset = 0;
  std::string message;
};

// Parses as the library does: `value` is filled, and nothing returned, exactly for the texts that
// velkor::fromString takes. The values know their offsets in the text.
std::optional<SyntaxError> ParseJson(const SourceText& source, Json::Value& value);

// The offset of the first byte that is not UTF-8.
std::optional<std::size_t> FindWrongUtf8(const std::string& text);

}  // namespace tool::lint
