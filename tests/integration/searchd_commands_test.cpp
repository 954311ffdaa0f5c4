// What each command of the search daemon does, and what it refuses.
#include <array>
#include <filesystem>
#include <string>
#include <vector>

#include "tests/support/searchd_test.h"

namespace test {
namespace {

namespace fs = std::filesystem;

class SearchdCommands : public SearchdTest {};

TEST_F(SearchdCommands, KeepsDocumentsFromCreationToDeletion) {
  Start();
  Create("enu");
  Upsert("enu", Document("files", "File Station", "Manages files", "folder", ""));
  Upsert("enu", Document("files?share", "Shares", "Shared folders", "file", "files"));
  Commit("enu");

  const Json::Value reply = Ask(SearchRequest("appindex_enu", "file"));
  ASSERT_EQ(reply["total"].asInt(), 2);
  const Json::Value& hit = reply["hits"][0];
  EXPECT_EQ(hit.getMemberNames(),
            (std::vector<std::string>{"desc", "id", "owner", "score", "title"}));
  EXPECT_EQ(hit["id"], "files");
  EXPECT_EQ(hit["title"], "File Station");
  EXPECT_EQ(reply["hits"][1]["owner"], "files");
  EXPECT_GT(hit["score"].asDouble(), reply["hits"][1]["score"].asDouble());

  Upsert("enu", Document("files", "Archive"));
  EXPECT_EQ(CodeOf(Ask(RemovalRequest("appindex_enu", "files?share"))), 0);
  Commit("enu");
  EXPECT_EQ(Find("enu", "file"), "");
  EXPECT_EQ(Find("enu", "archive"), "files");

  EXPECT_EQ(CodeOf(Ask(IdRequest("index_delete", "appindex_enu"))), 0);
  EXPECT_EQ(Find("enu", "archive"), "601");
  Fill("ger");  // its commit makes all that is created and deleted durable
  EXPECT_FALSE(fs::exists(IndexFile("enu")));
}

TEST_F(SearchdCommands, ShowsWhatIsCommittedAndNothingElse) {
  Start();
  Create("enu");
  EXPECT_EQ(Find("enu", "file"), "");
  Upsert("enu", Document("files", "File Station"));
  EXPECT_EQ(Find("enu", "file"), "");
  Commit("enu");
  EXPECT_EQ(Find("enu", "file"), "files");
  Upsert("enu", Document("files", "Archive"));
  EXPECT_EQ(Find("enu", "file"), "files");
  Commit("enu");
  EXPECT_EQ(Find("enu", "file"), "");
}

TEST_F(SearchdCommands, ListsIndexes) {
  Start();
  EXPECT_TRUE(Ask(IdRequest("index_list", ""))["indexes"].empty());
  Fill("ger");
  Create("enu");
  const Json::Value list = Ask(FromText(R"({"command":"index_list"})"))["indexes"];
  ASSERT_EQ(list.size(), 2U);
  EXPECT_EQ(list[0]["id"], "appindex_enu");
  EXPECT_EQ(list[0]["documents"].asInt(), 0);
  EXPECT_EQ(list[1]["path"], std::string(kIndexes) + "ger");
  EXPECT_EQ(list[1]["documents"].asInt(), 1);
}

TEST_F(SearchdCommands, PagesThroughHits) {
  Start();
  Create("enu");
  for (const char* id : {"a", "b", "c", "d"}) Upsert("enu", Document(id, "Same title"));
  Commit("enu");
  Json::Value request = SearchRequest("appindex_enu", "same");
  request["data"]["offset"] = 1;
  request["data"]["limit"] = 2;
  const Json::Value reply = Ask(request);
  EXPECT_EQ(reply["total"].asInt(), 4);
  ASSERT_EQ(reply["hits"].size(), 2U);
  EXPECT_EQ(reply["hits"][0]["id"], "b");
  EXPECT_EQ(reply["hits"][1]["id"], "c");
}

TEST_F(SearchdCommands, RefusesUnknownAndExistingIndexes) {
  Start();
  Fill("enu");
  EXPECT_EQ(CodeOf(Ask(CreateRequest("appindex_enu", std::string(kIndexes) + "other"))), 602);
  EXPECT_EQ(CodeOf(Ask(IdRequest("index_delete", "appindex_ger"))), 601);
  EXPECT_EQ(CodeOf(Ask(UpsertRequest("appindex_ger", Document("a", "A")))), 601);
  EXPECT_EQ(CodeOf(Ask(RemovalRequest("appindex_ger", "a"))), 601);
  EXPECT_EQ(CodeOf(Ask(IdRequest("commit", "appindex_ger"))), 601);
  EXPECT_EQ(Find("ger", "a"), "601");
  EXPECT_EQ(Find("enu", "file"), "files");
}

TEST_F(SearchdCommands, RejectsMalformedRequests) {
  Start();
  Fill("enu");
  const std::string deep = std::string(101, '[') + std::string(101, ']');
  const std::vector<std::array<std::string, 3>> cases = {
      {"", "603", "JSON"},
      {"{\"command\":\"commit\",}", "603", "JSON"},
      {"{} // comment", "603", "JSON"},
      {"{\"command\":1,\"command\":1}", "603", "JSON"},
      {"{\"a\":" + deep + "}", "603", "JSON"},
      {"[]", "603", "object"},
      {"{}", "603", "\"command\""},
      {"{\"command\":\"commit\"}", "603", "\"id\""},
      {"{\"command\":\"commit\",\"data\":[]}", "603", "\"data\""},
      {"{\"command\":\"commit\",\"data\":{\"id\":7}}", "603", "\"id\""},
      {"{\"command\":\"commit\",\"data\":{\"id\":\"\xff\"}}", "603", "UTF-8"},
      {"{\"command\":\"commit\",\"data\":{\"id\":\"\\u0000\"}}", "603", "\"id\""},
      {"{\"command\":\"destroy\",\"data\":{}}", "604", "destroy"},
      {"{\"command\":\"" + std::string(99, 'a') + "üüü\"}", "604", "unknown command"},
      {R"({"command":"search","data":{"id":"appindex_enu"}})", "603", "\"query\""},
      {R"({"command":"search","data":{"id":"appindex_enu","query":"a","limit":1001}})", "603",
       "\"limit\""},
      {R"({"command":"search","data":{"id":"appindex_enu","query":"a","limit":"5"}})", "603",
       "\"limit\""},
      {R"({"command":"search","data":{"id":"appindex_enu","query":"a","offset":-1}})", "603",
       "\"offset\""},
      {R"({"command":"search","data":{"id":"appindex_enu","query":"a","explain":1}})", "603",
       "\"explain\""},
      {R"({"command":"index_create","data":{"id":"a","path":"/var/packages/a",)"
       R"("settings":{"shards":1},"mappings":{"property_id":"id"}}})",
       "603", "\"settings\""},
      {R"({"command":"index_create","data":{"id":"a","path":"/var/packages/a",)"
       R"("settings":"default","mappings":{"property_id":"id"}}})",
       "603", "\"settings\""},
      {R"({"command":"document_upsert_by_id","data":{"id":"appindex_enu","doc_id":"a"}})", "603",
       "\"data\""},
      {R"({"command":"document_upsert_by_id",)"
       R"("data":{"id":"appindex_enu","doc_id":"a","data":{"id":"b"}}})",
       "603", "\"id\""},
      {R"({"command":"document_upsert_by_id",)"
       R"("data":{"id":"appindex_enu","doc_id":"a","data":{"title":"x"}}})",
       "603", "\"id\""},
      {R"({"command":"document_upsert_by_id",)"
       R"("data":{"id":"appindex_enu","doc_id":"a","data":{"id":"a","title":5}}})",
       "603", "\"title\""},
      {R"({"command":"document_upsert_by_id",)"
       R"("data":{"id":"appindex_enu","doc_id":"a","data":{"id":"a","title":"\udc00"}}})",
       "603", ""},
  };
  for (const auto& [text, code, part] : cases) {
    const Json::Value reply = FromText(AskText(text));
    EXPECT_EQ(std::to_string(CodeOf(reply)), code) << text;
    EXPECT_NE(MessageOf(reply).find(part), std::string::npos) << text << reply;
  }
  EXPECT_EQ(Find("enu", "file"), "files");
}

TEST_F(SearchdCommands, NamesTheMemberOfMappingsThatIsWrong) {
  Start();
  const std::vector<std::array<std::string, 2>> cases = {
      {R"([])", "mappings"},
      {R"({})", "mappings.property_id"},
      {R"({"property_id":"id","default":{"analyzer":"magic"}})", "mappings.default.analyzer"},
      {R"({"property_id":"id","properties":{"a":{"preprocess":["shout"]}}})",
       "mappings.properties.a.preprocess"},
  };
  for (const auto& [mappings, member] : cases) {
    const Json::Value reply =
        Ask(CreateRequest("appindex_enu", std::string(kIndexes) + "enu", FromText(mappings)));
    EXPECT_EQ(CodeOf(reply), 603) << mappings;
    EXPECT_NE(MessageOf(reply).find("\"" + member + "\""), std::string::npos) << reply;
  }
  EXPECT_FALSE(fs::exists(IndexFile("enu")));
}

TEST_F(SearchdCommands, ServesAnotherSchema) {
  Start();
  const Json::Value mappings = FromText(R"({
    "property_id": "isbn",
    "properties": {
      "isbn": {"analyzer": "keyword", "required": true},
      "shelf": {"analyzer": "white space", "preprocess": ["tolower"], "required": true},
      "secret": {"stored": false},
      "note": {"_all": false}}})");
  ASSERT_EQ(CodeOf(Ask(CreateRequest("books", "/var/packages/Library/books", mappings))), 0);
  Json::Value upsert = IdRequest("document_upsert_by_id", "books");
  upsert["data"]["doc_id"] = "1-2";
  upsert["data"]["data"] = FromText(
      R"({"isbn":"1-2","shelf":"A-7 Cellar","secret":"gold","note":"hidden","author":"Poe"})");
  ASSERT_EQ(CodeOf(Ask(upsert)), 0);
  ASSERT_EQ(CodeOf(Ask(IdRequest("commit", "books"))), 0);

  for (const char* query : {"1-2", "a-7", "cel", "gold", "poe"}) {
    const Json::Value reply = Ask(SearchRequest("books", query));
    ASSERT_EQ(reply["total"].asInt(), 1) << query;
    EXPECT_EQ(reply["hits"][0]["isbn"], "1-2");
    EXPECT_FALSE(reply["hits"][0].isMember("secret"));
  }
  EXPECT_EQ(Ask(SearchRequest("books", "hidden"))["total"].asInt(), 0);
  EXPECT_EQ(Ask(SearchRequest("books", "a-7"))["matched"], "exact");
  EXPECT_EQ(Ask(SearchRequest("books", "7"))["matched"], "ngram") << "a part of a word";

  upsert["data"]["data"].removeMember("shelf");
  EXPECT_EQ(CodeOf(Ask(upsert)), 603);
}

TEST_F(SearchdCommands, FindsWordsAndBeginningsInManyLanguages) {
  Start();
  struct Case {
    const char* language;
    const char* title;
    std::vector<std::string> queries;
  };
  const std::vector<Case> cases = {
      {"enu", "BitTorrent Download", {"b", "torrent", "down", "bit down", "ＢＩＴ"}},
      {"ger", "Größenübersicht", {"GRÖSSE", "grossenub", "größ", "übersicht"}},
      {"tha", "ตัวจัดการไฟล์", {"ต", "ตัว", "ตัวจัดก", "ไฟล์", "จัดการ"}},
      {"jpn", "ファイル管理", {"フ", "ファイ", "ふぁいる", "ﾌｧｲﾙ", "管理"}},
      {"chs", "文件管理器", {"文", "文件", "管理", "件管"}},
      {"rus", "Журнал событий", {"ж", "ЖУРНАЛ", "собы"}},
      {"trk", "Işık İstasyonu", {"ışık", "IŞIK", "istasyon", "İSTASYON", "isik"}},
  };
  for (const Case& one : cases) {
    Create(one.language);
    Upsert(one.language, Document("it", one.title));
    Upsert(one.language, Document("other", "Qwxyz"));
    Commit(one.language);
    for (const std::string& query : one.queries) {
      EXPECT_EQ(Find(one.language, query), "it") << one.language << " " << query;
    }
  }
}

TEST_F(SearchdCommands, AnswersAnyQuery) {
  Start();
  Fill("enu");
  for (const char* query : {"", " ", "?!", "\t\n", "file zebra"}) EXPECT_EQ(Find("enu", query), "");
  std::string words;
  for (int i = 0; i < 10000; ++i) words += "file ";
  const Json::Value reply = Ask(SearchRequest("appindex_enu", words));
  EXPECT_EQ(reply["total"].asInt(), 1);
  EXPECT_TRUE(reply["cut"].asBool());
  EXPECT_TRUE(Ask(SearchRequest("appindex_enu", std::string(1000000, 'x')))["cut"].asBool());
}

}  // namespace
}  // namespace test
