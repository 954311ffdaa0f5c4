// Finding the descriptors of all applications, and the full rebuild.
#include <dirent.h>
#include <gmock/gmock.h>
#include <json/value.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <memory>

#include "appindex/index_mgr.h"
#include "appindex/index_mgr_internal.h"
#include "system_calls.h"
#include "tests/support/controlled_time.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"

namespace velkor::appindex {
namespace {

using test::FailureLine;
using test::Install;
using test::PerLang;
using test::ReindexCommands;
using test::ScriptedDaemon;
using test::ThrownBy;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr char kModulesRoot[] = "/usr/tovo/tovoman/webman/modules/";
constexpr char kPackagesRoot[] = "/var/packages/";
const std::vector<test::Reaction> kSucceed;

class IndexDiscovery : public test::DeviceRootTest {
 protected:
  static std::string FindIn(const std::string& dir) {
    std::string conf;
    return FindIndexConfByAppRoot(conf, dir, 0) ? conf : "none";
  }
};

std::string FailedOpen(int line, const std::string& function, const std::string& condition,
                       const std::string& dir, const std::string& ending) {
  return FailureLine("index_mgr", line, function,
                     "Failed [" + condition + "], reason: opendir failed, path=" + dir + ending);
}
std::string FailedAppDir(const std::string& dir, const std::string& ending) {
  return FailedOpen(100, "FindIndexConfByAppRoot", "nullptr == (dir = opendir(find_dir.c_str()))",
                    dir, ending);
}
std::string FailedRoot(const std::string& dir, const std::string& ending) {
  return FailedOpen(130, "FindIndexConf", "nullptr == (dir = opendir(root.c_str()))", dir, ending);
}

TEST_F(IndexDiscovery, FindsADescriptorInTheApplicationDirectory) {
  test::WriteFile("/app/index.conf", "");
  EXPECT_EQ(FindIn("/app/"), "/app/index.conf");
}

TEST_F(IndexDiscovery, FindsADescriptorFiveLevelsDownAndNoneDeeper) {
  test::WriteFile("/five/a/b/c/d/e/index.conf", "");
  test::WriteFile("/six/a/b/c/d/e/f/index.conf", "");
  EXPECT_EQ(FindIn("/five/"), "/five/a/b/c/d/e/index.conf");
  EXPECT_EQ(FindIn("/six/"), "none");
}

TEST_F(IndexDiscovery, GivesNoneForADirectoryWithoutDescriptor) {
  test::WriteFile("/app/ui/index.conf.bak", "");
  test::WriteFile("/app/ui/Index.conf", "");
  EXPECT_EQ(FindIn("/app/"), "none");
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(IndexDiscovery, DoesNotExamineTheTypeOfADescriptor) {
  test::MakeDirs("/app/ui/index.conf");
  EXPECT_EQ(FindIn("/app/"), "/app/ui/index.conf");
  EXPECT_EQ(symlink("/nowhere", "/app/index.conf"), 0);
  unlink("/app/ui/index.conf");
  std::filesystem::remove_all("/app/ui");
  EXPECT_EQ(FindIn("/app/"), "/app/index.conf");
}

TEST_F(IndexDiscovery, FollowsALinkToADirectoryWithAnAbsoluteTarget) {
  test::WriteFile("/volume1/App/ui/index.conf", "");
  test::MakeDirs("/app");
  EXPECT_EQ(symlink("/volume1/App", "/app/target"), 0);
  EXPECT_EQ(FindIn("/app/"), "/app/target/ui/index.conf");
}

TEST_F(IndexDiscovery, TakesTheFirstSubdirectoryInDirectoryOrder) {
  for (const char* name : {"p", "b", "y", "a", "m"}) {
    test::WriteFile(std::string("/app/") + name + "/index.conf", "");
  }
  const std::unique_ptr<DIR, int (*)(DIR*)> dir(opendir("/app"), closedir);
  std::string first;
  while (first.empty() || first[0] == '.') first = readdir(dir.get())->d_name;
  EXPECT_EQ(FindIn("/app/"), "/app/" + first + "/index.conf");
}

TEST_F(IndexDiscovery, MissingDirectoryIsLoggedAndThrown502) {
  const Error error = ThrownBy([] { FindIn("/gone/"); });
  EXPECT_EQ(error.code, Error::kGeneralError);
  EXPECT_STREQ(error.what(), "opendir failed, path=/gone/");
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(FailedAppDir("/gone/", " [err: No such file or directory]")));
}

TEST_F(IndexDiscovery, UnopenableDirectoryIsLoggedPlainWhenErrnoIsClear) {
  test::Calls().opendir.fails_for = "/app/";
  test::MakeDirs("/app");
  errno = 0;
  EXPECT_STREQ(ThrownBy([] { FindIn("/app/"); }).what(), "opendir failed, path=/app/");
  EXPECT_THAT(TakeLog(), ElementsAre(FailedAppDir("/app/", "")));
}

TEST_F(IndexDiscovery, DirectoryBelowThatCannotBeOpenedEndsTheSearch) {
  test::MakeDirs("/app/ui");
  test::Calls().opendir = {{}, "/app/ui/", EACCES};
  const Error error = ThrownBy([] { FindIn("/app/"); });
  EXPECT_EQ(error.code, Error::kGeneralError);
  EXPECT_STREQ(error.what(), "opendir failed, path=/app/ui/");
  EXPECT_THAT(TakeLog(), ElementsAre(FailedAppDir("/app/ui/", " [err: Permission denied]")));
}

TEST_F(IndexDiscovery, RelativeLinkIsTestedFromTheCurrentDirectoryAndOpenedWhereItStands) {
  test::MakeDirs("/app");
  test::MakeDirs("/elsewhere");
  ASSERT_EQ(symlink("elsewhere", "/app/link"), 0);
  EXPECT_STREQ(ThrownBy([] { FindIn("/app/"); }).what(), "opendir failed, path=/app/link/");
}

TEST_F(IndexDiscovery, WalksBothRootsAndTakesOneDescriptorOfEachApplication) {
  test::WriteFile(std::string(kModulesRoot) + "Files/index.conf", "");
  test::WriteFile("/var/packages/App/a/index.conf", "");
  test::WriteFile("/var/packages/App/index.conf", "");
  test::WriteFile("/var/packages/Empty/readme", "");
  const std::set<std::string> found = FindIndexConf();
  EXPECT_EQ(found.size(), 2U);
  EXPECT_EQ(*found.begin(), std::string(kModulesRoot) + "Files/index.conf");
  EXPECT_THAT(*found.rbegin(),
              ::testing::AnyOf("/var/packages/App/a/index.conf", "/var/packages/App/index.conf"));
}

TEST_F(IndexDiscovery, DocuvaultIsNeverAnApplication) {
  test::WriteFile("/var/packages/Docuvault/index.conf", R"({"app":"D"})");
  test::WriteFile(std::string(kModulesRoot) + "Docuvault/index.conf", R"({"app":"D"})");
  EXPECT_THAT(FindIndexConf(), IsEmpty());
}

TEST_F(IndexDiscovery, PlainFileUnderARootIsSkipped) {
  test::WriteFile("/var/packages/index.conf", R"({"app":"D"})");
  test::WriteFile("/var/packages/file", "");
  EXPECT_THAT(FindIndexConf(), IsEmpty());
}

TEST_F(IndexDiscovery, LinkedApplicationDirectoryIsAnApplication) {
  test::WriteFile("/volume1/App/index.conf", "");
  EXPECT_EQ(symlink("/volume1/App", "/var/packages/App"), 0);
  EXPECT_THAT(FindIndexConf(), ElementsAre("/var/packages/App/index.conf"));
}

TEST_F(IndexDiscovery, LinksThatLeadToThemselvesEndInNothing) {
  test::MakeDirs("/var/packages/App");
  EXPECT_EQ(symlink("/var/packages/Loop", "/var/packages/Loop"), 0);
  EXPECT_EQ(symlink("/var/packages/App/loop", "/var/packages/App/loop"), 0);
  EXPECT_EQ(symlink("/var/packages/App", "/var/packages/App/up"), 0);
  EXPECT_THAT(FindIndexConf(), IsEmpty());
}

TEST_F(IndexDiscovery, MissingRootIsLoggedAndThrown502) {
  rmdir(kModulesRoot);
  const Error error = ThrownBy([] { FindIndexConf(); });
  EXPECT_EQ(error.code, Error::kGeneralError);
  EXPECT_EQ(error.reason, std::string("opendir failed, path=") + kModulesRoot);
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(),
              ElementsAre(FailedRoot(kModulesRoot, " [err: No such file or directory]")));
}

TEST_F(IndexDiscovery, UnopenableRootIsLoggedPlainWhenErrnoIsClear) {
  test::Calls().opendir.fails_for = kModulesRoot;
  errno = 0;
  EXPECT_EQ(ThrownBy([] { FindIndexConf(); }).reason,
            std::string("opendir failed, path=") + kModulesRoot);
  EXPECT_THAT(TakeLog(), ElementsAre(FailedRoot(kModulesRoot, "")));
}

TEST_F(IndexDiscovery, RootThatIsNoDirectoryIsLoggedAndThrown502) {
  std::filesystem::remove_all(kPackagesRoot);
  test::WriteFile("/var/packages", "");
  EXPECT_STREQ(ThrownBy([] { FindIndexConf(); }).what(), "opendir failed, path=/var/packages/");
  EXPECT_THAT(TakeLog(), ElementsAre(FailedRoot(kPackagesRoot, " [err: Not a directory]")));
}

class IndexReindex : public test::DeviceRootTest {
 protected:
  static std::string RecordedVersion() {
    return test::Parse(test::ReadFile(test::kRecord))["indexed_version"].asString();
  }
  static void RecordVersion(const std::string& version) {
    test::WriteFile(test::kRecord, R"({"indexed_version":")" + version + R"("})");
  }

  // Rebuilds while the daemon fails every request with `command` with code 605, and checks that
  // this ends the rebuild there with the record as it was.
  void ExpectEndsAt(const std::string& command, const std::vector<std::string>& commands) {
    Install("App");
    RecordVersion("old");
    ScriptedDaemon daemon([command](const Json::Value& request) {
      return request["command"] == command ? test::Failure(605, "disk") : test::Success();
    });
    const Error error = ThrownBy([] { Reindex(); });
    EXPECT_EQ(error.code, 605);
    EXPECT_STREQ(error.what(), "Request failed, msg=disk");
    EXPECT_EQ(daemon.Commands(), commands);
    EXPECT_EQ(RecordedVersion(), "old");
  }
};

TEST_F(IndexReindex, EmptyRootsGiveEmptyIndexesCommittedAndTheVersionSaved) {
  ScriptedDaemon daemon(kSucceed);
  Reindex();
  EXPECT_EQ(daemon.Commands(), ReindexCommands({}));
  EXPECT_EQ(test::Parse(test::ReadFile(test::kRecord)),
            test::Parse(std::string(R"({"indexed_version":")") + test::kVersion + R"("})"));
  EXPECT_EQ(test::ModeOf(test::kRecord), 0600U);
  EXPECT_THAT(TakeLog(), ElementsAre("index_mgr:290 Reindex app"));
}

TEST_F(IndexReindex, AddsEveryDescriptorInByteOrderWithoutCommitsBetween) {
  Install("b");
  Install("a");
  Install("B");
  test::WriteFile(std::string(kModulesRoot) + "z/index.conf", R"({"app":"z"})");
  ScriptedDaemon daemon(kSucceed);
  Reindex();
  EXPECT_EQ(daemon.Commands(), ReindexCommands({"z", "B", "a", "b"}));
  EXPECT_THAT(TakeLog(),
              ElementsAre("index_mgr:290 Reindex app",
                          std::string("index_mgr:190 Add: ") + kModulesRoot + "z/index.conf",
                          "index_mgr:190 Add: " + test::ConfOf("B"),
                          "index_mgr:190 Add: " + test::ConfOf("a"),
                          "index_mgr:190 Add: " + test::ConfOf("b")));
}

TEST_F(IndexReindex, CreatesEachIndexWithItsPathAndMappings) {
  ScriptedDaemon daemon(kSucceed);
  Reindex();
  const Json::Value create = daemon.Requests()[1]["data"];
  EXPECT_EQ(create["path"], std::string(test::kDatabase) + "chs");
  EXPECT_EQ(create["settings"], Json::Value(Json::objectValue));
  EXPECT_EQ(create["mappings"]["property_id"], "id");
}

TEST_F(IndexReindex, MakesTheDatabaseDirectoryWithMode0700) {
  ScriptedDaemon daemon(kSucceed);
  Reindex();
  EXPECT_EQ(test::ModeOf(test::kDatabase), 0700U);
}

TEST_F(IndexReindex, LeavesAnExistingDatabaseDirectoryAsItIs) {
  test::WriteFile(std::string(test::kDatabase) + "chs/data", "kept");
  ScriptedDaemon daemon(kSucceed);
  Reindex();
  EXPECT_EQ(test::ReadFile(std::string(test::kDatabase) + "chs/data"), "kept");
}

TEST_F(IndexReindex, FailingMkdirIsIgnored) {
  test::WriteFile("/var/packages/Velkor/etc/appindex.db", "in the way");
  ScriptedDaemon daemon(kSucceed);
  Reindex();
  EXPECT_EQ(daemon.Commands(), ReindexCommands({}));
  EXPECT_EQ(RecordedVersion(), test::kVersion);
}

TEST_F(IndexReindex, ApplicationWithoutADescriptorIsSilentlyNotIndexed) {
  test::WriteFile("/var/packages/App/a/b/c/d/e/f/index.conf", R"({"app":"X"})");
  ScriptedDaemon daemon(kSucceed);
  Reindex();
  EXPECT_EQ(daemon.Commands(), ReindexCommands({}));
  EXPECT_THAT(TakeLog(), ElementsAre("index_mgr:290 Reindex app"));
}

TEST_F(IndexReindex, MissingIndexAtTheDeletionIsIgnored) {
  ScriptedDaemon daemon([](const Json::Value& request) {
    return request["command"] == "index_delete" ? test::Failure(601, "none") : test::Success();
  });
  Reindex();
  EXPECT_EQ(daemon.Commands(), ReindexCommands({}));
  EXPECT_EQ(RecordedVersion(), test::kVersion);
}

TEST_F(IndexReindex, OtherFailureOfADeletionEndsItBeforeTheCreation) {
  ExpectEndsAt("index_delete", {"index_delete appindex_chs"});
}

TEST_F(IndexReindex, FailureOfACreationEndsIt) {
  ExpectEndsAt("index_create", {"index_delete appindex_chs", "index_create appindex_chs"});
}

TEST_F(IndexReindex, FailureOfAnAddEndsIt) {
  auto commands = PerLang({"index_delete appindex_LANG", "index_create appindex_LANG"});
  commands.emplace_back("document_upsert_by_id appindex_chs App");
  ExpectEndsAt("document_upsert_by_id", commands);
}

TEST_F(IndexReindex, FailureOfACommitEndsIt) {
  auto commands = PerLang({"index_delete appindex_LANG", "index_create appindex_LANG"});
  for (const auto& upsert : PerLang({"document_upsert_by_id appindex_LANG App"})) {
    commands.push_back(upsert);
  }
  commands.emplace_back("commit appindex_chs");
  ExpectEndsAt("commit", commands);
}

TEST_F(IndexReindex, UnopenableRootLeavesTheIndexUntouched) {
  std::filesystem::remove_all(kModulesRoot);
  ScriptedDaemon daemon(kSucceed);
  const Error error = ThrownBy([] { Reindex(); });
  EXPECT_EQ(error.code, Error::kGeneralError);
  EXPECT_EQ(error.reason, std::string("opendir failed, path=") + kModulesRoot);
  EXPECT_EQ(daemon.Connections(), 0);
}

TEST_F(IndexReindex, UnopenableApplicationDirectoryLeavesTheIndexUntouched) {
  Install("App");
  test::Calls().opendir = {{}, "/var/packages/App/target/", EACCES};
  ScriptedDaemon daemon(kSucceed);
  const Error error = ThrownBy([] { Reindex(); });
  EXPECT_EQ(error.code, Error::kGeneralError);
  EXPECT_STREQ(error.what(), "opendir failed, path=/var/packages/App/target/");
  EXPECT_EQ(daemon.Connections(), 0);
}

TEST_F(IndexReindex, BrokenRecordEndsItBeforeTheNoticeAndTheDaemon) {
  test::WriteFile(test::kRecord, "{");
  ScriptedDaemon daemon(kSucceed);
  EXPECT_EQ(ThrownBy([] { Reindex(); }).code, Error::kConfigLoadError);
  EXPECT_EQ(daemon.Connections(), 0);
  EXPECT_THAT(TakeLog(), ::testing::Not(::testing::Contains("index_mgr:290 Reindex app")));
}

TEST_F(IndexReindex, UnknownSystemVersionLeavesTheRecordAsItWas) {
  RecordVersion("old");
  unlink("/etc/os-release");
  ScriptedDaemon daemon(kSucceed);
  const Error error = ThrownBy([] { Reindex(); });
  EXPECT_EQ(error.code, Error::kGeneralError);
  EXPECT_STREQ(error.what(), "TLIBHbinfoUserAgentGet failed");
  EXPECT_EQ(daemon.Commands(), ReindexCommands({}));
  EXPECT_EQ(RecordedVersion(), "old");
}

TEST_F(IndexReindex, TakesNoLock) {
  ScriptedDaemon daemon(kSucceed);
  const LockFile lock(test::kProcessLock, true);
  Reindex();
  EXPECT_EQ(daemon.Commands(), ReindexCommands({}));
  EXPECT_THAT(test::Time().usleeps, IsEmpty());
}

}  // namespace
}  // namespace velkor::appindex
