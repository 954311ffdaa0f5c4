// The commands to the search daemon and the schema of an app index.
#include <gmock/gmock.h>
#include <json/value.h>

#include <cerrno>
#include <string>

#include "appindex/elastic_control.h"
#include "appindex/elastic_control_internal.h"
#include "appindex/utilities/json_helpers.h"
#include "error_of.h"
#include "tests/support/controlled_time.h"
#include "tests/support/device_root_test.h"
#include "tests/support/scripted_daemon.h"

namespace velkor::appindex::elastic {
namespace {

using test::ErrorOf;
using test::Failure;
using test::FailureLine;
using test::Reply;
using test::ScriptedDaemon;
using test::Time;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr char kMappings[] = R"({
  "property_id": "id",
  "default": {
    "type": "string", "analyzer": "tovostandard", "required": false, "stored": true, "_all": true
  },
  "properties": {
    "id": {"analyzer": "keyword", "required": true, "_all": false},
    "owner": {"analyzer": "keyword", "_all": false},
    "title": {"type": "text"},
    "desc": {"type": "text"},
    "keywords": {"type": "text"},
    "search_title": {
      "type": "text", "analyzer": "white space", "preprocess": ["tolower", "ngram"]
    }
  }
})";

Json::Value Parse(const std::string& text) {
  Json::Value value;
  EXPECT_TRUE(fromString(value, text)) << text;
  return value;
}

Json::Value Document() {
  return Parse(R"({"id":"App?p=1","owner":"App","title":"Überblick","desc":"d","keywords":"k ",
                   "search_title":"Überblick","own field":"x"})");
}

class CommandTest : public test::DeviceRootTest {
 protected:
  // The one request that `command` makes the library send.
  template <typename Command>
  static Json::Value RequestOf(const Command& command) {
    ScriptedDaemon daemon;
    command();
    EXPECT_EQ(daemon.Connections(), 1);
    return daemon.Requests().at(0);
  }
};

TEST_F(CommandTest, TheIndexIdIsThePrefixAndTheLanguageCodeUnchanged) {
  EXPECT_EQ(GetAppIndexID("enu"), "appindex_enu");
  EXPECT_EQ(GetAppIndexID(""), "appindex_");
  EXPECT_EQ(GetAppIndexID("No Such/Language"), "appindex_No Such/Language");
}

TEST_F(CommandTest, CreateSendsTheStoragePathEmptySettingsAndTheSchemaAsAnObject) {
  Json::Value expected = Parse(R"({"command":"index_create","data":{
      "id":"appindex_enu","path":"/var/packages/Velkor/etc/appindex.db/enu","settings":{}}})");
  expected["data"]["mappings"] = Parse(kMappings);
  EXPECT_EQ(RequestOf([] { AppIndexCreate("enu"); }), expected);
}

TEST_F(CommandTest, DeleteSendsTheIndexId) {
  EXPECT_EQ(RequestOf([] { AppIndexDelete("trk"); }),
            Parse(R"({"command":"index_delete","data":{"id":"appindex_trk"}})"));
}

TEST_F(CommandTest, UpsertSendsTheIdTwiceAndTheWholeDocument) {
  Json::Value expected = Parse(
      R"({"command":"document_upsert_by_id","data":{"id":"appindex_ger","doc_id":"App?p=1"}})");
  expected["data"]["data"] = Document();
  EXPECT_EQ(RequestOf([] { IndexUpsert("ger", Document()); }), expected);
}

TEST_F(CommandTest, UpsertOfAnEmptyIdIsSent) {
  const Json::Value request = RequestOf([] { IndexUpsert("enu", Parse(R"({"id":""})")); });
  EXPECT_EQ(request["data"]["doc_id"], "");
}

TEST_F(CommandTest, IndexDeleteSendsTheDocumentIdAsItStandsEvenIfEmpty) {
  EXPECT_EQ(RequestOf([] { IndexDelete("enu", "App?a=\"b\""); }),
            Parse(R"({"command":"document_del_by_id",
                      "data":{"id":"appindex_enu","doc_id":"App?a=\"b\""}})"));
  EXPECT_EQ(RequestOf([] { IndexDelete("enu", ""); }),
            Parse(R"({"command":"document_del_by_id","data":{"id":"appindex_enu","doc_id":""}})"));
}

TEST_F(CommandTest, CommitSendsTheIndexId) {
  EXPECT_EQ(RequestOf([] { IndexCommit("enu"); }),
            Parse(R"({"command":"commit","data":{"id":"appindex_enu"}})"));
}

struct BadDocument {
  const char* name;
  const char* document;
  const char* reason;  // before the data
};

class BadDocumentTest : public test::DeviceRootTest,
                        public ::testing::WithParamInterface<BadDocument> {};

TEST_P(BadDocumentTest, UpsertThrows120AndSendsNothing) {
  const Json::Value document = Parse(GetParam().document);
  ScriptedDaemon daemon;
  EXPECT_EQ(ErrorOf([&] { IndexUpsert("enu", document); }),
            std::string("120: ") + GetParam().reason + AppendData(document));
  EXPECT_EQ(daemon.Connections(), 0);
  EXPECT_THAT(TakeLog(), IsEmpty());
}

INSTANTIATE_TEST_SUITE_P(
    , BadDocumentTest,
    ::testing::Values(BadDocument{"IdIsANumber", R"({"id":5,"title":"t"})", "Not a string"},
                      BadDocument{"IdIsNull", R"({"id":null})", "Not a string"},
                      BadDocument{"IdIsABool", R"({"id":true})", "Not a string"},
                      BadDocument{"IdIsAnArray", R"({"id":["a"]})", "Not a string"},
                      BadDocument{"IdIsAnObject", R"({"id":{}})", "Not a string"},
                      BadDocument{"NoId", R"({"title":"t"})", "Missing property: id"},
                      BadDocument{"NotAnObject", R"(["id"])", "Not an object"},
                      BadDocument{"Null", "null", "Not an object"}),
    [](const auto& param_info) { return param_info.param.name; });

struct NamedCommand {
  const char* name;
  void (*run)();
};

class EveryCommandTest : public test::DeviceRootTest,
                         public ::testing::WithParamInterface<NamedCommand> {};

TEST_P(EveryCommandTest, PassesTheDaemonsCodeThrough) {
  ScriptedDaemon daemon({Failure(602, "index exists")});
  EXPECT_EQ(ErrorOf(GetParam().run), "602: Request failed, msg=index exists");
}

TEST_P(EveryCommandTest, PassesATransportFailureThrough) {
  ScriptedDaemon daemon({Reply("no JSON")});
  EXPECT_THAT(ErrorOf(GetParam().run), ::testing::StartsWith("913: Recv failed, req={"));
}

TEST_P(EveryCommandTest, WaitsForADaemonThatIsNotReadyOrBusy) {
  ScriptedDaemon daemon({Failure(608, "not yet"), Failure(1400, "busy")});
  EXPECT_EQ(ErrorOf(GetParam().run), "nothing");
  EXPECT_THAT(Time().sleeps, ElementsAre(30, 900));
  EXPECT_EQ(daemon.Requests().at(0), daemon.Requests().at(2));
}

INSTANTIATE_TEST_SUITE_P(
    , EveryCommandTest,
    ::testing::Values(NamedCommand{"AppIndexCreate", [] { AppIndexCreate("enu"); }},
                      NamedCommand{"AppIndexDelete", [] { AppIndexDelete("enu"); }},
                      NamedCommand{"IndexUpsert", [] { IndexUpsert("enu", Document()); }},
                      NamedCommand{"IndexDelete", [] { IndexDelete("enu", "App"); }},
                      NamedCommand{"IndexCommit", [] { IndexCommit("enu"); }}),
    [](const auto& param_info) { return param_info.param.name; });

class MappingsTest : public test::DeviceRootTest {
 protected:
  static std::string Line(const std::string& tail) {
    return FailureLine("elastic_control", 58, "GetAppIndexMappings",
                       "Failed [!ret.fromString(mappings)], reason: " + tail);
  }
};

TEST_F(MappingsTest, AreTheSchemaAsAnObject) { EXPECT_EQ(GetAppIndexMappings(), Parse(kMappings)); }

TEST_F(MappingsTest, ATextThatDoesNotParseIs502WithoutAReason) {
  errno = 0;
  EXPECT_EQ(ErrorOf([] { GetAppIndexMappings("{"); }), "502: ");
  EXPECT_THAT(TakeLog(), ElementsAre(Line("")));
}

TEST_F(MappingsTest, ATextThatDoesNotParseLogsStaleErrnoAndClearsIt) {
  errno = ENOENT;
  EXPECT_EQ(ErrorOf([] { GetAppIndexMappings("{"); }), "502: ");
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(Line(" [err: No such file or directory]")));
}

}  // namespace
}  // namespace velkor::appindex::elastic
