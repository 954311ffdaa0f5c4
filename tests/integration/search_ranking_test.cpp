// In which order the search daemon shows what it finds, and what it says of it.
#include <csignal>
#include <string>
#include <utility>
#include <vector>

#include "tests/support/searchd_test.h"

namespace test {
namespace {

class SearchRanking : public SearchdTest {
 protected:
  // Starts the daemon with an index of these documents.
  void Serve(const std::string& language, const std::vector<Json::Value>& documents) {
    Start();
    Create(language);
    for (const Json::Value& document : documents) Upsert(language, document);
    Commit(language);
  }

  Json::Value Search(const std::string& language, const std::string& query,
                     const std::string& more = "{}") const {
    Json::Value request = SearchRequest("appindex_" + language, query);
    const Json::Value members = FromText(more);
    for (const std::string& name : members.getMemberNames()) {
      request["data"][name] = members[name];
    }
    return Ask(request);
  }

  std::string MatchedBy(const std::string& query) const {
    return Search("enu", query)["matched"].asString();
  }
};

std::vector<Json::Value> MailDocuments() {
  return {Document("desc", "One", "about mail", "one"),
          Document("keyword", "Two", "", "two mail"),
          Document("weighty", "Three", "", "three mail mail mail mail mail"),
          Document("inside", "Webmail"),
          Document("beginning", "My Mailbox"),
          Document("part", "A Mail", "", "", "title"),
          Document("word", "My Mail"),
          Document("begins", "Mailman"),
          Document("title", "Mail"),
          Document("nothing", "Calendar")};
}

TEST_F(SearchRanking, PutsTheBestPlaceFirst) {
  Serve("enu", MailDocuments());
  const std::string order = "title begins word part beginning inside weighty keyword desc";
  EXPECT_EQ(Find("enu", "mail"), order);
  Restart(SIGTERM);
  EXPECT_EQ(Find("enu", "mail"), order);
  const Json::Value hits = Search("enu", "mail")["hits"];
  for (Json::ArrayIndex i = 1; i < hits.size(); ++i) {
    EXPECT_LT(hits[i]["score"].asDouble(), hits[i - 1]["score"].asDouble()) << hits[i];
  }
}

TEST_F(SearchRanking, OrdersEqualHitsAsTheLanguageOfTheIndexDoes) {
  Start();
  for (const auto& [language, order] : std::vector<std::pair<std::string, std::string>>{
           {"sve", "apa zon å ä ö"}, {"ger", "ä apa å ö zon"}, {"unknown", "ä apa å ö zon"}}) {
    Create(language);
    for (const auto& [id, title] :
         std::vector<std::pair<std::string, std::string>>{{"zon", "Kit Zon"},
                                                          {"ö", "Kit Öga"},
                                                          {"ä", "Kit Äga"},
                                                          {"å", "Kit Ås"},
                                                          {"apa", "Kit Apa"}}) {
      Upsert(language, Document(id, title));
    }
    Commit(language);
    EXPECT_EQ(Find(language, "kit"), order) << language;
  }
}

TEST_F(SearchRanking, SaysWhichStepFoundTheBestHit) {
  Serve("enu", {Document("it", "Camera Station", "records videos"), Document("other", "Qwxyz")});
  for (const auto& [query, matched] :
       std::vector<std::pair<std::string, std::string>>{{"videos", "exact"},
                                                        {"video", "exact"},
                                                        {"station", "exact"},
                                                        {"camera stat", "prefix"},
                                                        {"amera", "ngram"},
                                                        {"camra", "fuzzy"},
                                                        {"camerast", "fuzzy"}}) {
    EXPECT_EQ(Find("enu", query), "it") << query;
    EXPECT_EQ(MatchedBy(query), matched) << query;
  }
  const Json::Value nothing = Search("enu", "zebra");
  EXPECT_EQ(CodeOf(nothing), 0);
  EXPECT_EQ(nothing["total"].asInt(), 0);
  EXPECT_FALSE(nothing.isMember("matched"));
  EXPECT_FALSE(nothing.isMember("cut"));
}

TEST_F(SearchRanking, ExplainsHitsWhenAsked) {
  Serve("enu", MailDocuments());
  const Json::Value plain = Search("enu", "mail");
  EXPECT_FALSE(plain["hits"][0].isMember("explain"));
  const Json::Value hits = Search("enu", "mail", R"({"explain":true})")["hits"];
  ASSERT_EQ(hits.size(), plain["hits"].size());
  for (Json::ArrayIndex i = 0; i < hits.size(); ++i) {
    ASSERT_EQ(hits[i]["explain"].size(), 1U) << hits[i];
    EXPECT_EQ(hits[i]["explain"][0]["text"], "mail");
    EXPECT_EQ(hits[i]["score"], plain["hits"][i]["score"]);
  }
  EXPECT_EQ(hits[0]["explain"][0]["member"], "title");
  EXPECT_EQ(hits[0]["explain"][0]["found"], "whole");
  EXPECT_EQ(hits[0]["explain"][0]["worth"].asDouble(), 100);
  EXPECT_EQ(hits[8]["explain"][0]["member"], "desc");
  EXPECT_EQ(CodeOf(Search("enu", "mail", R"({"explain":1})")), 603);
}

TEST_F(SearchRanking, ShowsTwentyHitsUnlessToldAndAThousandAtMost) {
  std::vector<Json::Value> documents;
  for (int i = 0; i < 1010; ++i) {
    documents.push_back(Document(std::to_string(10000 + i), "Same"));
  }
  Serve("enu", documents);
  const auto shown = [&](const std::string& more) {
    const Json::Value reply = Search("enu", "same", more);
    EXPECT_EQ(reply["total"].asInt(), 1010) << more;
    return reply["hits"].size();
  };
  EXPECT_EQ(shown("{}"), 20U);
  EXPECT_EQ(shown(R"({"limit":1000})"), 1000U);
  EXPECT_EQ(shown(R"({"limit":0})"), 0U);
  EXPECT_EQ(shown(R"({"limit":1000,"offset":1000})"), 10U);
  EXPECT_EQ(shown(R"({"offset":1000000})"), 0U);
  EXPECT_EQ(Search("enu", "same", R"({"offset":1005})")["hits"][0]["id"], "11005");
  for (const char* wrong : {R"({"limit":1001})", R"({"limit":-1})", R"({"limit":"5"})",
                            R"({"limit":1.5})", R"({"offset":1000001})", R"({"offset":null})"}) {
    EXPECT_EQ(CodeOf(Search("enu", "same", wrong)), 603) << wrong;
  }
}

TEST_F(SearchRanking, AnswersHugeQueriesInEveryScript) {
  Serve("tha", {Document("it", "ไฟล์ File")});
  for (const std::string& part :
       {std::string("file "), std::string("x"), std::string("ไฟล์"), std::string("文"),
        std::string("e\u0301"), std::string("👍 "), std::string(" ")}) {
    std::string query;
    while (query.size() + part.size() <= 1024 * 1024) query += part;
    const Json::Value reply = Search("tha", query);
    EXPECT_EQ(CodeOf(reply), 0) << part;
    EXPECT_TRUE(reply["cut"].asBool()) << part;
  }
  EXPECT_EQ(Find("tha", "file ไฟล์"), "it");
}

TEST_F(SearchRanking, FindsDocumentsWithLongTitles) {
  std::string words;
  while (words.size() < 50000) words += "word" + std::to_string(words.size()) + " ";
  Serve("enu", {Document("word", std::string(1024 * 1024, 'w')), Document("words", words)});
  EXPECT_EQ(Find("enu", "www"), "word");
  EXPECT_EQ(Find("enu", "word0"), "words");
  EXPECT_EQ(Find("enu", "word0 word5"), "words");
}

TEST_F(SearchRanking, FollowsChangesOfADocument) {
  Serve("enu", {Document("a", "Mail"), Document("b", "My Mail")});
  EXPECT_EQ(Find("enu", "mail"), "a b");
  EXPECT_EQ(Find("enu", "mial box"), "");
  Upsert("enu", Document("a", "Webmail"));
  Upsert("enu", Document("b", "Camera Station"));
  Commit("enu");
  EXPECT_EQ(Find("enu", "mail"), "a");
  EXPECT_EQ(Find("enu", "camra staton"), "b") << "new words are known to looser steps";
  EXPECT_EQ(CodeOf(Ask(RemovalRequest("appindex_enu", "b"))), 0);
  Commit("enu");
  EXPECT_EQ(Find("enu", "camra staton"), "");
}

}  // namespace
}  // namespace test
