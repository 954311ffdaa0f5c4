// Reading a descriptor into indexable records.
#include <gmock/gmock.h>
#include <sys/stat.h>

#include <cerrno>

#include "appindex/index_mgr_internal.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"

namespace velkor::appindex {
namespace {

using test::FailureLine;
using test::Parse;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr char kConf[] = "/var/packages/App/index.conf";
const Json::Value kNoRecords(Json::arrayValue);

class IndexDescriptor : public test::DeviceRootTest {
 protected:
  // The records of a descriptor with this text.
  Json::Value Read(const std::string& text, int stale_errno = 0) {
    test::WriteFile(kConf, text);
    errno = stale_errno;
    return FindIndexables(kConf);
  }

  // Their ids only.
  std::vector<std::string> Ids(const std::string& text) {
    std::vector<std::string> ids;
    for (const Json::Value& record : Read(text)) ids.push_back(record["id"].asString());
    return ids;
  }

  static std::string MalformedLine(const std::string& path, const std::string& ending = "") {
    return FailureLine("index_mgr", 36, "FindIndexables", "Malformed index.conf: " + path + ending);
  }
};

TEST_F(IndexDescriptor, RootObjectIsOneEntryWithNullForMissingMembers) {
  EXPECT_EQ(Read(R"({"app":"X","title":"t"})"), Parse(R"([{
    "path":"/var/packages/App/index.conf","id":"X","title":"t","desc":null,"keywords":null,
    "stringset":null,"owner":""}])"));
}

TEST_F(IndexDescriptor, EntryMembersAreCopiedIntoTheRecordAsTheyStand) {
  EXPECT_EQ(Read(R"([{"app":7,"title":["t"],"desc":true,"keywords":{"a":1},"stringset":1.5}])"),
            Parse(R"([{"path":"/var/packages/App/index.conf","id":7,"title":["t"],"desc":true,
                       "keywords":{"a":1},"stringset":1.5,"owner":""}])"));
}

TEST_F(IndexDescriptor, ModuleHasTheEntrysAppBeforeItsParamsAndTheEntrysStringset) {
  EXPECT_EQ(Read(R"({"app":"X","title":"t","desc":"d","stringset":"strs","modules":[
                      {"params":"p=1","title":"mt","desc":"md","keywords":["k"],
                       "app":"ignored","stringset":"ignored"}]})"),
            Parse(R"([
    {"path":"/var/packages/App/index.conf","id":"X","title":"t","desc":"d","keywords":null,
     "stringset":"strs","owner":""},
    {"path":"/var/packages/App/index.conf","id":"X?p=1","title":"mt","desc":"md","keywords":["k"],
     "stringset":"strs","owner":"X"}])"));
}

TEST_F(IndexDescriptor, RecordsComeInFileOrderEachEntryBeforeItsModules) {
  EXPECT_THAT(Ids(R"([{"app":"Z","modules":[{"params":"2"},{"params":"1"}]},{"app":"A"}])"),
              ElementsAre("Z", "Z?2", "Z?1", "A"));
}

TEST_F(IndexDescriptor, ModuleWithoutParamsHasTheApplicationIdAndAQuestionMark) {
  EXPECT_THAT(Ids(R"({"app":"X","modules":[{"title":"m"}]})"), ElementsAre("X", "X?"));
}

TEST_F(IndexDescriptor, ModuleIdTakesAppAndParamsAsStrings) {
  EXPECT_THAT(Ids(R"([{"app":7,"modules":[{"params":true}]},{"modules":[{"params":"p"}]}])"),
              ElementsAre("7", "7?true", "", "?p"));
}

TEST_F(IndexDescriptor, ModuleOwnerIsTheAppValueAsItStands) {
  EXPECT_EQ(Read(R"({"app":7,"modules":[{"params":"p"}]})")[1]["owner"], Json::Value(7));
}

// Device filters.

TEST_F(IndexDescriptor, EmptyEnableSkipsTheEntryAndEmptyDisableKeepsIt) {
  EXPECT_THAT(Ids(R"([{"app":"E","enable":{}},{"app":"D","disable":{}}])"), ElementsAre("D"));
}

TEST_F(IndexDescriptor, EnableForAnotherModelSkipsUnlessItListsThisPlatform) {
  EXPECT_THAT(Ids(R"([{"app":"A","enable":{"model":["M1"]}},
                      {"app":"B","enable":{"model":["M1"],"platform":["helios"]}}])"),
              ElementsAre("B"));
}

TEST_F(IndexDescriptor, DisableForThisModelOrPlatformSkipsTheEntry) {
  EXPECT_THAT(Ids(R"([{"app":"A","disable":{"model":["M420_plus"]}},
                      {"app":"B","disable":{"platform":["helios"]}},
                      {"app":"C","disable":{"model":["M1"],"platform":["selene"]}}])"),
              ElementsAre("C"));
}

TEST_F(IndexDescriptor, EnabledAndDisabledTogetherIsSkipped) {
  EXPECT_THAT(
      Ids(R"({"app":"A","enable":{"model":["M420_plus"]},"disable":{"model":["M420_plus"]}})"),
      IsEmpty());
}

TEST_F(IndexDescriptor, NullFiltersLetEverythingPass) {
  EXPECT_THAT(Ids(R"({"app":"A","enable":null,"disable":null})"), ElementsAre("A"));
}

TEST_F(IndexDescriptor, SkippedEntrysModulesAreNotExamined) {
  EXPECT_THAT(Ids(R"({"app":"A","enable":{},"modules":[
                      {"params":"p","enable":{"model":["M420_plus"]}},{"params":"q"}]})"),
              IsEmpty());
}

TEST_F(IndexDescriptor, ModulesHaveFiltersOfTheirOwn) {
  EXPECT_THAT(Ids(R"({"app":"A","modules":[
                      {"params":"1","enable":{"model":["M1"]}},
                      {"params":"2","enable":{"platform":["helios"]}},
                      {"params":"3","disable":{"platform":["helios"]}},
                      {"params":"4","disable":{}}]})"),
              ElementsAre("A", "A?2", "A?4"));
}

TEST_F(IndexDescriptor, UnreadableIdentityLeavesAsError502) {
  unlink("/etc/tovoinfo.conf");
  const Error error = test::ThrownBy([&] { Read(R"({"app":"A","enable":{"model":["M1"]}})"); });
  EXPECT_EQ(error.code, Error::kGeneralError);
  EXPECT_STREQ(error.what(), "Failed to get unique");
}

TEST_F(IndexDescriptor, MalformedIdentityLeavesAsError502FromAModulesFilter) {
  test::WriteFile("/etc/tovoinfo.conf", "unique=\"nonsense\"\n");
  const Error error = test::ThrownBy(
      [&] { Read(R"({"app":"A","modules":[{"disable":{"platform":["helios"]}}]})"); });
  EXPECT_EQ(error.code, Error::kGeneralError);
  EXPECT_STREQ(error.what(), "Malformed hb unique: nonsense");
}

TEST_F(IndexDescriptor, IdentityIsNotNeededWithoutFilters) {
  unlink("/etc/tovoinfo.conf");
  EXPECT_THAT(Ids(R"({"app":"A","enable":null,"modules":[{"params":"p","disable":{}}]})"),
              ElementsAre("A", "A?p"));
}

// Files that are no descriptor.

TEST_F(IndexDescriptor, SyntaxErrorIsLoggedAndYieldsNoRecords) {
  EXPECT_EQ(Read(R"({"app":"X")"), kNoRecords);
  EXPECT_THAT(TakeLog(), ElementsAre(MalformedLine(kConf)));
  EXPECT_EQ(errno, 0);
}

TEST_F(IndexDescriptor, SyntaxErrorAfterAStaleErrnoShowsItAndClearsIt) {
  EXPECT_EQ(Read("[", ENOENT), kNoRecords);
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(MalformedLine(kConf, " [err: No such file or directory]")));
}

TEST_F(IndexDescriptor, MissingFileIsLoggedAndYieldsNoRecords) {
  EXPECT_EQ(FindIndexables("/var/packages/Gone/index.conf"), kNoRecords);
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(MalformedLine("/var/packages/Gone/index.conf",
                                                   " [err: No such file or directory]")));
}

TEST_F(IndexDescriptor, DirectoryIsLoggedAndYieldsNoRecords) {
  test::MakeDirs(kConf);
  EXPECT_EQ(FindIndexables(kConf), kNoRecords);
  EXPECT_THAT(TakeLog(), ElementsAre(MalformedLine(kConf, " [err: Is a directory]")));
}

TEST_F(IndexDescriptor, FifoIsLoggedAndYieldsNoRecordsWithoutHanging) {
  test::MakeDirs("/var/packages/App");
  ASSERT_EQ(mkfifo(kConf, 0644), 0);
  EXPECT_EQ(FindIndexables(kConf), kNoRecords);
  EXPECT_EQ(TakeLog().size(), 1U);
}

TEST_F(IndexDescriptor, EmptyFileIsMalformed) {
  EXPECT_EQ(Read(""), kNoRecords);
  EXPECT_THAT(TakeLog(), ElementsAre(MalformedLine(kConf)));
}

TEST_F(IndexDescriptor, FarTooDeepNestingIsMalformed) {
  EXPECT_EQ(Read(std::string(100000, '[')), kNoRecords);
  EXPECT_EQ(Read(std::string(900, '[') + std::string(900, ']')), kNoRecords);
  EXPECT_THAT(TakeLog(), ElementsAre(MalformedLine(kConf), MalformedLine(kConf)));
}

TEST_F(IndexDescriptor, ScalarRootYieldsNoRecordsAndNoLine) {
  for (const char* root : {"\"text\"", "5", "true", "null"}) {
    EXPECT_EQ(Read(root), kNoRecords) << root;
  }
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(IndexDescriptor, EmptyArrayYieldsNoRecordsAndNoLine) {
  EXPECT_EQ(Read("[]"), kNoRecords);
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(IndexDescriptor, EntriesAndModulesThatAreNotObjectsGiveNoRecord) {
  EXPECT_THAT(Ids(R"(["x", 5, null, [{"app":"nested"}],
                      {"app":"A","modules":["x", 5, null, [1], {"params":"p"}]}])"),
              ElementsAre("A", "A?p"));
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(IndexDescriptor, ScalarModulesGiveNoRecord) {
  EXPECT_THAT(
      Ids(R"([{"app":"A","modules":5},{"app":"B","modules":"x"},{"app":"C","modules":null}])"),
      ElementsAre("A", "B", "C"));
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(IndexDescriptor, ModuleWhoseParamsAreNoTextIsLoggedAndLeftOut) {
  EXPECT_THAT(Ids(R"({"app":"A","modules":[{"params":["p"]},{"params":"q"}]})"),
              ElementsAre("A", "A?q"));
  EXPECT_THAT(TakeLog(), ElementsAre(MalformedLine(kConf)));
}

TEST_F(IndexDescriptor, WhatIsLoggedOfAnEntryIsLoggedAgainWhenItIsReadAgain) {
  const std::string good = R"({"app":"A"})";
  const std::string bad = R"({"app":"B","modules":[{"params":["p"]}]})";
  for (const std::string& text : {"[" + good + "," + bad + "]", "[" + bad + "," + good + "]"}) {
    test::WriteFile(kConf, text);
    errno = 0;
    Descriptor descriptor(kConf);
    EXPECT_EQ(descriptor.FindIndexables().size(), 2U);
    EXPECT_EQ(descriptor.FindIndexables().size(), 2U);
    EXPECT_THAT(TakeLog(), ElementsAre(MalformedLine(kConf), MalformedLine(kConf))) << text;
  }
}

TEST_F(IndexDescriptor, ModulesOfAnAppThatIsNoTextAreLoggedAndLeftOut) {
  const Json::Value records = Read(R"({"app":{"a":1},"modules":[{"params":"p"}]})", EACCES);
  ASSERT_EQ(records.size(), 1U);
  EXPECT_EQ(records[0]["id"], Parse(R"({"a":1})"));
  EXPECT_THAT(TakeLog(), ElementsAre(MalformedLine(kConf, " [err: Permission denied]")));
}

}  // namespace
}  // namespace velkor::appindex
