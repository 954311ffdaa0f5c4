// The search document of one record in one language.
#include <gmock/gmock.h>
#include <json/value.h>

#include <cerrno>

#include "appindex/index_mgr_internal.h"
#include "appindex/utilities/json_helpers.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"

namespace velkor::appindex {
namespace {

using test::Parse;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

class IndexDocument : public test::DeviceRootTest {
 protected:
  IndexDocument() {
    test::WriteFile("/var/packages/App/ui/texts/enu/strings",
                    "[app]\ntitle=\"Backup\"\ndesc=\"Copies files\"\na=\"copy\"\nb=\"restore\"\n");
    test::WriteFile("/var/packages/App/ui/texts/ger/strings",
                    "[app]\ntitle=\"Sicherung\"\ndesc=\"Kopiert Dateien\"\na=\"kopieren\"\n"
                    "b=\"zurück\"\n");
    test::WriteFile("/var/packages/App/ui/strs/ger/strings", "[app]\ntitle=\"Anders\"\n");
    test::WriteFile("/var/packages/App/ui/strs/enu/strings", "[app]\ntitle=\"Different\"\n");
    test::WriteFile("/usr/tovo/tovoman/webman/texts/ger/strings", "[app]\ntitle=\"Eingebaut\"\n");
  }

  // A record with these members beside its path, id and owner.
  static Json::Value Record(const std::string& members) {
    Json::Value record = Parse(members);
    record["path"] = "/var/packages/App/ui/index.conf";
    record["id"] = "App";
    record["owner"] = "";
    return record;
  }

  Json::Value German(const std::string& members) {
    return MakeDocument(pool_, "ger", Record(members));
  }

  // The document's "keywords" for a descriptor's keywords, without title.
  std::string Keywords(const std::string& keywords) {
    return German(R"({"stringset":"none","keywords":)" + keywords + "}")["keywords"].asString();
  }

  // The line about `keywords`; it ends in `ending`.
  static std::string MalformedLine(const std::string& keywords, const std::string& ending = "") {
    return test::FailureLine("index_mgr", 225, "Add",
                             "Malformed keywords: " + toString(Parse(keywords)) + ending);
  }

  StringPool pool_;
};

TEST_F(IndexDocument, HasExactlyItsSixMembers) {
  EXPECT_EQ(German(R"({"title":"app:title","desc":"app:desc","keywords":["app:a"]})"),
            Parse(R"({"id":"App","owner":"","title":"Sicherung","desc":"Kopiert Dateien",
                      "keywords":"Backup kopieren copy ","search_title":"Sicherung"})"));
}

TEST_F(IndexDocument, CopiesIdAndOwnerOfAModule) {
  Json::Value record = Record(R"({"title":"T"})");
  record["id"] = "App?p=1";
  record["owner"] = "App";
  const Json::Value document = MakeDocument(pool_, "ger", record);
  EXPECT_EQ(document["id"], "App?p=1");
  EXPECT_EQ(document["owner"], "App");
}

TEST_F(IndexDocument, WithoutKeywordsHasTheEnglishTitleAndABlank) {
  EXPECT_EQ(German(R"({"title":"app:title"})")["keywords"], "Backup ");
  EXPECT_EQ(German(R"({"title":"app:title","keywords":[]})")["keywords"], "Backup ");
}

TEST_F(IndexDocument, WithoutTitleAndDescHasEmptyTexts) {
  EXPECT_EQ(German("{}"), Parse(R"({"id":"App","owner":"","title":"","desc":"","keywords":" ",
                                    "search_title":""})"));
}

TEST_F(IndexDocument, LiteralTextsStandInEveryLanguage) {
  const Json::Value document =
      German(R"({"title":"Fax","desc":"Sends faxes","keywords":["ISDN"]})");
  EXPECT_EQ(document["title"], "Fax");
  EXPECT_EQ(document["desc"], "Sends faxes");
  EXPECT_EQ(document["keywords"], "Fax ISDN ISDN ");
}

TEST_F(IndexDocument, StringKeywordGivesThisLanguageThenEnglish) {
  EXPECT_EQ(German(R"({"title":"T","keywords":["app:a","app:b"]})")["keywords"],
            "T kopieren copy zurück restore ");
}

TEST_F(IndexDocument, WeightIsRepetitionOfThePairAtMostFiveTimes) {
  EXPECT_EQ(German(R"({"title":"T","keywords":["app:a",{"text":"app:b","weight":9}]})")["keywords"],
            "T kopieren copy zurück restore zurück restore zurück restore zurück restore "
            "zurück restore ");
  EXPECT_EQ(Keywords(R"([{"text":"a","weight":2}])"), " a a a a ");
  EXPECT_EQ(Keywords(R"([{"text":"a","weight":5}])"), Keywords(R"([{"text":"a","weight":6}])"));
}

TEST_F(IndexDocument, WeightOfZeroOrLessContributesNothing) {
  EXPECT_EQ(Keywords(R"([{"text":"a","weight":0},{"text":"b","weight":-3},"c"])"), " c c ");
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(IndexDocument, MissingWeightCountsOne) { EXPECT_EQ(Keywords(R"([{"text":"a"}])"), " a a "); }

TEST_F(IndexDocument, WeightThatIsNotAnIntegerCountsOne) {
  EXPECT_EQ(Keywords(R"([{"text":"a","weight":"3"},{"text":"b","weight":2.5},
                         {"text":"c","weight":true},{"text":"d","weight":null},
                         {"text":"e","weight":[4]}])"),
            " a a b b c c d d e e ");
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(IndexDocument, KeywordWithoutTextIsLoggedAndTheOthersStay) {
  constexpr char kKeywords[] = R"(["a",{"weight":2},{"text":"b"}])";
  errno = 0;
  EXPECT_EQ(Keywords(kKeywords), " a a b b ");
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(MalformedLine(kKeywords)));
}

TEST_F(IndexDocument, KeywordWithoutTextAfterAStaleErrnoShowsItAndClearsIt) {
  constexpr char kKeywords[] = R"([{"weight":2}])";
  errno = ENOENT;
  EXPECT_EQ(Keywords(kKeywords), " ");
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(),
              ElementsAre(MalformedLine(kKeywords, " [err: No such file or directory]")));
}

TEST_F(IndexDocument, KeywordWhoseTextIsNoStringIsLogged) {
  constexpr char kKeywords[] = R"([{"text":["a"]},"b"])";
  errno = 0;
  EXPECT_EQ(Keywords(kKeywords), " b b ");
  EXPECT_THAT(TakeLog(), ElementsAre(MalformedLine(kKeywords)));
}

TEST_F(IndexDocument, EachMalformedKeywordHasALine) {
  constexpr char kKeywords[] = R"([{},{}])";
  errno = 0;
  EXPECT_EQ(Keywords(kKeywords), " ");
  EXPECT_THAT(TakeLog(), ElementsAre(MalformedLine(kKeywords), MalformedLine(kKeywords)));
}

TEST_F(IndexDocument, ScalarKeywordElementsAreTakenAsText) {
  EXPECT_EQ(Keywords("[5,true]"), " 5 5 true true ");
}

TEST_F(IndexDocument, KeywordsObjectIsWalkedOverItsValuesInMemberOrder) {
  EXPECT_EQ(Keywords(R"({"b":"x","a":{"text":"y"}})"), " y y x x ");
}

TEST_F(IndexDocument, ScalarKeywordsGiveNone) {
  for (const char* keywords : {"\"a\"", "5", "true", "null"}) EXPECT_EQ(Keywords(keywords), " ");
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(IndexDocument, StringsetNamesTheTextsBesideTheDescriptor) {
  const Json::Value document = German(R"({"title":"app:title","stringset":"strs"})");
  EXPECT_EQ(document["title"], "Anders");
  EXPECT_EQ(document["keywords"], "Different ");
}

TEST_F(IndexDocument, StringsetThatIsNoStringUsesTheDescriptorsOwnTexts) {
  for (const char* stringset : {"5", "null", "[\"strs\"]", "true"}) {
    EXPECT_EQ(
        German(R"({"title":"app:title","stringset":)" + std::string(stringset) + "}")["title"],
        "Sicherung")
        << stringset;
  }
}

TEST_F(IndexDocument, TextsRootIsSetAnewForEachRecord) {
  EXPECT_EQ(German(R"({"title":"app:title","stringset":"strs"})")["title"], "Anders");
  EXPECT_EQ(German(R"({"title":"app:title"})")["title"], "Sicherung");
}

TEST_F(IndexDocument, BuiltInModuleUsesTheBuiltInTexts) {
  Json::Value record = Record(R"({"title":"app:title"})");
  record["path"] = "/usr/tovo/tovoman/webman/modules/App/index.conf";
  EXPECT_EQ(MakeDocument(pool_, "ger", record)["title"], "Eingebaut");
}

TEST_F(IndexDocument, UnresolvedReferencesAreInsertedAsTheyCome) {
  const Json::Value document = German(R"({"title":"none:title","desc":"app:none"})");
  EXPECT_EQ(document["title"], "none:title");
  EXPECT_EQ(document["desc"], "");
}

TEST_F(IndexDocument, LanguageWithoutTextsUsesEnglish) {
  EXPECT_EQ(MakeDocument(pool_, "jpn", Record(R"({"title":"app:title"})"))["title"], "Backup");
}

TEST_F(IndexDocument, TitleThatIsNoTextThrowsTheJsonLibrarysOwnException) {
  EXPECT_THROW(German(R"({"title":["t"]})"), Json::Exception);
  EXPECT_THROW(German(R"({"desc":{"a":1}})"), Json::Exception);
  EXPECT_THROW(German(R"({"keywords":[["k"]]})"), Json::Exception);
  EXPECT_THAT(TakeLog(), IsEmpty());
}

}  // namespace
}  // namespace velkor::appindex
