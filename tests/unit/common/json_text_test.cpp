#include <gmock/gmock.h>
#include <json/value.h>
#include <pthread.h>

#include <functional>
#include <limits>
#include <string>

#include "appindex/utilities/json_helpers.h"
#include "json_samples.h"

namespace {

using velkor::fromString;
using velkor::toString;

constexpr int kDeepest = 127;

bool IsJson(const std::string& text) {
  Json::Value value;
  return fromString(value, text);
}

std::string Repeat(const std::string& text, int times) {
  std::string all;
  for (int i = 0; i < times; ++i) all += text;
  return all;
}

std::string NestedArrays(int levels) { return Repeat("[", levels) + "1" + Repeat("]", levels); }

std::string NestedObjects(int levels) {
  return Repeat(R"({"a":)", levels) + "1" + Repeat("}", levels);
}

// Runs `work` in a thread with a stack of 256 KiB.
void OnASmallStack(std::function<void()> work) {
  constexpr std::size_t kStackSize = 256 * 1024;
  pthread_attr_t attributes;
  pthread_attr_init(&attributes);
  ASSERT_EQ(pthread_attr_setstacksize(&attributes, kStackSize), 0);
  pthread_t thread;
  const auto run = [](void* argument) -> void* {
    (*static_cast<std::function<void()>*>(argument))();
    return nullptr;
  };
  ASSERT_EQ(pthread_create(&thread, &attributes, run, &work), 0);
  pthread_join(thread, nullptr);
  pthread_attr_destroy(&attributes);
}

TEST(FromStringTest, ParsesAnyTypeOfRoot) {
  EXPECT_EQ(Parsed("null"), Json::Value());
  EXPECT_EQ(Parsed("true"), Json::Value(true));
  EXPECT_EQ(Parsed("-12"), Json::Value(-12));
  EXPECT_EQ(Parsed("1.5"), Json::Value(1.5));
  EXPECT_EQ(Parsed("\"x\""), Json::Value("x"));
  EXPECT_EQ(Parsed("[]"), Json::Value(Json::arrayValue));
  EXPECT_EQ(Parsed("{}"), Json::Value(Json::objectValue));
}

TEST(FromStringTest, ReplacesTheWholeValue) {
  Json::Value value = Parsed(R"({"old":1})");
  ASSERT_TRUE(fromString(value, R"({"new":2})"));
  EXPECT_EQ(value, Parsed(R"({"new":2})"));
}

TEST(FromStringTest, AllowsWhiteSpaceAround) {
  EXPECT_EQ(Parsed(" \t\r\n{ } \n\r\t "), Parsed("{}"));
}

TEST(FromStringTest, RefusesATextWithoutAValue) {
  EXPECT_FALSE(IsJson(""));
  EXPECT_FALSE(IsJson(" \n"));
}

TEST(FromStringTest, TakesSlashesInStrings) {
  EXPECT_TRUE(IsJson(R"({"a//b":"/* c */","c\"/*d":"\\"})"));
}

TEST(FromStringTest, RefusesComments) {
  EXPECT_FALSE(IsJson("/* c */ {}"));
  EXPECT_FALSE(IsJson("{} // c"));
  for (const char* text :
       {"{ // c\n}", "{ /* c */ \"a\":1}", "{\"a\":1 /* c */}", "{\"a\" /* c */:1}",
        "{\"a\": /* c */ 1}", "[ /* c */ ]", "[1 /* c */]", "[1, // c\n2]"}) {
    EXPECT_FALSE(IsJson(text)) << text;
  }
  EXPECT_FALSE(IsJson("{} /* c */"));
  EXPECT_FALSE(IsJson("[1, // c\n 2]"));
}

TEST(FromStringTest, RefusesATrailingComma) {
  EXPECT_FALSE(IsJson("[1,]"));
  EXPECT_FALSE(IsJson("[,]"));
  EXPECT_FALSE(IsJson(R"({"a":1,})"));
}

TEST(FromStringTest, RefusesElementsLeftOut) {
  EXPECT_FALSE(IsJson("[1,,2]"));
  EXPECT_FALSE(IsJson(R"({"a":})"));
}

TEST(FromStringTest, RefusesAnythingButWhiteSpaceBehindTheValue) {
  EXPECT_FALSE(IsJson("{}x"));
  EXPECT_FALSE(IsJson("{} {}"));
  EXPECT_FALSE(IsJson("1 2"));
  EXPECT_FALSE(IsJson("[]]"));
  EXPECT_FALSE(IsJson("[],"));
}

TEST(FromStringTest, RefusesATornText) {
  EXPECT_FALSE(IsJson("{"));
  EXPECT_FALSE(IsJson("[1"));
  EXPECT_FALSE(IsJson("\"x"));
  EXPECT_FALSE(IsJson(R"({"a")"));
  EXPECT_FALSE(IsJson("tru"));
}

TEST(FromStringTest, RefusesABackslashOutsideOfATextWhateverFollows) {
  EXPECT_FALSE(IsJson(R"([1] \)"));
  EXPECT_FALSE(IsJson("[1 \\\"x\"]"));
  EXPECT_FALSE(IsJson("[1 \\// x\n]"));
}

TEST(FromStringTest, RefusesWhatOnlyJavaScriptAllows) {
  EXPECT_FALSE(IsJson("'x'"));
  EXPECT_FALSE(IsJson("{'a':1}"));
  EXPECT_FALSE(IsJson("{a:1}"));
  EXPECT_FALSE(IsJson("{1:1}"));
  EXPECT_FALSE(IsJson("NaN"));
  EXPECT_FALSE(IsJson("[Infinity]"));
  EXPECT_FALSE(IsJson("-Infinity"));
}

TEST(FromStringTest, RefusesAMemberNamedTwice) { EXPECT_FALSE(IsJson(R"({"a":1,"a":2})")); }

TEST(FromStringTest, RefusesAByteOrderMark) { EXPECT_FALSE(IsJson("\xEF\xBB\xBF{}")); }

TEST(FromStringTest, RefusesARawNul) {
  using std::string_literals::operator""s;
  EXPECT_FALSE(IsJson("{}\0"s));
  EXPECT_FALSE(IsJson("\0{}"s));
  EXPECT_FALSE(IsJson("{}\0garbage"s));
  EXPECT_FALSE(IsJson("[1,\0 2]"s));
  EXPECT_FALSE(IsJson("\"a\0b\""s));
}

TEST(FromStringTest, AllowsAnEscapedNul) {
  EXPECT_EQ(Parsed(R"("a\u0000b")").asString(), std::string("a\0b", 3));
}

TEST(FromStringTest, KeepsTextsOfAllLanguages) {
  EXPECT_EQ(Parsed("\"ä日本🎵\"").asString(), "ä日本🎵");
  EXPECT_EQ(Parsed(R"("\u00e4\ud83c\udfb5")").asString(), "ä🎵");
}

TEST(FromStringTest, LeavesTheValueUntouchedUnlessItParses) {
  Json::Value value = Parsed(R"({"kept":[1]})");
  for (const std::string& text : {std::string(), std::string("{\"a\":1,"), std::string("{} x"),
                                  std::string("[1]\0", 4), NestedArrays(100000)}) {
    EXPECT_FALSE(fromString(value, text));
    EXPECT_EQ(value, Parsed(R"({"kept":[1]})"));
  }
}

TEST(FromStringTest, ParsesAHundredLevelsOnASmallStack) {
  OnASmallStack([] {
    EXPECT_TRUE(IsJson(NestedArrays(100)));
    EXPECT_TRUE(IsJson(NestedObjects(100)));
  });
}

TEST(FromStringTest, ParsesTheDeepestLevelAllowedOnASmallStackAndNoDeeper) {
  OnASmallStack([] {
    EXPECT_TRUE(IsJson(NestedArrays(kDeepest)));
    EXPECT_FALSE(IsJson(NestedArrays(kDeepest + 1)));
    EXPECT_TRUE(IsJson(NestedObjects(kDeepest)));
    EXPECT_FALSE(IsJson(NestedObjects(kDeepest + 1)));
  });
}

TEST(FromStringTest, RefusesFarTooDeepTextsOnASmallStack) {
  OnASmallStack([] {
    for (const int levels : {500, 999, 1001, 100000}) {
      EXPECT_FALSE(IsJson(NestedArrays(levels))) << levels;
      EXPECT_FALSE(IsJson(NestedObjects(levels))) << levels;
      EXPECT_FALSE(IsJson(Repeat(R"([{"a":)", levels / 2))) << levels;
      EXPECT_FALSE(IsJson(Repeat("[", levels))) << levels;
    }
  });
}

TEST(FromStringTest, BracketsInsideTextsAreNoDepth) {
  const std::string brackets = Repeat("[{", 1000);
  EXPECT_EQ(Parsed("\"" + brackets + "\"").asString(), brackets);
  EXPECT_EQ(Parsed("[\"\\\"" + brackets + "\"]")[0].asString(), "\"" + brackets);
  EXPECT_EQ(Parsed("[\"\\\\\",\"" + brackets + "\"]")[1].asString(), brackets);
}

TEST(FromStringTest, DepthIsNotTheNumberOfContainers) {
  EXPECT_EQ(Parsed("[" + Repeat("[],", 1000) + "{}]").size(), 1001U);
}

TEST(ToStringTest, GivesATextThatParsesToTheSameValue) {
  const Json::Value value =
      Parsed(R"({"a":[1,-2,1.25,true,false,null,""],"b":{"":{}},"c":"ä日🎵\"\\\n\u0000","d":0.1})");
  EXPECT_EQ(Parsed(toString(value)), value);
}

TEST(ToStringTest, GivesATextForEveryTypeOfRoot) {
  for (const char* text : {"null", "true", "1", "\"x\"", "[]", "{}"}) {
    EXPECT_EQ(Parsed(toString(Parsed(text))), Parsed(text)) << text;
  }
}

TEST(ToStringTest, KeepsTheLargestNumbers) {
  Json::Value value;
  value.append(std::numeric_limits<Json::Int64>::min());
  value.append(std::numeric_limits<Json::UInt64>::max());
  value.append(std::numeric_limits<double>::max());
  EXPECT_EQ(Parsed(toString(value)), value);
}

TEST(ToStringTest, IsOneLine) {
  EXPECT_THAT(toString(Parsed(R"({"a":["x","y\n\r"],"b":{"c":1}})")),
              testing::Each(testing::Ge(' ')));
}

TEST(ToStringTest, IsUtf8) {
  EXPECT_EQ(toString(Parsed(R"(["\u00e4","日","🎵"])")), R"(["ä","日","🎵"])");
}

TEST(ToStringTest, OneTextThatIsNoUtf8LeavesTheOthersWhole) {
  Json::Value value = Parsed(R"({"ä":["日","🎵"]})");
  value["bad"] = "\xFF";
  const std::string text = toString(value);
  value["bad"] = "\xEF\xBF\xBD";
  EXPECT_EQ(Parsed(text), value);
}

TEST(ToStringTest, MemberNamesThatAreNoUtf8AreMended) {
  Json::Value value;
  value["\xFF"] = 1;
  EXPECT_EQ(Parsed(toString(value)), Parsed("{\"\xEF\xBF\xBD\":1}"));
}

TEST(ToStringTest, BytesThatAreNoUtf8BecomeTheReplacementCharacter) {
  EXPECT_EQ(Parsed(toString(Json::Value("a\xFFz"))).asString(), "a\xEF\xBF\xBDz");
  for (const char* bytes : {"\xC3", "\xE6\x97", "\x80", "\xED\xA0\x80", "\xF8\x88\x80\x80\x80"}) {
    EXPECT_TRUE(IsJson(toString(Json::Value(bytes))));
  }
}

}  // namespace
