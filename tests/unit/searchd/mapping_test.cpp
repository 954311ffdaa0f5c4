#include "host/searchd/mapping.h"

#include <gtest/gtest.h>

#include <string>
#include <utility>
#include <vector>

#include "host/searchd/json_text.h"
#include "host/searchd/request_error.h"

namespace searchd {
namespace {

Mapping FromText(const std::string& text) { return Mapping::Parse(ParseJson(text)); }

TEST(MappingTest, ReadsTheSchemaOfApplications) {
  const Mapping mapping = FromText(R"({
    "property_id": "id",
    "default": {"type": "string", "analyzer": "tovostandard", "required": false, "stored": true,
                "_all": true},
    "properties": {
      "id": {"analyzer": "keyword", "required": true, "_all": false},
      "title": {"type": "text"},
      "search_title": {"type": "text", "analyzer": "white space",
                       "preprocess": ["tolower", "ngram"]}}})");
  EXPECT_EQ(mapping.KeyField(), "id");
  EXPECT_EQ(mapping.Fields().size(), 3U);

  const FieldRule& id = mapping.RuleOf("id");
  EXPECT_EQ(id.analyzer, AnalyzerKind::kKeyword);
  EXPECT_TRUE(id.required);
  EXPECT_FALSE(id.in_all);
  EXPECT_TRUE(id.stored);

  const FieldRule& search_title = mapping.RuleOf("search_title");
  EXPECT_EQ(search_title.analyzer, AnalyzerKind::kWhiteSpace);
  EXPECT_TRUE(search_title.lower_case);
  EXPECT_TRUE(search_title.ngram);
  EXPECT_TRUE(search_title.in_all);

  EXPECT_EQ(mapping.RuleOf("title").analyzer, AnalyzerKind::kStandard);
  EXPECT_EQ(mapping.RuleOf("anything").analyzer, AnalyzerKind::kStandard);
}

TEST(MappingTest, GivesThePropertiesTheDefaultRule) {
  const Mapping mapping = FromText(R"({
    "property_id": "key",
    "default": {"analyzer": "white space", "preprocess": ["tolower"], "stored": false},
    "properties": {"a": {"preprocess": []}, "b": {}}})");
  EXPECT_FALSE(mapping.RuleOf("a").lower_case);
  EXPECT_TRUE(mapping.RuleOf("b").lower_case);
  EXPECT_FALSE(mapping.RuleOf("b").stored);
  EXPECT_TRUE(mapping.RuleOf("c").lower_case);
}

TEST(MappingTest, NeedsNoMoreThanTheKey) {
  const Mapping mapping = FromText(R"({"property_id":"key"})");
  EXPECT_TRUE(mapping.Fields().empty());
  EXPECT_TRUE(mapping.DefaultRule().stored);
  EXPECT_FALSE(mapping.DefaultRule().required);
}

TEST(MappingTest, NamesTheMemberThatIsWrong) {
  const std::string name_too_long(65, 'n');
  const std::vector<std::pair<std::string, std::string>> cases = {
      {R"("text")", "mappings"},
      {R"({})", "mappings.property_id"},
      {R"({"property_id":""})", "mappings.property_id"},
      {R"({"property_id":1})", "mappings.property_id"},
      {R"({"property_id":"id","extra":1})", "mappings.extra"},
      {R"({"property_id":"id","default":[]})", "mappings.default"},
      {R"({"property_id":"id","default":null})", "mappings.default"},
      {R"({"property_id":"id","default":{"stored":"yes"}})", "mappings.default.stored"},
      {R"({"property_id":"id","properties":[]})", "mappings.properties"},
      {R"({"property_id":"id","properties":{"a":1}})", "mappings.properties.a"},
      {R"({"property_id":"id","properties":{"":{}}})", "mappings.properties."},
      {R"({"property_id":"id","properties":{")" + name_too_long + R"(":{}}})",
       "mappings.properties." + name_too_long},
      {R"({"property_id":"id","properties":{"a":{"type":"int"}}})", "mappings.properties.a.type"},
      {R"({"property_id":"id","properties":{"a":{"analyzer":"Keyword"}}})",
       "mappings.properties.a.analyzer"},
      {R"({"property_id":"id","properties":{"a":{"analyzer":1}}})",
       "mappings.properties.a.analyzer"},
      {R"({"property_id":"id","properties":{"a":{"required":0}}})",
       "mappings.properties.a.required"},
      {R"({"property_id":"id","properties":{"a":{"_all":null}}})", "mappings.properties.a._all"},
      {R"({"property_id":"id","properties":{"a":{"preprocess":"tolower"}}})",
       "mappings.properties.a.preprocess"},
      {R"({"property_id":"id","properties":{"a":{"preprocess":["stem"]}}})",
       "mappings.properties.a.preprocess"},
      {R"({"property_id":"id","properties":{"a":{"preprocess":["ngram","tolower"]}}})",
       "mappings.properties.a.preprocess"},
      {R"({"property_id":"id","properties":{"a":{"color":"red"}}})", "mappings.properties.a.color"},
  };
  for (const auto& [text, member] : cases) {
    try {
      FromText(text);
      ADD_FAILURE() << "accepted: " << text;
    } catch (const RequestError& e) {
      EXPECT_EQ(e.GetCode(), Code::kRejected);
      EXPECT_EQ(std::string(e.what()).find("\"" + member + "\""), 0U) << e.what();
    }
  }
}

}  // namespace
}  // namespace searchd
