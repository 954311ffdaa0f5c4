#include "device/tovo_webui.h"

#include <gtest/gtest.h>
#include <json/reader.h>
#include <sys/stat.h>

#include <cerrno>
#include <memory>
#include <string>

#include "tests/unit/host/child.h"
#include "tests/unit/host/temp_dir.h"

namespace {

using namespace std::string_literals;
using TOVO::PMX::LocalizedStringParser;

Json::Value FromJson(const std::string& text) {
  Json::Value value;
  const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
  EXPECT_TRUE(reader->parse(text.data(), text.data() + text.size(), &value, nullptr)) << text;
  return value;
}

class ParseTextsTest : public testing::Test {
 protected:
  Json::Value Parse(const std::string& content) const {
    dir_.Write("strings", content);
    return LocalizedStringParser::ParseTexts(dir_.Path());
  }

  const TempDir dir_;
};

TEST_F(ParseTextsTest, GivesSectionsOfKeysAndTexts) {
  EXPECT_EQ(Parse("[app]\ntitle=\"Photos\"\ndesc=\"All of them\"\n\n[common]\nok=\"OK\"\n"),
            FromJson(R"({"app":{"title":"Photos","desc":"All of them"},"common":{"ok":"OK"}})"));
}

TEST_F(ParseTextsTest, TextsAreUtf8AsTheyStand) {
  EXPECT_EQ(Parse("[app]\ntitle=\"\xE5\x86\x99\xE7\x9C\x9F\"\n")["app"]["title"].asString(),
            "\xE5\x86\x99\xE7\x9C\x9F");
}

TEST_F(ParseTextsTest, UnderstandsItsThreeEscapesAndKeepsOthers) {
  EXPECT_EQ(Parse(R"([app]
text="\"a\" \\ b\nc \t \x \\n")")["app"]["text"]
                .asString(),
            "\"a\" \\ b\nc \\t \\x \\n");
}

TEST_F(ParseTextsTest, SkipsCommentsAndEmptyLines) {
  EXPECT_EQ(Parse("; one\n# two\n\n[app]\n  # k=\"1\"\n;k=\"2\"\nk=\"3\" ; why\nm=\"4\" # why\n"),
            FromJson(R"({"app":{"k":"3","m":"4"}})"));
}

TEST_F(ParseTextsTest, KeepsCommentMarksInsideATextAndEqualsSignsToo) {
  EXPECT_EQ(Parse("[app]\nk=\"a # b ; c = [d]\"\n")["app"]["k"].asString(), "a # b ; c = [d]");
}

TEST_F(ParseTextsTest, ToleratesCarriageReturnsBlanksAndAByteOrderMark) {
  EXPECT_EQ(Parse("\xEF\xBB\xBF[app]\r\n\tk = \"v\" \r\n [b] \r\nk=\"w\""),
            FromJson(R"({"app":{"k":"v"},"b":{"k":"w"}})"));
}

TEST_F(ParseTextsTest, SkipsLinesThatAreNeitherHeaderNorText) {
  EXPECT_EQ(Parse("[app]\nno\nk=plain\nk='single'\nk=\"open\nk=\"a\"b\nk=\n=\"v\"\n[\n]\n[]\n"
                  "k=\"\\\"\ngood=\"yes\"\n[open\ngood2=\"yes\"\n"),
            FromJson(R"({"app":{"good":"yes","good2":"yes"}})"));
}

TEST_F(ParseTextsTest, TheLastTextOfAKeyHoldsAndSectionsJoin) {
  EXPECT_EQ(Parse("[a]\nk=\"1\"\n[b]\nk=\"2\"\n[a]\nk=\"3\"\nl=\"4\"\n"),
            FromJson(R"({"a":{"k":"3","l":"4"},"b":{"k":"2"}})"));
}

TEST_F(ParseTextsTest, IgnoresTextsBeforeTheFirstSection) {
  EXPECT_EQ(Parse("lost=\"1\"\n[a]\nk=\"2\"\n"), FromJson(R"({"a":{"k":"2"}})"));
}

TEST_F(ParseTextsTest, ASectionWithoutTextsIsNotThere) {
  EXPECT_EQ(Parse("[empty]\n[a]\nk=\"1\"\n"), FromJson(R"({"a":{"k":"1"}})"));
}

TEST_F(ParseTextsTest, AnEmptyTextIsAText) {
  EXPECT_EQ(Parse("[a]\nk=\"\"\n"), FromJson(R"({"a":{"k":""}})"));
}

TEST_F(ParseTextsTest, ANulByteIsAnOrdinaryCharacter) {
  EXPECT_EQ(Parse("[a]\nk=\"x\0y\"\n"s)["a"]["k"].asString(), "x\0y"s);
}

TEST_F(ParseTextsTest, AFileWithoutTextsGivesAnEmptyValue) {
  for (const std::string& content : {""s, "\xEF\xBB\xBF"s, "[a]\n"s, "\n\n#\n"s, "\0\xFF\n"s}) {
    EXPECT_TRUE(Parse(content).isNull());
  }
}

TEST_F(ParseTextsTest, AnAbsentDirectoryOrFileGivesAnEmptyValue) {
  EXPECT_TRUE(LocalizedStringParser::ParseTexts(dir_.Path()).isNull());
  EXPECT_TRUE(LocalizedStringParser::ParseTexts(dir_ / "absent").isNull());
}

TEST_F(ParseTextsTest, AMissingLanguageIsNoErrorToBeLoggedLater) {
  errno = 0;
  EXPECT_TRUE(LocalizedStringParser::ParseTexts(dir_ / "absent").isNull());
  EXPECT_EQ(errno, 0);
}

TEST_F(ParseTextsTest, OnlyARegularFileIsRead) {
  ASSERT_EQ(mkfifo((dir_ / "strings").c_str(), 0600), 0);
  EXPECT_TRUE(LocalizedStringParser::ParseTexts(dir_.Path()).isNull());
  ASSERT_EQ(mkdir((dir_ / "enu").c_str(), 0700), 0);
  ASSERT_EQ(mkdir((dir_ / "enu/strings").c_str(), 0700), 0);
  EXPECT_TRUE(LocalizedStringParser::ParseTexts(dir_ / "enu").isNull());
}

TEST_F(ParseTextsTest, AFileOfUnreasonableSizeGivesAnEmptyValue) {
  const std::string texts = "[a]\nk=\"1\"\n";
  const std::string limit(1024 * 1024 - texts.size(), '\n');
  EXPECT_EQ(Parse(texts + limit), FromJson(R"({"a":{"k":"1"}})"));
  EXPECT_TRUE(Parse(texts + limit + "\n").isNull());
}

TEST_F(ParseTextsTest, AnUnreadableFileGivesAnEmptyValue) {
  ASSERT_EQ(chmod(dir_.Write("strings", "[a]\nk=\"1\"\n").c_str(), 0), 0);
  ASSERT_EQ(chmod(dir_.Path().c_str(), 0755), 0);
  RunInChild([&] {
    BecomeOrdinaryUser();
    EXPECT_TRUE(LocalizedStringParser::ParseTexts(dir_.Path()).isNull());
  });
}

}  // namespace
