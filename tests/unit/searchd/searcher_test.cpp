#include "host/searchd/searcher.h"

#include <gtest/gtest.h>

#include <array>
#include <string>
#include <vector>

#include "tests/unit/searchd/memory_index.h"

namespace searchd {
namespace {

std::string Repeated(const std::string& text, std::size_t count) {
  std::string all;
  for (std::size_t i = 0; i < count; ++i) all += text;
  return all;
}

TEST(SearcherTest, WantsAllWordsInAnyMember) {
  MemoryIndex index;
  index.Add("a", "Mail Server", "smtp", "sends letters");
  index.Add("b", "Mail Client", "", "sends letters");
  EXPECT_EQ(index.Find("server let"), Strings{"a"});
  EXPECT_EQ(index.Find("mail smtp sends"), Strings{"a"});
  EXPECT_EQ(index.Find("letters mail"), (Strings{"b", "a"}));
  EXPECT_EQ(index.Find("mail zebra"), Strings{});
  EXPECT_EQ(index.Find("zebra mail"), Strings{});
}

TEST(SearcherTest, OnlyTheLastWordMayBeABeginning) {
  MemoryIndex index("enu", test::FromText(R"({"property_id":"id"})"));
  index.Add(test::FromText(R"({"id":"it","text":"mail letters"})"));
  index.Add(test::FromText(R"({"id":"whole","text":"mail let"})"));
  EXPECT_EQ(index.Find("let mail"), Strings{"whole"});
  EXPECT_EQ(index.Find("mail let"), (Strings{"whole", "it"}));
}

TEST(SearcherTest, FindsNothingForNothing) {
  MemoryIndex index;
  index.Add("a", "Mail");
  for (const char* query : {"", " ", "\t\n", "?!", "&", "+", "\u200B", "...", "\u3099", "📷"}) {
    const Found result = index.Search(query);
    EXPECT_EQ(result.total, 0U) << query;
    EXPECT_TRUE(result.hits.empty()) << query;
    EXPECT_EQ(result.matched, "") << query;
    EXPECT_FALSE(result.cut) << query;
  }
}

TEST(SearcherTest, AMarkWithoutALetterIsNotTheBeginningOfEverything) {
  for (const char* language : {"fre", "tha", "jpn"}) {
    MemoryIndex index(language);
    index.Add("a", "Télé がぎ ไฟล", "télé がぎ ไฟล", "télé がぎ ไฟล");
    for (const char* query : {"\u0301", "\u0301\u0302", "\u0301 \u0308", "\u3099", "\u0E48",
                              "\u0E31", "zebra \u0301"}) {
      EXPECT_EQ(index.Find(query), Strings{}) << language << " " << query;
    }
  }
}

TEST(SearcherTest, FindsNothingInAnEmptyIndex) {
  MemoryIndex index;
  EXPECT_EQ(index.Search("mail").total, 0U);
  EXPECT_EQ(index.Search("settings").total, 0U);
}

TEST(SearcherTest, PagesShareOneOrder) {
  MemoryIndex index;
  for (int i = 0; i < 10; ++i) index.Add("id" + std::to_string(i), "Same title");
  const Strings all = index.Find("same");
  ASSERT_EQ(all.size(), 10U);
  Strings paged;
  for (unsigned offset = 0; offset < 12; offset += 3) {
    const SearchRequest request{"same", offset, 3, false};
    EXPECT_EQ(index.Search(request).total, 10U) << offset;
    for (const std::string& id : index.Find(request)) paged.push_back(id);
  }
  EXPECT_EQ(paged, all);
}

TEST(SearcherTest, ALooserStepPagesToo) {
  MemoryIndex index;
  for (int i = 0; i < 7; ++i) index.Add("id" + std::to_string(i), "Camera " + std::to_string(i));
  Strings paged;
  for (unsigned offset = 0; offset < 9; offset += 3) {
    const SearchRequest request{"camra", offset, 3, false};
    EXPECT_EQ(index.Search(request).total, 7U) << offset;
    EXPECT_EQ(index.Search(request).matched, "fuzzy") << offset;
    for (const std::string& id : index.Find(request)) paged.push_back(id);
  }
  EXPECT_EQ(paged, index.Find("camra"));
  EXPECT_EQ(paged.size(), 7U);
}

TEST(SearcherTest, CountsWithoutShowing) {
  MemoryIndex index;
  for (int i = 0; i < 5; ++i) index.Add("id" + std::to_string(i), "Same title");
  for (const SearchRequest& request :
       {SearchRequest{"same", 0, 0, false}, SearchRequest{"same", 5, 10, false},
        SearchRequest{"same", 1000000, 10, false}}) {
    const Found result = index.Search(request);
    EXPECT_EQ(result.total, 5U);
    EXPECT_TRUE(result.hits.empty());
    EXPECT_EQ(result.matched, "prefix");
  }
}

TEST(SearcherTest, ShowsStoredMembersAndTheScore) {
  MemoryIndex index("enu", test::FromText(R"({
    "property_id": "id",
    "properties": {"secret": {"stored": false}, "keywords": {}, "search_title": {}}})"));
  index.Add(test::FromText(R"({"id":"1","secret":"gold","keywords":"k","search_title":"t",
                               "Ünï \"x\"":"gold ore"})"));
  const Found result = index.Search("gold");
  ASSERT_EQ(result.hits.size(), 1U);
  const Json::Value& hit = result.hits[0];
  EXPECT_EQ(hit.getMemberNames(), (Strings{"id", "score", "Ünï \"x\""}));
  EXPECT_EQ(hit["Ünï \"x\""], "gold ore");
  EXPECT_GT(hit["score"].asDouble(), 0);
}

TEST(SearcherTest, ScoresNeverRiseAlongTheHits) {
  MemoryIndex index;
  index.Add("1", "Mail");
  index.Add("2", "Mailman");
  index.Add("3", "My Mail");
  index.Add("4", "Other", "mail mail");
  index.Add("5", "One", "", "mail", "owner");
  const Json::Value hits = index.Search("mail").hits;
  ASSERT_EQ(hits.size(), 5U);
  for (Json::ArrayIndex i = 1; i < hits.size(); ++i) {
    EXPECT_LT(hits[i]["score"].asDouble(), hits[i - 1]["score"].asDouble());
  }
}

TEST(SearcherTest, ExplainsWhyEachHitRanksWhereItDoes) {
  MemoryIndex index;
  index.Add("word", "My Mail", "", "", "owner");
  index.Add("inside", "Webmail", "", "", "owner");
  index.Add("keyword", "Other", "other mail", "", "owner");
  index.Add("form", "Mails", "", "", "owner");
  const Found result = index.Search({"mail", 0, 20, true});
  ASSERT_EQ(result.hits.size(), 4U);
  const std::vector<std::array<std::string, 3>> expected = {{"form", "title", "whole beginning"},
                                                            {"word", "title", "word"},
                                                            {"inside", "search_title", "inside"},
                                                            {"keyword", "keywords", "word"}};
  for (Json::ArrayIndex i = 0; i < 4; ++i) {
    const Json::Value& hit = result.hits[i];
    EXPECT_EQ(hit["id"], expected[i][0]);
    ASSERT_EQ(hit["explain"].size(), 1U) << hit;
    const Json::Value& reason = hit["explain"][0];
    EXPECT_EQ(reason["text"], "mail");
    EXPECT_EQ(reason["member"], expected[i][1]);
    EXPECT_EQ(reason["found"], expected[i][2]);
    EXPECT_NEAR(reason["worth"].asDouble(), hit["score"].asDouble(), 1e-3);
  }
  EXPECT_FALSE(index.Search("mail").hits[0].isMember("explain"));
}

TEST(SearcherTest, ExplainsEachWordByWhatCounted) {
  MemoryIndex index;
  index.Add("it", "Mail Server", "mail server smtp", "sends letters");
  const Json::Value hit = index.Search({"smtp letters ser", 0, 20, true}).hits[0];
  ASSERT_EQ(hit["explain"].size(), 3U) << hit;
  EXPECT_EQ(hit["explain"][0]["member"], "keywords");
  EXPECT_EQ(hit["explain"][1]["member"], "desc");
  EXPECT_EQ(hit["explain"][2]["member"], "title");
  EXPECT_EQ(hit["explain"][2]["text"], "ser");
  EXPECT_EQ(hit["explain"][2]["found"], "beginning");
  const Json::Value typo = index.Search({"sarver", 0, 20, true}).hits[0];
  EXPECT_EQ(typo["explain"][0]["found"], "typo");
}

TEST(SearcherTest, SeesNewWordsInLooserSteps) {
  MemoryIndex index;
  index.Add("a", "Camera");
  EXPECT_EQ(index.Find("camra"), Strings{"a"});
  index.Add("b", "Camera");
  EXPECT_EQ(index.Find("camra"), (Strings{"a", "b"}));
  index.Add("a", "Qwxyz");
  EXPECT_EQ(index.Find("camra"), Strings{"b"});
}

TEST(SearcherTest, AnswersLongQueriesAndSaysThatTheyAreCut) {
  MemoryIndex index;
  index.Add("it", "File");
  EXPECT_FALSE(index.Search(Repeated("file ", 16)).cut);
  EXPECT_TRUE(index.Search(Repeated("file ", 17)).cut);
  EXPECT_EQ(index.Find(Repeated("file ", 16)), Strings{"it"});
  EXPECT_EQ(index.Find(Repeated("file ", 17)), Strings{"it"});
  EXPECT_EQ(index.Find(Repeated("file ", 10000)), Strings{"it"});
  EXPECT_TRUE(index.Search(std::string(1024 * 1024, 'x')).cut);
  EXPECT_TRUE(index.Search(Repeated("文", 350000)).cut);
  EXPECT_TRUE(index.Search(std::string(1024 * 1024, ' ') + "file").cut);
}

TEST(SearcherTest, AnswersAnything) {
  MemoryIndex index;
  index.Add("it", "C++ & R&D 📷 naïve", "c# .net", "100 % Ω");
  index.Add("marks", "\u0301\u0302", "\u0E31", "\u3099");
  const std::string long_word(250, 'w');
  index.Add("long", long_word, long_word);
  for (const std::string& query :
       {std::string("\x7F\x01\x1B[0m"), std::string("\u0301\u0302\u0303"), Repeated("\u0301", 300),
        "e" + Repeated("\u0301", 200), std::string("\u202E\u202D\uFEFF"), std::string("\uFFFD"),
        Repeated("(((\"*~^\\", 30), std::string("AND OR NOT NEAR"), std::string("title:mail"),
        std::string("\U0010FFFF"), Repeated("👩‍👩‍👧‍👦", 40),
        Repeated("\u0E48", 256), Repeated("ー", 256), Repeated("\uFDFA", 256),
        Repeated("a文ล가ب", 50), Repeated("m ", 16) + "+", std::string("%s%n%x"),
        std::string("ΆΈΉΊΌ"), Repeated("w", 256)}) {
    const Found result = index.Search(query);
    EXPECT_EQ(result.hits.size(), result.total) << query;
  }
  EXPECT_EQ(index.Find("C++"), Strings{"it"});
  EXPECT_EQ(index.Find("r&d"), Strings{"it"});
  EXPECT_EQ(index.Find("naive"), Strings{"it"});
  EXPECT_EQ(index.Find("c#"), Strings{"it"});
  EXPECT_EQ(index.Find(".net"), Strings{"it"});
  EXPECT_EQ(index.Find("100 %"), Strings{"it"});
  EXPECT_EQ(index.Find("c++ 📷"), Strings{"it"});
}

TEST(SearcherTest, FindsLongWordsAndTellsThemApart) {
  const std::string beginning(249, 'w');
  MemoryIndex index;
  index.Add("1", beginning + "1");
  index.Add("2", beginning + "2");
  EXPECT_EQ(index.Find(beginning + "1").front(), "1");
  EXPECT_EQ(index.Find(beginning + "2").front(), "2");
  EXPECT_EQ(index.Find(beginning), (Strings{"1", "2"}));
  EXPECT_EQ(index.Find(std::string(100, 'w')), (Strings{"1", "2"}));
}

TEST(SearcherTest, MixedScriptsAreFoundByEachOfThem) {
  MemoryIndex index("jpn");
  index.Add("it", "NASファイルStation管理ไฟล์");
  for (const char* query :
       {"nas", "ファイル", "station", "管理", "ไฟล์", "nasファイル", "管理 nas", "stat"}) {
    EXPECT_EQ(index.Find(query), Strings{"it"}) << query;
  }
}

}  // namespace
}  // namespace searchd
