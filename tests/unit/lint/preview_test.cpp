// What a descriptor gives, shown from any place as it would be from an installed package.
#include "tool/preview.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include "tests/unit/host/temp_dir.h"
#include "tool/failure.h"

namespace tool {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;

class PreviewTest : public ::testing::Test {
 protected:
  PreviewTest() {
    dir_.Write("texts/enu/strings", "[app]\ntitle=\"Album\"\nkw=\"photos\"\n");
    dir_.Write("texts/ger/strings", "[app]\ntitle=\"Fotoalbum\"\nkw=\"Bilder\"\n");
    options_.langs = {"enu", "ger"};
    options_.model = "M1";
    options_.platform = "p1";
  }

  Preview Make(const std::string& descriptor) {
    const std::string file = dir_.Write("target/ui/index.conf", descriptor);
    return MakePreview(lint::FindPackages(dir_.Path(), "")[0], file, options_);
  }

  std::string LineOf(const std::string& descriptor) {
    try {
      Make(descriptor);
    } catch (const Failure& failure) {
      return failure.what();
    }
    return "";
  }

  TempDir dir_;
  PreviewOptions options_;
};

TEST_F(PreviewTest, DocumentsAreThoseThatAddSends) {
  const Preview preview = Make(R"({"app": "A", "title": "app:title", "desc": "literal",
      "keywords": [{"text": "app:kw", "weight": 2}, "JPEG"]})");
  ASSERT_EQ(preview.documents.size(), 2U);
  EXPECT_EQ(preview.documents[1].lang, "ger");
  Json::Value expected;
  expected["id"] = "A";
  expected["owner"] = "";
  expected["title"] = expected["search_title"] = "Fotoalbum";
  expected["desc"] = "literal";
  expected["keywords"] = "Album Bilder photos Bilder photos JPEG JPEG ";
  EXPECT_EQ(preview.documents[1].document, expected);
}

TEST_F(PreviewTest, StringsetOfTheDescriptorHolds) {
  dir_.Write("target/ui/strs/enu/strings", "[app]\ntitle=\"Beside\"\n");
  const Preview preview = Make(R"({"app": "A", "title": "app:title", "stringset": "strs"})");
  EXPECT_EQ(preview.documents[0].document["title"], "Beside");
  EXPECT_EQ(preview.records[0]["stringset"], "strs");
}

TEST_F(PreviewTest, RecordsStayAsTheLibraryGivesThem) {
  const Preview preview = Make(R"({"app": "A", "title": "app:title"})");
  EXPECT_TRUE(preview.records[0]["stringset"].isNull());
  EXPECT_EQ(preview.records[0]["path"], dir_ / "target/ui/index.conf");
}

TEST_F(PreviewTest, WhatFiltersLeaveOutIsSaidWithTheListAndTheValue) {
  const Preview preview = Make(R"([
      {"app": "A", "title": "t", "modules": [
        {"params": "in", "title": "m", "enable": {"model": ["M2"], "platform": ["p1"]}},
        {"params": "out", "title": "m", "disable": {"model": ["M9"], "platform": ["p1"]}}]},
      {"app": "B", "title": "t", "enable": {"model": ["M2"], "platform": ["p2"]},
       "modules": [{"params": "x", "title": "m"}]},
      {"app": "C", "title": "t", "disable": {"model": ["M1"]}},
      {"app": "D", "title": "t", "enable": {}}])");
  std::vector<std::string> said;
  for (const LeftOut& item : preview.left_out) {
    said.push_back(item.pointer + " " + item.id + " " + item.filter + ": " + item.reason);
  }
  EXPECT_THAT(said,
              ElementsAre(R"(/0/modules/1 A?out disable: "disable" lists the platform p1)",
                          R"(/1 B enable: "enable" does not list the model M1 or the platform p1)",
                          "/1/modules/0 B?x entry: its entry is left out",
                          R"(/2 C disable: "disable" lists the model M1)",
                          R"(/3 D enable: "enable" lists no model and no platform)"));
  ASSERT_EQ(preview.records.size(), 2U);
  EXPECT_EQ(preview.records[1]["id"], "A?in");
}

TEST_F(PreviewTest, ModuleThatTheLibraryDropsIsSaid) {
  const Preview preview =
      Make(R"({"app": "A", "title": "t", "modules": [{"params": [], "title": "m"}]})");
  ASSERT_EQ(preview.left_out.size(), 1U);
  EXPECT_EQ(preview.left_out[0].pointer, "/modules/0");
  EXPECT_EQ(preview.left_out[0].filter, "params");
  EXPECT_EQ(preview.records.size(), 1U);
}

TEST_F(PreviewTest, WhatIsNoListOfModulesIsSaid) {
  const Preview preview = Make(R"({"app": "A", "title": "t", "modules": 5})");
  ASSERT_EQ(preview.left_out.size(), 1U);
  EXPECT_EQ(preview.left_out[0].pointer, "/modules");
  EXPECT_EQ(preview.left_out[0].filter, "type");
  EXPECT_EQ(preview.left_out[0].reason, "gives nothing: not a list");
  EXPECT_EQ(preview.records.size(), 1U);
}

TEST_F(PreviewTest, DescriptorThatCannotBeReadIsNamedWithTheCause) {
  const std::string file = dir_.Write("target/ui/index.conf", "{}");
  const lint::Package package = lint::FindPackages(dir_.Path(), "")[0];
  ASSERT_EQ(truncate(file.c_str(), 20 * 1024 * 1024), 0);
  try {
    MakePreview(package, file, options_);
    FAIL() << "it was read";
  } catch (const Failure& failure) {
    EXPECT_THAT(failure.what(),
                HasSubstr("target/ui/index.conf: cannot be read: longer than 16 MiB; make it "));
  }
}

TEST_F(PreviewTest, FailuresNameTheFileAndTheCause) {
  EXPECT_THAT(LineOf("{\n,}"), HasSubstr("target/ui/index.conf:2:1: "));
  EXPECT_THAT(LineOf(R"({"app": 7, "title": "t"})"), HasSubstr("adding it would fail"));
  EXPECT_THAT(LineOf(R"({"app": "A", "title": []})"), HasSubstr("adding it would fail"));
  EXPECT_THAT(LineOf(R"({"app": "A", "title": "a\u0000b"})"),
              HasSubstr("adding it would fail: the search daemon does not take the document"));
}

}  // namespace
}  // namespace tool
