// Adding and removing one application.
#include "appindex/index_mgr.h"

#include <gmock/gmock.h>
#include <json/value.h>

#include <functional>
#include <set>

#include "tests/support/controlled_time.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"

namespace velkor::appindex {
namespace {

using test::AddCommands;
using test::ConfOf;
using test::DelCommands;
using test::FailureLine;
using test::Install;
using test::Joined;
using test::PerLang;
using test::ScriptedDaemon;
using test::ThrownBy;
using ::testing::Contains;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::StartsWith;

constexpr unsigned kPauseMicroseconds = 10000;
const std::vector<test::Reaction> kSucceed;

// Fails the n-th request (counted from 1) with `code`.
ScriptedDaemon::React FailingAt(int n, int code) {
  return [n, code, count = 0](const Json::Value&) mutable {
    return ++count == n ? test::Failure(code, "scripted") : test::Success();
  };
}

class IndexAdd : public test::DeviceRootTest {};
class IndexDel : public test::DeviceRootTest {};

TEST_F(IndexAdd, WritesAndCommitsEachLanguageInAscendingOrder) {
  ScriptedDaemon daemon(kSucceed);
  Add(Install("App"), true);
  EXPECT_EQ(daemon.Commands(), AddCommands("App"));
  EXPECT_THAT(TakeLog(), ElementsAre("index_mgr:190 Add: " + ConfOf("App")));
}

TEST_F(IndexAdd, WithoutCommitSendsNone) {
  ScriptedDaemon daemon(kSucceed);
  Add(Install("App"), false);
  EXPECT_EQ(daemon.Commands(), PerLang({"document_upsert_by_id appindex_LANG App"}));
}

TEST_F(IndexAdd, CommitsALanguageOnceAfterItsLastRecord) {
  ScriptedDaemon daemon(kSucceed);
  test::WriteFile(ConfOf("App"), R"([{"app":"B","modules":[{"params":"p"}]},{"app":"A"}])");
  Add(ConfOf("App"), true);
  EXPECT_EQ(
      daemon.Commands(),
      PerLang({"document_upsert_by_id appindex_LANG B", "document_upsert_by_id appindex_LANG B?p",
               "document_upsert_by_id appindex_LANG A", "commit appindex_LANG"}));
}

TEST_F(IndexAdd, SendsTheDocumentOfEachLanguage) {
  ScriptedDaemon daemon(kSucceed);
  test::WriteFile("/var/packages/App/target/ui/texts/enu/strings", "[app]\nt=\"Backup\"\n");
  test::WriteFile("/var/packages/App/target/ui/texts/ger/strings", "[app]\nt=\"Sicherung\"\n");
  test::WriteFile(ConfOf("App"), R"({"app":"X","title":"app:t","desc":"d","keywords":["k"]})");
  Add(ConfOf("App"), false);
  for (const Json::Value& request : daemon.Requests()) {
    const std::string title = request["data"]["id"] == "appindex_ger" ? "Sicherung" : "Backup";
    Json::Value document =
        test::Parse(R"({"id":"X","owner":"","desc":"d","keywords":"Backup k k "})");
    document["title"] = title;
    document["search_title"] = title;
    EXPECT_EQ(request["data"]["data"], document) << request;
  }
}

TEST_F(IndexAdd, PathThatIsNotIndexConfDoesNothingAndLogsNothing) {
  ScriptedDaemon daemon(kSucceed);
  for (const char* name : {"index.conf.bak", "Index.conf", "my_index.conf", "index.conf/", ""}) {
    const std::string path = std::string("/var/packages/App/") + name;
    test::WriteFile("/var/packages/App/index.conf.bak", R"({"app":"X"})");
    Add(path, true);
  }
  EXPECT_EQ(daemon.Connections(), 0);
  EXPECT_THAT(TakeLog(), IsEmpty());
  EXPECT_THAT(test::Time().usleeps, IsEmpty());
}

TEST_F(IndexAdd, PausesBeforeEverySingleUpsertAndOnlyThere) {
  ScriptedDaemon daemon(kSucceed);
  std::vector<std::size_t> requests_at_pause;
  test::Time().on_usleep = [&](unsigned) { requests_at_pause.push_back(daemon.Requests().size()); };
  Add(Install("App"), true);
  test::Time().on_usleep = nullptr;
  std::vector<std::size_t> expected;
  for (std::size_t lang = 0; lang < 21; ++lang) expected.push_back(2 * lang);
  EXPECT_EQ(requests_at_pause, expected);
  EXPECT_EQ(test::Time().usleeps, std::vector<unsigned>(21, kPauseMicroseconds));
}

TEST_F(IndexAdd, ReadsTheDescriptorAgainForEachLanguage) {
  ScriptedDaemon daemon(kSucceed);
  Install("App");
  test::Time().on_usleep = [](unsigned) { test::WriteFile(ConfOf("App"), R"({"app":"New"})"); };
  Add(ConfOf("App"), false);
  test::Time().on_usleep = nullptr;
  auto expected = PerLang({"document_upsert_by_id appindex_LANG New"});
  expected[0] = "document_upsert_by_id appindex_chs App";
  EXPECT_EQ(daemon.Commands(), expected);
}

TEST_F(IndexAdd, DescriptorEmptiedBetweenTwoLanguagesIsMalformedFromThenOn) {
  ScriptedDaemon daemon(kSucceed);
  Install("App");
  test::Time().on_usleep = [](unsigned) { test::WriteFile(ConfOf("App"), ""); };
  Add(ConfOf("App"), false);
  test::Time().on_usleep = nullptr;
  EXPECT_EQ(daemon.Commands(), std::vector<std::string>{"document_upsert_by_id appindex_chs App"});
  EXPECT_EQ(TakeLog().size(), 1U + 20U);
}

TEST_F(IndexAdd, MalformedDescriptorIsLoggedForEachLanguageAndStillCommitted) {
  ScriptedDaemon daemon(kSucceed);
  test::WriteFile(ConfOf("App"), "{");
  errno = 0;
  Add(ConfOf("App"), true);
  EXPECT_EQ(daemon.Commands(), PerLang({"commit appindex_LANG"}));
  std::vector<std::string> log(
      21, FailureLine("index_mgr", 36, "FindIndexables", "Malformed index.conf: " + ConfOf("App")));
  log.insert(log.begin(), "index_mgr:190 Add: " + ConfOf("App"));
  EXPECT_EQ(TakeLog(), log);
}

TEST_F(IndexAdd, UnreadableDescriptorWithoutCommitSendsNothing) {
  ScriptedDaemon daemon(kSucceed);
  Add(ConfOf("Gone"), false);
  EXPECT_EQ(daemon.Connections(), 0);
}

TEST_F(IndexAdd, EntriesThatTheDeviceFiltersExcludeAreNotWritten) {
  ScriptedDaemon daemon(kSucceed);
  test::WriteFile(ConfOf("App"), R"([{"app":"A","enable":{"model":["M1"]}},{"app":"B"}])");
  Add(ConfOf("App"), false);
  EXPECT_EQ(daemon.Commands(), PerLang({"document_upsert_by_id appindex_LANG B"}));
}

TEST_F(IndexAdd, UnreadableDeviceIdentityReachesTheCaller) {
  ScriptedDaemon daemon(kSucceed);
  test::WriteFile("/etc/tovoinfo.conf", "");
  test::WriteFile(ConfOf("App"), R"({"app":"A","enable":{"model":["M1"]}})");
  EXPECT_EQ(ThrownBy([] { Add(ConfOf("App"), true); }).code, Error::kGeneralError);
  EXPECT_EQ(daemon.Connections(), 0);
}

TEST_F(IndexAdd, IdThatIsNotAStringIsError120BeforeAnythingIsSent) {
  ScriptedDaemon daemon(kSucceed);
  for (const char* text : {R"({"app":5})", R"({"title":"no app"})"}) {
    test::WriteFile(ConfOf("App"), text);
    const Error error = ThrownBy([] { Add(ConfOf("App"), true); });
    EXPECT_EQ(error.code, Error::kJsonError) << text;
    EXPECT_THAT(error.what(), StartsWith("Not a string, data=")) << text;
  }
  EXPECT_EQ(daemon.Connections(), 0);
}

TEST_F(IndexAdd, TitleThatIsNoTextReachesTheCallerAsTheJsonLibrarysException) {
  ScriptedDaemon daemon(kSucceed);
  test::WriteFile(ConfOf("App"), R"([{"app":"A"},{"app":"B","title":["t"]}])");
  EXPECT_THROW(Add(ConfOf("App"), true), Json::Exception);
  EXPECT_THAT(daemon.Commands(), ElementsAre("document_upsert_by_id appindex_chs A"));
}

TEST_F(IndexAdd, MissingIndexInTheSecondLanguageTriggersOneReindexAndNoError) {
  Install("App");
  ScriptedDaemon daemon(FailingAt(3, 601));
  errno = 0;
  Add(ConfOf("App"), true);
  EXPECT_EQ(daemon.Commands(),
            Joined({{"document_upsert_by_id appindex_chs App", "commit appindex_chs",
                     "document_upsert_by_id appindex_cht App"},
                    test::ReindexCommands({"App"})}));
  const std::vector<std::string> log = TakeLog();
  ASSERT_EQ(log.size(), 5U);
  EXPECT_EQ(log[0], "index_mgr:190 Add: " + ConfOf("App"));
  EXPECT_THAT(log[1], ::testing::HasSubstr("(SendRequestImpl) Request failed: "));
  EXPECT_EQ(log[2], FailureLine("index_mgr", 245, "Add", "Do reindex to recover missing indices"));
  EXPECT_EQ(log[3], "index_mgr:290 Reindex app");
  EXPECT_EQ(log[4], "index_mgr:190 Add: " + ConfOf("App"));
}

TEST_F(IndexAdd, MissingIndexAtACommitTriggersAReindexToo) {
  Install("App");
  ScriptedDaemon daemon(FailingAt(2, 601));
  Add(ConfOf("App"), true);
  EXPECT_EQ(daemon.Commands(),
            Joined({{"document_upsert_by_id appindex_chs App", "commit appindex_chs"},
                    test::ReindexCommands({"App"})}));
}

TEST_F(IndexAdd, FailureOfTheRecoveringReindexReachesTheCaller) {
  Install("App");
  ScriptedDaemon daemon({test::Failure(601, "none"), test::Failure(605, "disk")});
  const Error error = ThrownBy([] { Add(ConfOf("App"), true); });
  EXPECT_EQ(error.code, 605);
  EXPECT_STREQ(error.what(), "Request failed, msg=disk");
}

TEST_F(IndexAdd, TransportFailureReachesTheCallerAndWhatWasWrittenStays) {
  Install("App");
  ScriptedDaemon daemon({test::Success(), test::Success(), {test::Reaction::kHangUp, ""}});
  const Error error = ThrownBy([] { Add(ConfOf("App"), true); });
  EXPECT_EQ(error.code, Error::kElasticdRequestError);
  EXPECT_THAT(error.what(), StartsWith("Recv failed, req="));
  EXPECT_EQ(daemon.Commands().size(), 3U);
}

TEST_F(IndexAdd, DaemonsOtherFailureReachesTheCallerWithItsCodeAndReason) {
  ScriptedDaemon daemon({test::Failure(605, "disk full")});
  const Error error = ThrownBy([] { Add(Install("App"), true); });
  EXPECT_EQ(error.code, 605);
  EXPECT_STREQ(error.what(), "Request failed, msg=disk full");
  EXPECT_STREQ(error.std::runtime_error::what(),
               "Velkor error, code=605, reason=[Request failed, msg=disk full]");
  EXPECT_EQ(daemon.Connections(), 1);
}

TEST_F(IndexAdd, DaemonThatLosesEveryIndexEndsInItsErrorAndNotInRebuildsWithoutEnd) {
  const std::string conf = Install("App");
  ScriptedDaemon daemon([](const Json::Value& request) {
    return request["command"] == "document_upsert_by_id" ? test::Failure(601, "none")
                                                         : test::Success();
  });
  EXPECT_EQ(ThrownBy([&] { Add(conf, true); }).code, 601);
  constexpr int kNestedRebuilds = 8;
  EXPECT_EQ(daemon.Requests().size(), 1U + kNestedRebuilds * (21U * 2U + 1U));

  // Nothing of it stays: the next call recovers again.
  EXPECT_EQ(ThrownBy([&] { Add(conf, true); }).code, 601);
  EXPECT_EQ(daemon.Requests().size(), 2U * (1U + kNestedRebuilds * (21U * 2U + 1U)));
}

TEST_F(IndexDel, DeletesAndCommitsEachLanguageInAscendingOrder) {
  ScriptedDaemon daemon(kSucceed);
  Del(Install("App"), true);
  EXPECT_EQ(daemon.Commands(), DelCommands("App"));
  EXPECT_THAT(TakeLog(), ElementsAre("index_mgr:255 Del: " + ConfOf("App")));
}

TEST_F(IndexDel, WithoutCommitSendsNoneAndNeverPauses) {
  ScriptedDaemon daemon(kSucceed);
  Del(Install("App"), false);
  EXPECT_EQ(daemon.Commands(), PerLang({"document_del_by_id appindex_LANG App"}));
  EXPECT_THAT(test::Time().usleeps, IsEmpty());
}

TEST_F(IndexDel, PathThatIsNotIndexConfDoesNothingAndLogsNothing) {
  ScriptedDaemon daemon(kSucceed);
  test::WriteFile("/var/packages/App/index.conf.bak", R"({"app":"X"})");
  Del("/var/packages/App/index.conf.bak", true);
  Del("/var/packages/App/Index.conf", true);
  EXPECT_EQ(daemon.Connections(), 0);
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(IndexDel, ModulesAreDeletedUnderTheirCompositeIds) {
  ScriptedDaemon daemon(kSucceed);
  test::WriteFile(ConfOf("App"), R"({"app":"X","modules":[{"params":"p=1"},{}]})");
  Del(ConfOf("App"), false);
  EXPECT_EQ(daemon.Commands(),
            PerLang({"document_del_by_id appindex_LANG X", "document_del_by_id appindex_LANG X?p=1",
                     "document_del_by_id appindex_LANG X?"}));
}

TEST_F(IndexDel, EntriesThatTheDeviceFiltersExcludeAreNotDeleted) {
  ScriptedDaemon daemon(kSucceed);
  test::WriteFile(ConfOf("App"), R"([{"app":"A","disable":{"platform":["helios"]}},{"app":"B"}])");
  Del(ConfOf("App"), false);
  EXPECT_EQ(daemon.Commands(), PerLang({"document_del_by_id appindex_LANG B"}));
}

TEST_F(IndexDel, IdIsTakenAsAString) {
  ScriptedDaemon daemon(kSucceed);
  test::WriteFile(ConfOf("App"), R"([{"app":5},{"title":"no app"}])");
  Del(ConfOf("App"), false);
  EXPECT_EQ(daemon.Commands(),
            PerLang({"document_del_by_id appindex_LANG 5", "document_del_by_id appindex_LANG "}));
}

TEST_F(IndexDel, AfterTheDescriptorWasRemovedDeletesNothingAndStillCommits) {
  ScriptedDaemon daemon(kSucceed);
  unlink(Install("App").c_str());
  Del(ConfOf("App"), true);
  EXPECT_EQ(daemon.Commands(), PerLang({"commit appindex_LANG"}));
  const std::vector<std::string> log = TakeLog();
  ASSERT_EQ(log.size(), 22U);
  EXPECT_EQ(log[0], "index_mgr:255 Del: " + ConfOf("App"));
  EXPECT_EQ(log[21], FailureLine("index_mgr", 36, "FindIndexables",
                                 "Malformed index.conf: " + ConfOf("App") +
                                     " [err: No such file or directory]"));
}

TEST_F(IndexDel, MissingIndexIsNotRecovered) {
  Install("App");
  ScriptedDaemon daemon(FailingAt(3, 601));
  const Error error = ThrownBy([] { Del(ConfOf("App"), true); });
  EXPECT_EQ(error.code, Error::kDaemonIndexMissing);
  EXPECT_STREQ(error.what(), "Request failed, msg=scripted");
  EXPECT_THAT(daemon.Commands(),
              ElementsAre("document_del_by_id appindex_chs App", "commit appindex_chs",
                          "document_del_by_id appindex_cht App"));
}

TEST_F(IndexDel, FailureOfACommitReachesTheCallerAndTheRestIsUntouched) {
  Install("App");
  ScriptedDaemon daemon(FailingAt(2, 605));
  EXPECT_EQ(ThrownBy([] { Del(ConfOf("App"), true); }).code, 605);
  EXPECT_EQ(daemon.Connections(), 2);
}

TEST_F(IndexDel, UnreadableDeviceIdentityReachesTheCaller) {
  ScriptedDaemon daemon(kSucceed);
  test::WriteFile("/etc/tovoinfo.conf", "");
  test::WriteFile(ConfOf("App"), R"({"app":"A","enable":{"model":["M1"]}})");
  EXPECT_EQ(ThrownBy([] { Del(ConfOf("App"), true); }).code, Error::kGeneralError);
}

}  // namespace
}  // namespace velkor::appindex
