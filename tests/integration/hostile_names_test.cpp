// The shipped library and the names of packages, directories and requests, whatever they hold.
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <string>
#include <vector>

#include "appindex/elastic_control.h"
#include "appindex/index_mgr.h"
#include "appindex/utilities/json_helpers.h"
#include "tests/integration/hostile_scale.h"
#include "tests/integration/real_device.h"
#include "tests/support/controlled_time.h"
#include "tests/support/scripted_daemon.h"
#include "tests/unit/appindex/error_of.h"

namespace velkor::appindex {
namespace {

using test::ConfOf;
using test::ErrorOf;
using test::ReindexCommands;
using test::ScriptedDaemon;
using ::testing::IsEmpty;
using ::testing::StartsWith;

class HostileNames : public test::DeviceRootTest {};

// In byte order.
const std::vector<std::string>& Names() {
  static const std::vector<std::string> names = {
      "\x01",  "\t",  "\n",       "\nAdd: forged", "\x1B[2J", " ",   "\"quoted\"", "%s%n",
      "*",     "-rf", "...",      "Docuvault ",    "\\",      "\\n", "a\nb",       "index.conf",
      "texts", "~",   "\xC2\x9B", "\xED\xA0\x80",  "\xFF\xFE"};
  return names;
}

TEST_F(HostileNames, OfPackagesAreNamesLikeOthers) {
  std::vector<std::string> ids;
  for (const std::string& name : Names()) {
    ids.push_back("id" + std::to_string(ids.size()));
    test::WriteFile(ConfOf(name), R"({"app":")" + ids.back() + R"(","title":"app:title"})");
    test::WriteFile("/var/packages/" + name + "/target/ui/texts/enu/strings",
                    "[app]\ntitle=\"Title of " + ids.back() + "\"\n");
  }
  ScriptedDaemon daemon;
  Reindex();
  EXPECT_EQ(daemon.Commands(), ReindexCommands(ids));
  for (const Json::Value& request : daemon.Requests()) {
    if (request["command"] != "document_upsert_by_id") continue;
    const Json::Value& document = request["data"]["data"];
    EXPECT_EQ(document["title"].asString(), "Title of " + document["id"].asString());
  }
}

TEST_F(HostileNames, OfPackagesStandInRequestsAsJsonTexts) {
  const std::string name = "a\n\"b\"\t\x1B";
  test::WriteFile(ConfOf(name), R"({"app":"Odd"})");
  Json::Value request;
  request["op"] = 1;
  request["path"] = ConfOf(name);
  test::Enqueue(toString(request));
  test::Enqueue(R"({"op":1,"path":")" + ConfOf(name) + R"("})");  // raw: two lines that are no JSON
  ScriptedDaemon daemon;
  ProcessQueue();
  EXPECT_EQ(daemon.Commands(), test::AddCommands("Odd"));
}

TEST_F(HostileNames, OfLongPathsAndDeepDirectoriesEndInNothing) {
  std::string deep = "/var/packages/Deep";
  for (int i = 0; i < 8; ++i) deep += "/" + std::string(255, 'd');
  test::WriteFile(deep + "/index.conf", R"({"app":"Deep"})");
  test::WriteFile("/var/packages/" + std::string(255, 'n') + "/index.conf", R"({"app":"Long"})");
  ScriptedDaemon daemon;
  Reindex();
  EXPECT_EQ(daemon.Commands(), ReindexCommands({"Long"}));
  const std::string beyond = "/var/packages/" + std::string(5000, 'b') + "/index.conf";
  Add(beyond, false);
  Del(std::string(1, '\0') + "/index.conf", false);
  EXPECT_EQ(daemon.Commands(), ReindexCommands({"Long"}));
}

// A path that holds a NUL is another one to the system.
TEST_F(HostileNames, WithANulMeanNoFile) {
  test::WriteFile("/etc/other", R"({"app":"Other"})");
  test::WriteFile("/var/packages/App/texts/enu/strings", "[a]\nt=\"Found\"\n");
  ScriptedDaemon daemon;
  Add(std::string("/etc/other\0/index.conf", 22), false);
  EXPECT_THAT(daemon.Commands(), IsEmpty());
  test::WriteFile("/var/packages/App/index.conf",
                  R"({"app":"App","title":"a:t","stringset":"texts/enu/strings\u0000"})");
  Add("/var/packages/App/index.conf", false);
  EXPECT_EQ(daemon.Requests()[0]["data"]["data"]["title"].asString(), "a:t");
}

TEST_F(HostileNames, ManyEntriesOfADirectoryAreAllLookedAt) {
  const int count = test::Scaled(500, 100'000);
  test::MakeDirs("/var/packages/Full/z");
  for (int i = 0; i < count; ++i) {
    test::WriteFile("/var/packages/Full/" + std::to_string(i), "");
  }
  for (int i = 0; i < count; ++i) mkdir(("/var/packages/p" + std::to_string(i)).c_str(), 0755);
  test::WriteFile("/var/packages/Full/z/index.conf", R"({"app":"Full","title":"a:t"})");
  ScriptedDaemon daemon;
  Reindex();
  EXPECT_EQ(daemon.Commands(), ReindexCommands({"Full"}));
}

// The way through them all has as many branches as links, six levels down.
TEST_F(HostileNames, LinksThatLeadRoundAndRoundAreNotFollowedForEver) {
  test::Install("Good");
  test::MakeDirs("/var/packages/Evil/dir");
  for (int i = 0; i < 200; ++i) {
    const std::string number = std::to_string(i);
    ASSERT_EQ(symlink("/var/packages/Evil", ("/var/packages/Evil/l" + number).c_str()), 0);
    ASSERT_EQ(symlink("/var/packages/Evil/dir", ("/var/packages/Evil/dir/l" + number).c_str()), 0);
  }
  ScriptedDaemon daemon;
  Reindex();
  EXPECT_EQ(daemon.Commands(), ReindexCommands({"Good"}));
  test::WriteFile("/var/packages/Worse/index.conf", R"({"app":"Worse","title":"a:t"})");
  ASSERT_EQ(symlink("/var/packages/Evil", "/var/packages/Worse/link"), 0);
  Add("/var/packages/Worse/index.conf", false);  // looks for texts in there
  EXPECT_EQ(daemon.Requests().back()["data"]["data"]["title"].asString(), "a:t");
}

// ".." in every string that becomes a path.

// All that is below `dir`, with sizes and times, for comparing.
std::vector<std::string> Inventory(const std::string& dir) {
  namespace fs = std::filesystem;
  std::vector<std::string> all;
  for (const auto& entry : fs::recursive_directory_iterator(dir)) {
    struct stat status {};
    lstat(entry.path().c_str(), &status);
    const bool is_file = S_ISREG(status.st_mode);
    all.push_back(entry.path().string() + " " + std::to_string(status.st_mode) + " " +
                  std::to_string(status.st_uid) + " " +
                  (is_file ? test::ReadFile(entry.path()) : ""));
  }
  std::sort(all.begin(), all.end());
  return all;
}

class DotDot : public test::RealDeviceTest {
 protected:
  DotDot() {
    Reindex();
    test::WriteFile("/etc/evil/index.conf", R"({"app":"../../../etc/evil","title":"x:y",
        "stringset":"../../etc/evil/strs","modules":[{"params":"/../../etc/evil"}]})");
    test::WriteFile("/etc/evil/strs/enu/strings", "[x]\ny=\"outside\"\n");
    outside_ = Inventory("/etc");
  }

  void ExpectNothingOutsideChanged() { EXPECT_EQ(Inventory("/etc"), outside_); }

  static std::vector<std::string> FoundOutside() { return Found("enu", "outside"); }

  std::vector<std::string> outside_;
};

// Read from wherever they lie, as their writers may ask for; written are documents alone.
TEST_F(DotDot, InTheParametersOfAddAndDelIsReadOnly) {
  const std::string path = "/var/packages/../../etc/evil/index.conf";
  Add(path, true);
  EXPECT_THAT(FoundOutside(), testing::ElementsAre("../../../etc/evil"));
  Del(path, true);
  EXPECT_THAT(FoundOutside(), IsEmpty());
  ExpectNothingOutsideChanged();
}

TEST_F(DotDot, InARequestOfTheQueueIsReadOnly) {
  test::Enqueue(test::Request(1, "/var/packages/../../etc/evil/index.conf"));
  test::Enqueue(test::Request(1, "/var/packages/Velkor/etc/../../../../../../etc/passwd"));
  test::Enqueue(test::Request(2, "../../../etc/evil/index.conf"));
  ProcessQueue();
  EXPECT_FALSE(test::Exists(test::kBatch));
  ExpectNothingOutsideChanged();
}

TEST_F(DotDot, InAStringsetIsReadOnly) {
  test::WriteFile("/var/packages/Evil/index.conf", R"({"app":"Evil","title":"x:y",
      "stringset":"../../../etc/evil/strs"})");
  Add("/var/packages/Evil/index.conf", true);
  EXPECT_THAT(FoundOutside(), testing::ElementsAre("Evil"));
  ExpectNothingOutsideChanged();
}

// They name texts and documents, never files.
TEST_F(DotDot, InReferencesAndIdsNamesNoFile) {
  test::WriteFile("/var/packages/Evil/index.conf", R"({"app":"../evil","title":"../evil:../x",
      "desc":"..:..","keywords":["../enu:y",{"text":"../../strs:y"}],
      "modules":[{"params":"../../../../etc/evil","title":"/etc/passwd"}]})");
  test::WriteFile("/var/packages/Evil/texts/enu/strings", "[../evil]\n../x=\"dotted\"\n");
  Add("/var/packages/Evil/index.conf", true);
  EXPECT_THAT(Found("enu", "dotted"), testing::ElementsAre("../evil"));
  Del("/var/packages/Evil/index.conf", true);
  EXPECT_THAT(Found("enu", "dotted"), IsEmpty());
  ExpectNothingOutsideChanged();
}

TEST_F(DotDot, InALanguageIsRefusedByTheDaemonAndMakesNoDirectory) {
  for (const std::string lang :
       {"../../../../../etc/evil/db", "..", "../enu", "enu/../../x", "."}) {
    EXPECT_THAT(ErrorOf([&] { elastic::AppIndexCreate(lang); }),
                testing::AnyOf(StartsWith("603: "), StartsWith("606: ")))
        << lang;
    EXPECT_THAT(ErrorOf([&] { elastic::AppIndexDelete(lang); }), StartsWith("601: "));
    EXPECT_THAT(ErrorOf([&] { elastic::IndexCommit(lang); }), StartsWith("601: "));
  }
  ExpectNothingOutsideChanged();
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Photos"}));
}

TEST_F(DotDot, InADocumentsIdNamesNoFile) {
  for (const std::string id : {"../../../../../etc/evil/x", "..", "/etc/passwd"}) {
    Json::Value document;
    document["id"] = id;
    document["title"] = "dotted";
    elastic::IndexUpsert("enu", document);
    elastic::IndexCommit("enu");
    EXPECT_THAT(Found("enu", "dotted"), testing::ElementsAre(id));
    elastic::IndexDelete("enu", id);
    elastic::IndexCommit("enu");
  }
  EXPECT_THAT(Found("enu", "dotted"), IsEmpty());
  ExpectNothingOutsideChanged();
}

TEST_F(DotDot, InTheDaemonsPathsAndIdsIsRefusedOrNamesNoFile) {
  const Json::Value mappings = test::Parse(R"({"property_id":"id"})");
  for (const std::string path :
       {"/var/packages/../../etc/evil/db", "/var/packages/x/../../../etc/evil/db", "/etc/evil/db",
        "/var/packages/..", "/var/packages/.", "/var/packages/", "/var/packages", "../etc/evil/db",
        "/var/packages//etc/evil", "/var/packages/a/./b", "/var/packages//", "", "/",
        "/../var/packages/x", "/var/packages/../packages/x"}) {
    Json::Value data;
    data["id"] = "evil";
    data["path"] = path;
    data["mappings"] = mappings;
    const Json::Value reply = test::RealDaemon::Ask("index_create", data);
    EXPECT_FALSE(reply["success"].asBool()) << path;
    const int code = reply["error"]["code"].asInt();
    EXPECT_TRUE(code == 603 || code == 606) << path << " " << code;
  }
  for (const std::string id : {"../../etc/evil_../../etc", "..", "/etc/evil"}) {
    Json::Value data;
    data["id"] = id;
    data["path"] = "/var/packages/Velkor/etc/other";
    data["mappings"] = mappings;
    EXPECT_TRUE(test::RealDaemon::Ask("index_create", data)["success"].asBool()) << id;
    EXPECT_TRUE(test::RealDaemon::Ask("commit", data)["success"].asBool());
    EXPECT_TRUE(test::RealDaemon::Ask("index_delete", data)["success"].asBool());
  }
  ExpectNothingOutsideChanged();
}

TEST_F(DotDot, InTheDaemonsRegistryIsNotFollowed) {
  daemon_.Stop();
  test::WriteFile("/var/lib/tovoelasticd/indexes.json",
                  R"({"format":1,"indexes":[{"id":"evil","path":"/var/packages/../../etc/evil",)"
                  R"("mappings":{"property_id":"id"}}]})");
  daemon_.Start();
  Json::Value data;
  data["id"] = "evil";
  EXPECT_FALSE(test::RealDaemon::Ask("commit", data)["success"].asBool());
  test::RealDaemon::Ask("index_delete", data);
  ExpectNothingOutsideChanged();
}

// What a package's name can lead to: a link, which the search follows and nothing else.
TEST_F(DotDot, InTheTargetOfALinkIsReadOnly) {
  ASSERT_EQ(symlink("../../etc/evil", "/var/packages/Relative"), 0);
  test::MakeDirs("/var/packages/Package");
  ASSERT_EQ(symlink("/var/packages/../../etc/evil", "/var/packages/Package/target"), 0);
  Reindex();
  EXPECT_THAT(FoundOutside(), testing::Contains("../../../etc/evil"));
  ExpectNothingOutsideChanged();
}

}  // namespace
}  // namespace velkor::appindex
