#include "appindex/utilities/json_helpers.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "appindex/error.h"
#include "json_samples.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::StartsWith;
using velkor::AppendData;
using velkor::asJsonType;
using velkor::Error;
using velkor::GetJsonValue;
using velkor::isJsonType;
using velkor::JsonArr2Vec;

// The error of reading member "a" of `obj` into a T, which must leave the output untouched.
template <typename T>
Error ErrorOf(const Json::Value& obj, bool required) {
  T out = T();
  try {
    GetJsonValue<T>(out, obj, "a", required);
  } catch (const Error& error) {
    EXPECT_EQ(out, T());
    EXPECT_EQ(error.code, Error::kJsonError);
    return error;
  }
  throw std::logic_error("read without an error");
}

// Member "a" of `obj`, read into a variable that was `preset`.
template <typename T>
T ReadOptional(const std::string& obj, T preset) {
  GetJsonValue<T>(preset, Parsed(obj), "a", false);
  return preset;
}

template <typename T>
T ReadRequired(const std::string& obj) {
  T out = T();
  GetJsonValue<T>(out, Parsed(obj), "a", true);
  return out;
}

TEST(IsJsonTypeTest, FollowsTheJsonLibrarysConvertibility) {
  const std::vector<std::string> texts = {
      "null", "true", "false", "0",     "-1", "2147483648", "4294967296", "1.0",
      "1.5",  "1e40", "\"\"",  "\"x\"", "[]", "[1]",        "{}",         "{\"a\":1}"};
  for (const std::string& text : texts) {
    const Json::Value value = Parsed(text);
    EXPECT_EQ(isJsonType<std::string>(value), value.isConvertibleTo(Json::stringValue)) << text;
    EXPECT_EQ(isJsonType<bool>(value), value.isConvertibleTo(Json::booleanValue)) << text;
    EXPECT_EQ(isJsonType<int>(value), value.isConvertibleTo(Json::intValue)) << text;
    EXPECT_EQ(isJsonType<unsigned int>(value), value.isConvertibleTo(Json::uintValue)) << text;
    EXPECT_EQ(isJsonType<double>(value), value.isConvertibleTo(Json::realValue)) << text;
  }
}

TEST(IsJsonTypeTest, ANumberOrABoolPassesAsAString) {
  EXPECT_TRUE(isJsonType<std::string>(Parsed("1")));
  EXPECT_TRUE(isJsonType<std::string>(Parsed("true")));
  EXPECT_FALSE(isJsonType<std::string>(Parsed("[\"x\"]")));
}

TEST(IsJsonTypeTest, NullPassesEveryTypeButLongLong) {
  const Json::Value null;
  EXPECT_TRUE(isJsonType<std::string>(null));
  EXPECT_TRUE(isJsonType<bool>(null));
  EXPECT_TRUE(isJsonType<int>(null));
  EXPECT_TRUE(isJsonType<unsigned int>(null));
  EXPECT_TRUE(isJsonType<double>(null));
  EXPECT_FALSE(isJsonType<long long>(null));
}

TEST(IsJsonTypeTest, LongLongWantsExactlyAnInteger) {
  EXPECT_TRUE(isJsonType<long long>(Parsed("-1")));
  EXPECT_TRUE(isJsonType<long long>(Json::Value(1U)));
  for (const char* text : {"1.0", "true", "\"1\"", "[]", "{}"}) {
    EXPECT_FALSE(isJsonType<long long>(Parsed(text))) << text;
  }
}

TEST(AsJsonTypeTest, ConvertsAsTheJsonLibraryDoes) {
  EXPECT_EQ(asJsonType<std::string>(Parsed("\"x\"")), "x");
  EXPECT_EQ(asJsonType<std::string>(Parsed("12")), "12");
  EXPECT_EQ(asJsonType<std::string>(Parsed("true")), "true");
  EXPECT_EQ(asJsonType<std::string>(Parsed("null")), "");
  EXPECT_TRUE(asJsonType<bool>(Parsed("2")));
  EXPECT_EQ(asJsonType<int>(Parsed("-7")), -7);
  EXPECT_EQ(asJsonType<int>(Parsed("1.9")), 1);
  EXPECT_EQ(asJsonType<unsigned int>(Parsed("4294967295")), 4294967295U);
  EXPECT_EQ(asJsonType<long long>(Parsed("-9007199254740993")), -9007199254740993LL);
  EXPECT_EQ(asJsonType<double>(Parsed("1")), 1.0);
}

TEST(GetJsonValueTest, ReadsAMemberOfEachType) {
  for (const bool required : {false, true}) {
    const Json::Value obj =
        Parsed(R"({"s":"x","b":true,"i":-1,"u":4294967295,"l":9007199254740993,"d":1.5})");
    std::string text;
    bool flag = false;
    int number = 0;
    unsigned int positive = 0;
    long long large = 0;
    double real = 0;
    GetJsonValue(text, obj, "s", required);
    GetJsonValue(flag, obj, "b", required);
    GetJsonValue(number, obj, "i", required);
    GetJsonValue(positive, obj, "u", required);
    GetJsonValue(large, obj, "l", required);
    GetJsonValue(real, obj, "d", required);
    EXPECT_EQ(text, "x");
    EXPECT_TRUE(flag);
    EXPECT_EQ(number, -1);
    EXPECT_EQ(positive, 4294967295U);
    EXPECT_EQ(large, 9007199254740993LL);
    EXPECT_EQ(real, 1.5);
  }
}

TEST(GetJsonValueTest, AnOptionalMemberOfTheWrongTypeLeavesTheOutputUnchanged) {
  EXPECT_EQ(ReadOptional<int>(R"({"a":"x"})", 7), 7);
  EXPECT_EQ(ReadOptional<bool>(R"({"a":"x"})", true), true);
  EXPECT_EQ(ReadOptional<unsigned int>(R"({"a":-1})", 7), 7U);
  EXPECT_EQ(ReadOptional<long long>(R"({"a":1.0})", 7), 7);
  EXPECT_EQ(ReadOptional<double>(R"({"a":"x"})", 7), 7);
  EXPECT_EQ(ReadOptional<std::string>(R"({"a":["x"]})", "preset"), "preset");
}

TEST(GetJsonValueTest, AnOptionalMemberThatIsMissingLeavesTheOutputUnchanged) {
  EXPECT_EQ(ReadOptional<int>(R"({"b":1})", 7), 7);
  EXPECT_EQ(ReadOptional<std::string>("{}", "preset"), "preset");
  EXPECT_EQ(ReadOptional<Json::Value>("{}", Json::Value(7)), Json::Value(7));
}

TEST(GetJsonValueTest, ARequiredMemberOfTheWrongTypeIsNotAStringWhateverTheType) {
  const Json::Value obj = Parsed(R"({"a":["x"]})");
  const std::string reason = "Not a string" + AppendData(obj);
  EXPECT_EQ(ErrorOf<std::string>(obj, true).reason, reason);
  EXPECT_EQ(ErrorOf<bool>(obj, true).reason, reason);
  EXPECT_EQ(ErrorOf<int>(obj, true).reason, reason);
  EXPECT_EQ(ErrorOf<unsigned int>(obj, true).reason, reason);
  EXPECT_EQ(ErrorOf<long long>(obj, true).reason, reason);
  EXPECT_EQ(ErrorOf<double>(obj, true).reason, reason);
}

TEST(GetJsonValueTest, ARequiredIntThatIsATextThrowsNotAString) {
  EXPECT_THAT(ErrorOf<int>(Parsed(R"({"a":"x"})"), true).reason, StartsWith("Not a string"));
}

TEST(GetJsonValueTest, ALongLongTakesNoRealWhileADoubleTakesAnInteger) {
  EXPECT_THAT(ErrorOf<long long>(Parsed(R"({"a":1.0})"), true).reason, StartsWith("Not a string"));
  EXPECT_EQ(ReadRequired<double>(R"({"a":1})"), 1.0);
}

TEST(GetJsonValueTest, ARequiredMemberThatIsMissingIsNamedWithTheWholeObject) {
  const Json::Value obj = Parsed(R"({"b":1})");
  const std::string reason = "Missing property: a" + AppendData(obj);
  EXPECT_EQ(ErrorOf<int>(obj, true).reason, reason);
  EXPECT_EQ(ErrorOf<std::string>(obj, true).reason, reason);
  EXPECT_EQ(ErrorOf<Json::Value>(obj, true).reason, reason);
}

TEST(GetJsonValueTest, AnythingButAnObjectThrowsEvenForAnOptionalMember) {
  for (const char* text : {"[]", "null", "\"x\"", "1", "true", "[{\"a\":1}]"}) {
    const Json::Value value = Parsed(text);
    for (const bool required : {false, true}) {
      const std::string reason = "Not an object" + AppendData(value);
      EXPECT_EQ(ErrorOf<int>(value, required).reason, reason);
      EXPECT_EQ(ErrorOf<Json::Value>(value, required).reason, reason);
    }
  }
}

TEST(GetJsonValueTest, AnArrayInPlaceOfTheObjectIsReportedWithItsText) {
  EXPECT_EQ(ErrorOf<std::string>(Json::Value(Json::arrayValue), false).reason,
            "Not an object, data=" + velkor::toString(Json::Value(Json::arrayValue)));
}

TEST(GetJsonValueTest, NullIsReadAsTheTypesOwnNothingButNotAsLongLong) {
  EXPECT_EQ(ReadOptional<std::string>(R"({"a":null})", "preset"), "");
  EXPECT_EQ(ReadOptional<int>(R"({"a":null})", 7), 0);
  EXPECT_EQ(ReadOptional<long long>(R"({"a":null})", 7), 7);
}

TEST(GetJsonValueTest, AnIntegerBeyondLongLongIsOfTheWrongType) {
  constexpr char kObject[] = R"({"a":9223372036854775808})";
  EXPECT_EQ(ReadOptional<long long>(kObject, 7), 7);
  EXPECT_EQ(ErrorOf<long long>(Parsed(kObject), true).code, Error::kJsonError);
  EXPECT_EQ(ReadOptional<long long>(R"({"a":9223372036854775807})", 7), 9223372036854775807LL);
}

TEST(GetJsonValueTest, AJsonValueIsCopiedWhateverItsType) {
  for (const char* member : {"null", "1", "\"x\"", "[1,{}]", "{\"b\":2}"}) {
    const std::string obj = std::string(R"({"a":)") + member + "}";
    EXPECT_EQ(ReadOptional<Json::Value>(obj, Json::Value(7)), Parsed(member));
    EXPECT_EQ(ReadRequired<Json::Value>(obj), Parsed(member));
  }
}

TEST(AppendDataTest, IsTheJsonTextOfTheWholeValueBehindItsMark) {
  const Json::Value value = Parsed(R"({"a":[1,"x",null]})");
  const std::string text = AppendData(value);
  ASSERT_THAT(text, StartsWith(", data="));
  EXPECT_EQ(Parsed(text.substr(std::string(", data=").size())), value);
}

TEST(Vec2JsonArrTest, HoldsEachStringInOrder) {
  EXPECT_EQ(velkor::Vec2JsonArr<std::string>({"b", "", "a"}), Parsed(R"(["b","","a"])"));
}

TEST(Vec2JsonArrTest, OfAnEmptyVectorIsAnEmptyArray) {
  EXPECT_EQ(velkor::Vec2JsonArr<std::string>({}), Json::Value(Json::arrayValue));
}

TEST(JsonArr2VecTest, DropsContainerElements) {
  EXPECT_THAT(JsonArr2Vec<std::string>(Parsed(R"(["x",["y"],{"z":1}])")), ElementsAre("x"));
}

TEST(JsonArr2VecTest, KeepsScalarsThatConvertToTextInOrder) {
  EXPECT_THAT(JsonArr2Vec<std::string>(Parsed(R"([1,"x",true,null,[],"y"])")),
              ElementsAre("1", "x", "true", "", "y"));
}

TEST(JsonArr2VecTest, TakesTheMemberValuesOfAnObject) {
  EXPECT_THAT(JsonArr2Vec<std::string>(Parsed(R"({"b":"2","a":"1","c":[]})")),
              ElementsAre("1", "2"));
}

TEST(JsonArr2VecTest, OfAScalarIsEmpty) {
  for (const char* text : {"\"x\"", "1", "true", "null", "1.5"}) {
    EXPECT_THAT(JsonArr2Vec<std::string>(Parsed(text)), IsEmpty()) << text;
  }
}

TEST(JsonArr2VecTest, OfAnEmptyArrayOrObjectIsEmpty) {
  EXPECT_THAT(JsonArr2Vec<std::string>(Parsed("[]")), IsEmpty());
  EXPECT_THAT(JsonArr2Vec<std::string>(Parsed("{}")), IsEmpty());
}

}  // namespace
