#include "host/searchd/json_text.h"

#include <gtest/gtest.h>

#include <string>

#include "host/searchd/request_error.h"

namespace searchd {
namespace {

std::string Nested(int levels) {
  return std::string(static_cast<std::size_t>(levels), '[') +
         std::string(static_cast<std::size_t>(levels), ']');
}

TEST(ParseJsonTest, TakesAnyValue) {
  EXPECT_EQ(ParseJson(" {\"a\":[1,2]} ")["a"][1], 2);
  EXPECT_EQ(ParseJson("\"text\""), "text");
  EXPECT_TRUE(ParseJson("null").isNull());
  EXPECT_NO_THROW(ParseJson(Nested(99)));
}

TEST(ParseJsonTest, RejectsEverythingElse) {
  for (const std::string& text :
       {std::string(), std::string("{"), std::string("{}{}"), std::string("{\"a\":1,}"),
        std::string("[1,]"), std::string("/* */1"), std::string("{'a':1}"), std::string("NaN"),
        std::string("{\"a\":1,\"a\":2}"), std::string("1\0", 2), std::string("\"\xc3\""),
        std::string("\"\\u0000\""), std::string("{\"\\u0000\":1}"), std::string("\"\\udc00\""),
        Nested(200), Nested(1000000)}) {
    EXPECT_THROW(ParseJson(text), RequestError) << text.substr(0, 100);
  }
}

TEST(ParseJsonTest, NamesTheMemberThatHoldsUnusableText) {
  try {
    ParseJson(R"({"data":{"list":["ok",{"title":"\u0000"}]}})");
    FAIL() << "nothing thrown";
  } catch (const RequestError& e) {
    EXPECT_EQ(e.GetCode(), Code::kRejected);
    EXPECT_NE(std::string(e.what()).find("\"title\""), std::string::npos) << e.what();
  }
}

TEST(JsonTextTest, IsOneLineOfUtf8) {
  EXPECT_EQ(JsonText(ParseJson("{\n\"a\" : [ \"ü\", 1.5 ]}")), "{\"a\":[\"ü\",1.5]}");
}

}  // namespace
}  // namespace searchd
