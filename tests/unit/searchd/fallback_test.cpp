// What is found when what was typed is found nowhere, and by which step the reply says so.
#include "host/searchd/fallback.h"

#include <gtest/gtest.h>

#include <array>
#include <string>
#include <utility>
#include <vector>

#include "tests/unit/searchd/memory_index.h"

namespace searchd {
namespace {

struct Step {
  const char* query;
  const char* matched;
};

void ExpectSteps(MemoryIndex& index, const std::string& id, const std::vector<Step>& steps) {
  for (const Step& step : steps) {
    EXPECT_EQ(index.Find(step.query), Strings{id}) << step.query;
    EXPECT_EQ(index.MatchedBy(step.query), step.matched) << step.query;
  }
}

TEST(FallbackTest, TheReplySaysWhichStepAnswered) {
  MemoryIndex index;
  index.Add("it", "Surveillance Cameras", "Surveillance Cameras videos dashboard", "records");
  index.Add("other", "Qwxyz");
  ExpectSteps(index, "it",
              {{"cameras", "exact"},
               {"surveillance cameras", "exact"},
               {"DASHBOARD", "exact"},
               {"records", "exact"},
               {"camera", "prefix"},
               {"video", "prefix"},
               {"surveillance cam", "prefix"},
               {"surv", "prefix"},
               {"surveillance", "prefix"},  // the title goes on
               {"veillance", "ngram"},
               {"meras", "ngram"},
               {"shboa", "ngram"},
               {"cameres", "fuzzy"},
               {"survillance", "fuzzy"},
               {"camreas surveillance", "fuzzy"},
               {"surveillancecam", "fuzzy"}});
  EXPECT_EQ(index.Find("zebra"), Strings{});
  EXPECT_EQ(index.MatchedBy("zebra"), "");
}

TEST(FallbackTest, OtherFormsOfAWordAreExact) {
  MemoryIndex index;
  index.Add("it", "Snapshot");
  EXPECT_EQ(index.MatchedBy("snapshots"), "exact");
}

TEST(FallbackTest, TheLoosestWordOfTheBestHitCounts) {
  MemoryIndex index;
  index.Add("it", "Mail Server");
  EXPECT_EQ(index.MatchedBy("server mai"), "prefix");
  EXPECT_EQ(index.MatchedBy("mail erver"), "ngram");
  EXPECT_EQ(index.MatchedBy("sarver mail"), "fuzzy");
}

TEST(FallbackTest, ALooserStepIsNotTakenWhenAStricterOneFinds) {
  MemoryIndex index;
  index.Add("table", "Tables");
  index.Add("cable", "Cables");
  EXPECT_EQ(index.Find("tables"), Strings{"table"});
  EXPECT_EQ(index.Find("cables"), Strings{"cable"});
  EXPECT_EQ(index.Find("fables"), (Strings{"cable", "table"}));
}

TEST(FallbackTest, FindsWordsWithOneSlipAtBeginningMiddleAndEnd) {
  for (const char* member : {"title", "desc", "keywords"}) {
    MemoryIndex index;
    Json::Value document = test::Document("it", "", "", "");
    document[member] = "Nice camera thing";
    index.Add(document);
    index.Add("other", "Qwxyz");
    for (const char* typed : {"xamera", "camxra", "camerx", "amera", "camra", "xcamera", "camxera",
                              "camerax", "acmera", "caemra", "camear"}) {
      EXPECT_EQ(index.Find(typed), Strings{"it"}) << member << " " << typed;
    }
    for (const char* typed : {"xamerx", "cxmexa", "acmear", "cmr", "caxmexa"}) {
      EXPECT_EQ(index.Find(typed), Strings{}) << member << " " << typed;
    }
  }
}

TEST(FallbackTest, FindsAWordOfFiveLettersWithASlip) {
  MemoryIndex index;
  index.Add("it", "Drive");
  for (const char* typed : {"drove", "drvie", "driive", "driv", "xrive"}) {
    EXPECT_EQ(index.Find(typed), Strings{"it"}) << typed;
  }
}

TEST(FallbackTest, ShortWordsMustBeSpeltRight) {
  MemoryIndex index;
  index.Add("it", "Mail");
  index.Add("two", "Chat Note");
  for (const char* typed : {"mial", "mall", "mxil", "cht", "chta", "nte", "moil", "haat"}) {
    EXPECT_EQ(index.Find(typed), Strings{}) << typed;
  }
}

TEST(FallbackTest, EachWordMayHaveASlip) {
  MemoryIndex index;
  index.Add("it", "Camera Station");
  index.Add("other", "Camera");
  EXPECT_EQ(index.Find("camra staton"), Strings{"it"});
  EXPECT_EQ(index.Find("staton camra"), Strings{"it"});
  EXPECT_EQ(index.Find("camra zebra"), Strings{});
}

TEST(FallbackTest, FindsTheBeginningOfAWordWithASlip) {
  MemoryIndex index;
  index.Add("it", "Surveillance");
  for (const char* typed : {"survei", "survie", "surevill", "sruveil", "survvei"}) {
    EXPECT_EQ(index.Find(typed), Strings{"it"}) << typed;
  }
}

TEST(FallbackTest, SlipsInOtherScripts) {
  struct Case {
    const char* language;
    const char* title;
    std::vector<std::string> typed;
  };
  for (const Case& one :
       std::vector<Case>{{"rus", "Фотографии", {"фотогафии", "фатографии", "фотгорафии"}},
                         {"trk", "Fotoğraflar", {"fotografalr", "fotoğaflar"}},
                         {"ger", "Übersicht", {"übesricht", "ubersiht", "öbersicht"}},
                         {"plk", "Zdjęcia", {"zdjecai", "zdjęca"}},
                         {"jpn", "バックアップ", {"バックップ", "バッククアップ"}},
                         {"krn", "데이터베이스", {"데이타베이스", "데이터베스"}},
                         {"tha", "รูปภาพ", {"รูปภาภ"}}}) {
    MemoryIndex index(one.language);
    index.Add("it", one.title);
    index.Add("other", "Qwxyz");
    for (const std::string& typed : one.typed) {
      EXPECT_EQ(index.Find(typed), Strings{"it"}) << one.language << " " << typed;
      EXPECT_EQ(index.MatchedBy(typed), "fuzzy") << one.language << " " << typed;
    }
  }
}

TEST(FallbackTest, ThreeLettersAreEnoughForASlipWhereEachSaysALot) {
  for (const auto& [language, title, typed] :
       std::vector<std::array<std::string, 3>>{{"jpn", "カメラ", "カナラ"},
                                               {"krn", "캘린더", "켈린더"},
                                               {"chs", "路由器", "路油器"},
                                               {"tha", "ไฟล์", "ไพล์"}}) {
    MemoryIndex index(language);
    index.Add("it", title);
    index.Add("other", "Qwxyz");
    EXPECT_EQ(index.Find(typed), Strings{"it"}) << typed;
    EXPECT_EQ(index.MatchedBy(typed), "fuzzy") << typed;
  }
}

TEST(FallbackTest, SpacesDoNotMatter) {
  MemoryIndex index;
  index.Add("File Station", "File Station");
  index.Add("LibreOffice", "LibreOffice");
  index.Add("Libre Draw", "Libre Draw");
  index.Add("BitTorrent", "BitTorrent");
  index.Add("Wi-Fi Analyzer", "Wi-Fi Analyzer");
  for (const auto& [query, id] :
       std::vector<std::pair<std::string, std::string>>{{"filest", "File Station"},
                                                        {"filestation", "File Station"},
                                                        {"file st", "File Station"},
                                                        {"filestat", "File Station"},
                                                        {"libre office", "LibreOffice"},
                                                        {"libreoffice", "LibreOffice"},
                                                        {"libredraw", "Libre Draw"},
                                                        {"bit torrent", "BitTorrent"},
                                                        {"bit-torrent", "BitTorrent"},
                                                        {"torrent", "BitTorrent"},
                                                        {"wifi", "Wi-Fi Analyzer"},
                                                        {"wi fi", "Wi-Fi Analyzer"},
                                                        {"wi-fi", "Wi-Fi Analyzer"},
                                                        {"wifianalyzer", "Wi-Fi Analyzer"},
                                                        {"fi le station", "File Station"}}) {
    EXPECT_EQ(index.Find(query), Strings{id}) << query;
  }
}

TEST(FallbackTest, MarksAreLeftOutWhenNothingElseIsFound) {
  MemoryIndex thai("tha");
  thai.Add("it", "ไฟล์ใหม่");
  thai.Add("other", "กข");
  EXPECT_EQ(thai.Find("ไฟล"), Strings{"it"});
  EXPECT_EQ(thai.Find("ใหม"), Strings{"it"});
  MemoryIndex japanese("jpn");
  japanese.Add("it", "バックアップ");
  japanese.Add("other", "メモ");
  EXPECT_EQ(japanese.Find("ハックアッフ"), Strings{"it"});
  EXPECT_EQ(japanese.Find("はつくあつぷ"), Strings{}) << "small letters are letters of their own";
}

TEST(FallbackTest, PartsOfWordsAreFoundWithoutAMemberForThem) {
  MemoryIndex index("enu", test::FromText(R"({"property_id":"id"})"));
  index.Add(test::FromText(R"({"id":"it","name":"BitTorrent"})"));
  index.Add(test::FromText(R"({"id":"other","name":"Qwxyz"})"));
  EXPECT_EQ(index.Find("torrent"), Strings{"it"});
  EXPECT_EQ(index.MatchedBy("torrent"), "ngram");
  EXPECT_EQ(index.Find("torent"), Strings{}) << "a part and a slip in it are too little";
}

}  // namespace
}  // namespace searchd
