// Texts are taken exactly when the library takes them, and errors are placed.
#include "tool/lint/source_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "appindex/utilities/json_helpers.h"

namespace tool::lint {
namespace {

using ::testing::HasSubstr;

std::string Nested(int depth) {
  return std::string(static_cast<std::size_t>(depth), '[') +
         std::string(static_cast<std::size_t>(depth), ']');
}

TEST(SourceText, VerdictIsTheLibrarys) {
  const std::vector<std::string> texts = {"{}",
                                          "[]",
                                          "1",
                                          "\"a\"",
                                          "null",
                                          "true",
                                          " {} \n",
                                          "{\"a\":1}",
                                          "[1,2]",
                                          "[1,]",
                                          "{\"a\":1,}",
                                          "{\"a\":1,\"a\":2}",
                                          "{a:1}",
                                          "{'a':1}",
                                          "// c\n{}",
                                          "{} // c",
                                          "/* c */[]",
                                          "# c\n[]",
                                          "[] []",
                                          "\xEF\xBB\xBF[]",
                                          "",
                                          " ",
                                          "[",
                                          "{\"a\"",
                                          "\"open",
                                          "[01]",
                                          "[1.]",
                                          "[.5]",
                                          "[+1]",
                                          "[-]",
                                          "[1e400]",
                                          "[nan]",
                                          "[NaN]",
                                          "[Infinity]",
                                          "[\"\\q\"]",
                                          "[\"\\u12\"]",
                                          "[\"\\ud800\"]",
                                          "[\"line\nbreak\"]",
                                          "[\"\xFF\"]",
                                          std::string("[]\0", 3),
                                          std::string("[\"\0\"]", 5),
                                          "[\"\\u0000\"]",
                                          Nested(100),
                                          Nested(127),
                                          Nested(128),
                                          Nested(129),
                                          Nested(2000),
                                          "[1;2]",
                                          "{\"a\" 1}",
                                          "{1:2}",
                                          "nul",
                                          "tru",
                                          "[[]",
                                          "{}}",
                                          "9999999999999999999999999"};
  for (const std::string& text : texts) {
    Json::Value expected;
    Json::Value value;
    const bool parses = velkor::fromString(expected, text);
    const auto error = ParseJson(SourceText(text), value);
    EXPECT_EQ(!error, parses) << text;
    EXPECT_EQ(value, expected) << text;
    if (error) {
      EXPECT_FALSE(error->message.empty()) << text;
      EXPECT_LE(error->offset, text.size()) << text;
    }
  }
}

struct Case {
  std::string text;
  std::size_t line;
  std::size_t column;
  std::string message;
};

TEST(SourceText, ErrorsHaveAPlaceAndAPlainMessage) {
  const std::vector<Case> cases = {
      {"[\n  // why\n]", 2, 3, "comments are not allowed"},
      {"[1,\n 2,\n]", 3, 1, "a comma before the closing \"]\""},
      {"{\"a\": 1,}", 1, 9, "a comma before the closing \"}\""},
      {"{\"a\": 'b'}", 1, 7, "double quotes"},
      {"\xEF\xBB\xBF{}", 1, 1, "byte order mark"},
      {" \n", 2, 1, "the file is empty"},
      {"[\"abc", 1, 2, "not closed"},
      {"{\"a\": 1", 1, 8, "ends too early"},
      {"{\"ä\": 1,\n \"ö\": 2, \"ö\": 3}", 2, 10, "Duplicate key"},
      {"{} {}", 1, 4, "Extra non-whitespace"},
      {std::string("[\n\0]", 4), 2, 1, "NUL"},
      {"[\n" + Nested(200) + "]", 2, 200, "too deeply"},
      {"[\"" + std::string(300, '[') + "\", " + Nested(200) + "]", 1, 505, "too deeply"},
      {"[\"\\\"[[[\", [[]], {\"a\": {}}, " + Nested(200) + "]", 1, 227, "too deeply"},
      {"]", 1, 1, "value, object or array expected"},
      {"[1 ]]", 1, 5, "Extra non-whitespace"},
      {"[1 }]", 1, 4, "Missing ',' or ']'"},
      {"\xEF\xBB\xBF{} x", 1, 1, "byte order mark"},
  };
  for (const Case& c : cases) {
    const SourceText source(c.text);
    Json::Value ignored;
    const auto error = ParseJson(source, ignored);
    ASSERT_TRUE(error) << c.text;
    EXPECT_THAT(error->message, HasSubstr(c.message)) << c.text;
    const Position at = source.At(error->offset);
    EXPECT_EQ(at.line, c.line) << c.text;
    EXPECT_EQ(at.column, c.column) << c.text;
  }
}

TEST(SourceText, PlacesCountLinesAndCharacters) {
  const SourceText source("aä\r\nb\rc\n\nd");
  const auto at = [&](std::size_t offset) {
    const Position position = source.At(offset);
    return std::to_string(position.line) + ":" + std::to_string(position.column);
  };
  EXPECT_EQ(at(0), "1:1");
  EXPECT_EQ(at(3), "1:3");  // behind the character of two bytes
  EXPECT_EQ(at(5), "2:1");
  EXPECT_EQ(at(7), "3:1");
  EXPECT_EQ(at(10), "5:1");
  EXPECT_EQ(at(999), "5:2");
}

TEST(SourceText, LineEndAtTheEndOfTheTextBeginsALine) {
  for (const char* text : {"a\n", "a\r", "a\r\n"}) {
    const SourceText source(text);
    EXPECT_EQ(source.At(99).line, 2U);
    EXPECT_EQ(source.At(99).column, 1U);
  }
}

TEST(SourceText, FirstWrongByteIsFound) {
  EXPECT_EQ(FindWrongUtf8("aä日𝄞"), std::nullopt);
  EXPECT_EQ(FindWrongUtf8(""), std::nullopt);
  EXPECT_EQ(FindWrongUtf8("ab\x80"), 2U);
  EXPECT_EQ(FindWrongUtf8("ä\xC3"), 2U);
  EXPECT_EQ(FindWrongUtf8("\xED\xA0\x80"), 0U);  // half of a surrogate pair
}

}  // namespace
}  // namespace tool::lint
