// Texts of shapes that the host's parser never gives, and a parser that throws.
#include <gmock/gmock.h>
#include <json/value.h>

#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include "appindex/device_identity.h"
#include "appindex/string_pool.h"
#include "appindex/utilities/json_helpers.h"
#include "tests/support/device_root_test.h"
#include "tests/support/fake_texts.h"

namespace velkor::appindex {
namespace {

using test::Texts;
using ::testing::IsEmpty;
using ::testing::SizeIs;

Json::Value Parse(const std::string& text) {
  Json::Value value;
  EXPECT_TRUE(fromString(value, text)) << text;
  return value;
}

// English has the text common:ok; German is what the test says.
void SetGerman(const std::string& json) {
  const Json::Value german = Parse(json);
  Texts().parse = [german](const std::string& dir) {
    if (dir == "/texts/enu") return Parse(R"({"common":{"ok":"OK"}})");
    return dir == "/texts/ger" ? german : Json::Value();
  };
}

struct Shape {
  const char* name;
  const char* german;
  const char* common_ok;  // what common:ok gives in German
};

class ShapeTest : public test::DeviceRootTest, public ::testing::WithParamInterface<Shape> {};

TEST_P(ShapeTest, GivesItsAnswerAndNeverThrows) {
  SetGerman(GetParam().german);
  EXPECT_EQ(LanguagePack("/texts/").GetString("ger", "common", "ok"), GetParam().common_ok);
  EXPECT_THAT(TakeLog(), IsEmpty());
}

INSTANTIATE_TEST_SUITE_P(
    , ShapeTest,
    ::testing::Values(
        Shape{"SectionIsAStringGivesThePlaceholder", R"({"common":"ok"})", "common:ok"},
        Shape{"SectionIsANumberGivesThePlaceholder", R"({"common":5})", "common:ok"},
        Shape{"SectionIsABoolGivesThePlaceholder", R"({"common":true})", "common:ok"},
        Shape{"SectionIsAnArrayGivesThePlaceholder", R"({"common":["ok"]})", "common:ok"},
        Shape{"SectionIsNullHasNoKeys", R"({"common":null})", ""},
        Shape{"SectionIsEmptyHasNoKeys", R"({"common":{}})", ""},
        Shape{"TextIsANumberIsConverted", R"({"common":{"ok":5}})", "5"},
        Shape{"TextIsABoolIsConverted", R"({"common":{"ok":true}})", "true"},
        Shape{"TextIsNullGivesTheEmptyString", R"({"common":{"ok":null}})", ""},
        Shape{"TextIsAnArrayGivesThePlaceholder", R"({"common":{"ok":["a"]}})", "common:ok"},
        Shape{"TextIsAnObjectGivesThePlaceholder", R"({"common":{"ok":{"a":"b"}}})", "common:ok"},
        Shape{"LanguageIsAnArrayGivesThePlaceholder", R"(["common"])", "common:ok"},
        Shape{"LanguageIsAStringIsLeftOut", R"("common")", "OK"},
        Shape{"LanguageIsANumberIsLeftOut", "5", "OK"},
        Shape{"LanguageIsAnEmptyObjectIsLeftOut", "{}", "OK"},
        Shape{"LanguageIsAnEmptyArrayIsLeftOut", "[]", "OK"},
        Shape{"LanguageIsNullIsLeftOut", "null", "OK"}),
    [](const auto& param_info) { return param_info.param.name; });

class ParserTest : public test::DeviceRootTest {};

TEST_F(ParserTest, IsAskedOnceForEveryLanguageInAscendingOrder) {
  const LanguagePack pack("/texts/");
  std::vector<std::string> dirs;
  for (const std::string& lang : GetSupportedLangs()) dirs.push_back("/texts/" + lang);
  EXPECT_EQ(Texts().dirs, dirs);
}

TEST_F(ParserTest, ThatThrowsEndsTheConstruction) {
  Texts().parse = [](const std::string& dir) -> Json::Value {
    if (dir == "/texts/ger") throw std::runtime_error("broken file");
    return Parse(R"({"common":{"ok":"OK"}})");
  };
  try {
    const LanguagePack pack("/texts/");
    FAIL() << "no exception";
  } catch (const std::runtime_error& error) {
    EXPECT_STREQ(error.what(), "broken file");
  }
  EXPECT_EQ(Texts().dirs.back(), "/texts/ger");
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(ParserTest, ThatThrowsLeavesNothingInThePool) {
  StringPool pool;
  pool.SetTextsRootByStringSet("/a/index.conf", "texts");
  Texts().parse = [](const std::string&) -> Json::Value { throw std::runtime_error("broken"); };
  EXPECT_THROW(pool.GetLangPack("/a/texts/"), std::runtime_error);
  EXPECT_THROW(pool.GetString("enu", "common", "ok"), std::runtime_error);
  EXPECT_THROW(pool.GetString("enu", "common:ok"), std::runtime_error);

  Texts().parse = [](const std::string&) { return Parse(R"({"common":{"ok":"OK"}})"); };
  EXPECT_EQ(pool.GetString("enu", "common:ok"), "OK");
}

TEST_F(ParserTest, IsNotAskedForATextWithoutAColon) {
  StringPool pool;
  EXPECT_EQ(pool.GetString("enu", "Backup"), "Backup");
  EXPECT_THAT(Texts().dirs, IsEmpty());
}

TEST_F(ParserTest, IsAskedOnceForATextsRoot) {
  StringPool pool;
  pool.GetString("enu", "common:ok");
  pool.GetString("ger", "common", "ok");
  pool.GetLangPack("/usr/tovo/tovoman/webman/texts/");
  EXPECT_THAT(Texts().dirs, SizeIs(21));
}

}  // namespace
}  // namespace velkor::appindex
