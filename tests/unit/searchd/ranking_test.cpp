#include "host/searchd/ranking.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "host/searchd/document.h"
#include "host/searchd/json_text.h"
#include "host/searchd/query.h"

namespace searchd {
namespace {

using Ids = std::vector<std::string>;

// Documents in memory and the order in which a query finds them.
class RankingTest : public testing::Test {
 protected:
  void Add(const std::string& id, const std::string& title, const std::string& keywords = "",
           const std::string& desc = "") {
    Json::Value document(Json::objectValue);
    document["id"] = id;
    document["title"] = title;
    document["search_title"] = title;
    document["keywords"] = keywords;
    document["desc"] = desc;
    database_.replace_document("Q" + id, BuildDocument(mapping_, analyzer_, id, document));
  }

  Ids Find(const std::string& text) {
    Xapian::Enquire enquire(database_);
    enquire.set_query(ParseQuery(mapping_, analyzer_, text).query);
    enquire.set_weighting_scheme(WorthWeight());
    enquire.set_sort_by_relevance_then_value(kOrderSlot, false);
    Ids ids;
    const Xapian::MSet matches = enquire.get_mset(0, 1000);
    for (auto it = matches.begin(); it != matches.end(); ++it) {
      ids.push_back(ParseJson(it.get_document().get_data())["id"].asString());
    }
    return ids;
  }

  const Mapping mapping_ = Mapping::Parse(ParseJson(R"({
    "property_id": "id",
    "properties": {
      "id": {"analyzer": "keyword", "_all": false},
      "title": {}, "desc": {}, "keywords": {},
      "search_title": {"analyzer": "white space", "preprocess": ["tolower", "ngram"]}}})"));
  Analyzer analyzer_{LanguageOfIndex("x_enu")};
  Xapian::WritableDatabase database_{"", Xapian::DB_BACKEND_INMEMORY};
};

TEST_F(RankingTest, PutsTitlesAboveKeywordsAboveDescriptions) {
  Add("desc", "One", "", "about mail");
  Add("keyword", "Two", "mail");
  Add("inside", "Webmail");
  Add("word beginning", "My Mailbox");
  Add("word", "My Mail");
  Add("title beginning", "Mailman");
  Add("title", "Mail");
  Add("nothing", "Calendar");
  EXPECT_EQ(Find("mail"), (Ids{"title", "title beginning", "word", "word beginning", "inside",
                               "keyword", "desc"}));
}

TEST_F(RankingTest, CountsRepeatedKeywords) {
  Add("a", "One", "mail");
  Add("b", "Two", "mail mail mail");
  Add("c", "Three", "mail mail mail mail mail");
  EXPECT_EQ(Find("mail"), (Ids{"c", "b", "a"}));
}

TEST_F(RankingTest, NoNumberOfRepetitionsBeatsATitle) {
  std::string keywords;
  for (int i = 0; i < 1000; ++i) keywords += "mail ";
  Add("a", "One", keywords);
  Add("b", "Webmail");
  EXPECT_EQ(Find("mail"), (Ids{"b", "a"}));
}

TEST_F(RankingTest, OrdersEqualHitsByTitleThenId) {
  Add("3", "Mail zebra");
  Add("2", "mail Äpfel");
  Add("9", "Mail apple");
  Add("1", "Mail zebra");
  EXPECT_EQ(Find("mail"), (Ids{"2", "9", "1", "3"}));
}

TEST_F(RankingTest, WantsAllWordsInAnyMember) {
  Add("a", "Mail Server", "smtp", "sends letters");
  Add("b", "Mail Client", "", "sends letters");
  EXPECT_EQ(Find("server let"), Ids{"a"});
  EXPECT_EQ(Find("mail smtp sends"), Ids{"a"});
  EXPECT_EQ(Find("mail zebra"), Ids{});
  EXPECT_EQ(Find("let mail"), (Ids{}));  // a beginning only where the typing goes on
}

TEST_F(RankingTest, FindsNothingForNothing) {
  Add("a", "Mail");
  EXPECT_EQ(Find(""), Ids{});
  EXPECT_EQ(Find("?!"), Ids{});
}

TEST_F(RankingTest, CutsALongQuery) {
  std::string words;
  for (std::size_t i = 0; i <= kMaxQueryWords; ++i) words += "m ";
  EXPECT_TRUE(ParseQuery(mapping_, analyzer_, words).cut);
  EXPECT_TRUE(ParseQuery(mapping_, analyzer_, std::string(kMaxQueryCharacters + 1, 'x')).cut);
  EXPECT_FALSE(ParseQuery(mapping_, analyzer_, std::string(kMaxQueryCharacters, 'x')).cut);
  std::string wide;
  for (std::size_t i = 0; i < kMaxQueryCharacters; ++i) wide += "文";
  EXPECT_FALSE(ParseQuery(mapping_, analyzer_, wide).cut);
}

}  // namespace
}  // namespace searchd
