// Indexes whose mapping is another one than that of applications.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "host/searchd/request_error.h"
#include "tests/unit/searchd/memory_index.h"

namespace searchd {
namespace {

MemoryIndex IndexWith(const char* mappings) { return MemoryIndex("enu", test::FromText(mappings)); }

TEST(SchemaTest, NeedsNoMoreThanAKey) {
  MemoryIndex index = IndexWith(R"({"property_id":"isbn"})");
  index.Add(test::FromText(R"({"isbn":"1-2","author":"Poe","name":"The Raven"})"));
  index.Add(test::FromText(R"({"isbn":"3-4","author":"Twain","name":"Roughing It"})"));
  for (const char* query : {"poe", "rav", "raven poe", "POE THE RAV", "1-2", "aven"}) {
    EXPECT_EQ(index.Find(query), Strings{"1-2"}) << query;
  }
  EXPECT_EQ(index.Find("twain raven"), Strings{});
}

TEST(SchemaTest, AMemberOfAnyNameMayHoldPartsOfWords) {
  MemoryIndex index = IndexWith(R"({
    "property_id": "id", "default": {"_all": false},
    "properties": {"parts": {"analyzer": "white space", "preprocess": ["tolower", "ngram"],
                             "_all": true}}})");
  index.Add(test::FromText(R"({"id":"1","parts":"BitTorrent Télé","hidden":"gold"})"));
  for (const char* query : {"torrent", "TORR", "bit", "bittorrent télé", "tele", "ttor élé"}) {
    EXPECT_EQ(index.Find(query), Strings{"1"}) << query;
  }
  EXPECT_EQ(index.MatchedBy("torrent"), "ngram");
  for (const char* query : {"gold", "torrents", "1"}) {
    EXPECT_EQ(index.Find(query), Strings{}) << query;
  }
}

TEST(SchemaTest, PartsOfWordsWithoutFoldingAreExact) {
  MemoryIndex index = IndexWith(R"({
    "property_id": "id", "default": {"_all": false},
    "properties": {"parts": {"analyzer": "white space", "preprocess": ["ngram"],
                             "_all": true}}})");
  index.Add(test::FromText(R"({"id":"1","parts":"BitTorrent"})"));
  EXPECT_EQ(index.Find("Torr"), Strings{"1"});
  EXPECT_EQ(index.Find("torr"), Strings{});
}

TEST(SchemaTest, WordsBetweenWhiteSpaceAreExactOrFolded) {
  MemoryIndex index = IndexWith(R"({
    "property_id": "id", "default": {"_all": false},
    "properties": {
      "exact": {"analyzer": "white space", "_all": true},
      "folded": {"analyzer": "white space", "preprocess": ["tolower"], "_all": true}}})");
  index.Add(test::FromText(R"({"id":"1","exact":"A-7 b.C","folded":"X-9 Größe"})"));
  for (const char* query : {"A-7", "b.C", "b.C A-7", "A-7 b.", "x-9", "X-9", "grosse", "GRÖSSE"}) {
    EXPECT_EQ(index.Find(query), Strings{"1"}) << query;
  }
  EXPECT_EQ(index.Find("B.c"), Strings{});
}

TEST(SchemaTest, ADefaultRuleWithKeywordComparesWholeTexts) {
  MemoryIndex index = IndexWith(R"({"property_id": "id", "default": {"analyzer": "keyword"}})");
  index.Add(test::FromText(R"({"id":"1","shelf":"Room A-7","title":"Mail Server"})"));
  EXPECT_EQ(index.Find("Room A-7"), Strings{"1"});
  EXPECT_EQ(index.Find("Mail Server"), Strings{"1"});
  EXPECT_EQ(index.Find("1"), Strings{"1"});
  for (const char* query : {"Room", "room a-7", "Room A-", "A-7", "Mail", "mail server", "m"}) {
    EXPECT_EQ(index.Find(query), Strings{}) << query;
  }
}

TEST(SchemaTest, AKeywordMayBeFolded) {
  MemoryIndex index = IndexWith(
      R"({"property_id": "id", "default": {"analyzer": "keyword", "preprocess": ["tolower"]}})");
  index.Add(test::FromText(R"({"id":"1","shelf":"Room É-7"})"));
  EXPECT_EQ(index.Find("room é-7"), Strings{"1"});
  EXPECT_EQ(index.Find("ROOM E-7"), Strings{"1"});
  EXPECT_EQ(index.Find("room"), Strings{});
}

TEST(SchemaTest, MembersOutsideAllAreNotSearched) {
  MemoryIndex index = IndexWith(R"({
    "property_id": "id",
    "properties": {"id": {"_all": false}, "title": {"_all": false}, "keywords": {"_all": false},
                   "parts": {"analyzer": "white space", "preprocess": ["tolower", "ngram"],
                             "_all": false}, "key": {"analyzer": "keyword", "_all": false}}})");
  index.Add(test::FromText(
      R"({"id":"x1","title":"mail","keywords":"post","parts":"letter","key":"k","text":"seen"})"));
  for (const char* query : {"x1", "mail", "mai", "mial", "post", "letter", "ette", "k", "maill"}) {
    EXPECT_EQ(index.Find(query), Strings{}) << query;
  }
  EXPECT_EQ(index.Find("seen"), Strings{"x1"});
  EXPECT_EQ(index.Search("seen").hits[0]["title"], "mail") << "stored all the same";
}

TEST(SchemaTest, WordsThatAreNotStoredAreFound) {
  MemoryIndex index =
      IndexWith(R"({"property_id": "id", "properties": {"text": {"stored": false}}})");
  index.Add(test::FromText(R"({"id":"1","text":"gold"})"));
  EXPECT_EQ(index.Find("gold"), Strings{"1"});
  EXPECT_FALSE(index.Search("gold").hits[0].isMember("text"));
}

TEST(SchemaTest, AMemberMayHaveTheNameOfWhatAHitHasBesides) {
  MemoryIndex index = IndexWith(R"({"property_id":"id"})");
  index.Add(test::FromText(R"({"id":"1","text":"gold","score":"3 of 4","explain":"nothing"})"));
  const Json::Value hit = index.Search({"gold", 0, 1, true}).hits[0];
  EXPECT_TRUE(hit["score"].isDouble()) << hit;
  EXPECT_TRUE(hit["explain"].isArray()) << hit;
}

TEST(SchemaTest, RequiredMembersMustBeThere) {
  MemoryIndex index =
      IndexWith(R"({"property_id": "id", "properties": {"text": {"required": true}}})");
  EXPECT_THROW(index.Add(test::FromText(R"({"id":"1"})")), RequestError);
  EXPECT_NO_THROW(index.Add(test::FromText(R"({"id":"1","text":""})")));
}

TEST(SchemaTest, TextsOfOneMemberAreNotThoseOfAnother) {
  MemoryIndex index = IndexWith(R"({
    "property_id": "id", "default": {"_all": false},
    "properties": {"ab": {"_all": true}, "a": {}}})");
  index.Add(test::FromText(R"({"id":"1","a":"bmail","ab":"x","other":"mail"})"));
  EXPECT_EQ(index.Find("mail"), Strings{});
  EXPECT_EQ(index.Find("bmail"), Strings{});
  EXPECT_EQ(index.Find("x"), Strings{"1"});
}

// The app indexes give a title twice. Others may give it once, or something else beside it.
TEST(SchemaTest, TitlesWithoutSpacesAreFoundByPartsWhateverStandsBesideThem) {
  MemoryIndex index("jpn");
  Json::Value twice = test::Document("twice", "写真管理");
  Json::Value once = test::Document("once", "写真管理");
  once.removeMember("search_title");
  Json::Value other = test::Document("other", "写真管理");
  other["search_title"] = "アルバム";
  for (const Json::Value& document : {twice, once, other}) index.Add(document);
  EXPECT_THAT(index.Find("真管"), testing::UnorderedElementsAre("twice", "once", "other"));
  EXPECT_EQ(index.Find("ルバ"), Strings{"other"});
}

TEST(SchemaTest, WithoutOwnersNoDocumentIsAnApplication) {
  MemoryIndex index = IndexWith(R"({"property_id":"id"})");
  index.Add(test::FromText(R"({"id":"1","text":"mail","owner":"x"})"));
  index.Add(test::FromText(R"({"id":"2","text":"mail"})"));
  EXPECT_EQ(index.Find("mail"), (Strings{"1", "2"}));
}

}  // namespace
}  // namespace searchd
