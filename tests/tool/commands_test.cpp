// The commands of appindex: what they do, write and end with.
#include <gmock/gmock.h>

#include "tests/integration/real_device.h"
#include "tests/support/scripted_daemon.h"
#include "tests/tool/tool_process.h"

namespace test {
namespace {

using ::testing::AllOf;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::StartsWith;

class Commands : public RealDeviceTest {
 protected:
  Finished Run(const std::vector<std::string>& arguments,
               const Environment& environment = {}) const {
    return RunTool({OutsideRootFd(), OutsidePath()}, arguments, environment);
  }

  // What it writes with --json.
  Json::Value Data(std::vector<std::string> arguments) const {
    arguments.insert(arguments.begin(), "--json");
    return Parse(Run(arguments).out);
  }

  // The failure that it ends with, which is one line.
  std::string Failure(const std::vector<std::string>& arguments, int status) const {
    const Finished finished = Run(arguments);
    EXPECT_EQ(finished.status, status) << finished.err;
    EXPECT_EQ(finished.out, "");
    EXPECT_EQ(std::count(finished.err.begin(), finished.err.end(), '\n'), 1) << finished.err;
    return finished.err;
  }
};

// Changing the index.

TEST_F(Commands, ReindexBuildsEverything) {
  const Json::Value data = Data({"reindex"});
  EXPECT_EQ(data["documents"].asInt(), 84);
  EXPECT_TRUE(data["milliseconds"].isIntegral());
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Photos"}));
}

TEST_F(Commands, DelAndAddTakeDescriptorsAndDirectories) {
  ASSERT_EQ(Run({"reindex"}).status, 0);
  const Json::Value deleted = Data({"del", "/var/packages/Photos", kFilesConf});
  EXPECT_EQ(deleted["descriptors"][0]["path"].asString(), ConfOf("Photos"));
  EXPECT_EQ(deleted["descriptors"][0]["documents"].asInt(), 21);
  EXPECT_EQ(deleted["descriptors"][1]["documents"].asInt(), 42);
  EXPECT_EQ(Everything(), Exactly({"Backup"}));
  EXPECT_EQ(Run({"add", "var/packages/../packages/Photos/"}).status, 0);
  EXPECT_EQ(Everything(), Exactly({"Backup", "Photos"}));
}

TEST_F(Commands, RequestsAreQueuedAndCarriedOut) {
  ASSERT_EQ(Run({"reindex"}).status, 0);
  const Json::Value queued = Data({"enqueue", "del", "/var/packages/Photos"});
  EXPECT_EQ(queued["requests"][0]["op"].asInt(), 2);
  EXPECT_EQ(queued["requests"][0]["path"].asString(), ConfOf("Photos"));
  const Json::Value done = Data({"process-queue"});
  EXPECT_EQ(done["requests"].asInt(), 1);
  EXPECT_EQ(done["documents"].asInt(), 21);
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash"}));
}

TEST_F(Commands, EmptyQueueIsNoFailure) {
  const Finished finished = Run({"process-queue"});
  EXPECT_EQ(finished.status, 0);
  EXPECT_EQ(finished.err, "Nothing was queued\n");
}

TEST_F(Commands, EnqueueWritesTheLinesThatTheQueueTakes) {
  ASSERT_EQ(Run({"enqueue", "reindex"}).status, 0);
  ASSERT_EQ(Run({"enqueue", "add", "/var/packages/Photos", "/var/packages/Backup"}).status, 0);
  EXPECT_EQ(ReadFile(kQueue), "{\"op\":3}\n" + Request(1, ConfOf("Photos")) + "\n" +
                                  Request(1, ConfOf("Backup")) + "\n");
}

// Failures: file, cause, what to do.

TEST_F(Commands, UnreachableDaemonEndsWith4) {
  daemon_.Stop();
  EXPECT_THAT(Failure({"search", "photo"}, 4),
              AllOf(HasSubstr(kSocket), HasSubstr("start tovoelasticd"), EndsWith("(code 913)\n")));
  ASSERT_EQ(Run({"-q", "enqueue", "reindex"}).status, 0);
  EXPECT_THAT(Failure({"process-queue"}, 4),
              AllOf(HasSubstr("the requests stay queued"), EndsWith("(code 913)\n")));
  EXPECT_TRUE(Exists(kQueue));
}

TEST_F(Commands, WrongPathsAreNamed) {
  MakeDirs("/var/packages/Empty/ui");
  WriteFile("/var/packages/Photos/index.txt", "{}");
  WriteFile("/etc/index.conf", "{}");
  EXPECT_THAT(Failure({"add", "/var/packages/Gone/index.conf"}, 1), HasSubstr("No such file"));
  EXPECT_THAT(Failure({"add", "/var/packages/Empty"}, 1),
              AllOf(HasSubstr("/var/packages/Empty: "), HasSubstr("no index.conf")));
  EXPECT_THAT(Failure({"del", "/var/packages/Photos/index.txt"}, 1),
              HasSubstr("a descriptor is named index.conf"));
  EXPECT_THAT(Failure({"enqueue", "add", "/etc/index.conf"}, 1),
              HasSubstr("where applications are"));
  EXPECT_FALSE(Exists(kQueue));
}

TEST_F(Commands, DescriptorThatIsNotJsonIsNamed) {
  WriteFile(ConfOf("Broken"), "{,}");
  EXPECT_THAT(Failure({"add", ConfOf("Broken")}, 1),
              AllOf(HasSubstr(ConfOf("Broken")), HasSubstr("not strict JSON")));
}

TEST_F(Commands, RequestThatHoldsUpTheQueueIsNamed) {
  ASSERT_EQ(Run({"reindex"}).status, 0);
  WriteFile(ConfOf("Broken"), R"({"app":["no text"],"title":"Broken"})");
  ASSERT_EQ(Run({"-q", "enqueue", "add", "/var/packages/Backup", ConfOf("Broken")}).status, 0);
  EXPECT_THAT(Failure({"process-queue"}, 1),
              AllOf(StartsWith("appindex: " + ConfOf("Broken")), HasSubstr("holds up"),
                    EndsWith("(code 120)\n")));
}

TEST_F(Commands, QueuedRebuildNamesTheDescriptorThatHoldsItUp) {
  WriteFile(ConfOf("Broken"), R"({"app":["no text"],"title":"Broken"})");
  ASSERT_EQ(Run({"-q", "enqueue", "reindex"}).status, 0);
  EXPECT_THAT(Failure({"process-queue"}, 1),
              AllOf(StartsWith("appindex: " + ConfOf("Broken") + ": "), HasSubstr("holds up"),
                    EndsWith("(code 120)\n")));
}

TEST_F(Commands, RequestIsNamedThatHoldsUpTheQueueWithoutACode) {
  ASSERT_EQ(Run({"reindex"}).status, 0);
  WriteFile(ConfOf("Broken"), R"({"app":"Broken","title":[]})");
  ASSERT_EQ(Run({"-q", "enqueue", "add", ConfOf("Broken")}).status, 0);
  EXPECT_THAT(Failure({"process-queue"}, 1),
              AllOf(StartsWith("appindex: " + ConfOf("Broken") + ": a value stands where"),
                    EndsWith("holds up the whole batch\n")));
}

TEST_F(Commands, RequestIsNamedThatTheDevicesNameHoldsUp) {
  ASSERT_EQ(Run({"reindex"}).status, 0);
  WriteFile("/etc/tovoinfo.conf", "");
  WriteFile(ConfOf("Some"), R"({"app":"Some","title":"t","enable":{"model":["M1"]}})");
  ASSERT_EQ(Run({"-q", "enqueue", "add", ConfOf("Some")}).status, 0);
  EXPECT_THAT(Failure({"process-queue"}, 1),
              AllOf(StartsWith("appindex: " + ConfOf("Some") + ": /etc/tovoinfo.conf: "),
                    EndsWith("(code 502)\n")));
}

TEST_F(Commands, QueueThatCannotBeMovedAsideIsNamedAndKept) {
  MakeDirs(kBatch);
  ASSERT_EQ(Run({"-q", "enqueue", "reindex"}).status, 0);
  EXPECT_THAT(Failure({"process-queue"}, 1),
              AllOf(StartsWith(std::string("appindex: ") + kQueue + ": the queue cannot be moved"),
                    EndsWith("(code 502)\n")));
  EXPECT_EQ(ReadFile(kQueue), "{\"op\":3}\n");
}

TEST_F(Commands, BatchThatIsLeftWaitsForTheDaemonAsTheQueueDoes) {
  daemon_.Stop();
  WriteFile(kBatch, Request(1, ConfOf("Photos")) + "\n");
  EXPECT_THAT(Failure({"process-queue"}, 4), HasSubstr("the requests stay queued"));
  EXPECT_TRUE(Exists(kBatch));
}

// No descriptor is to blame, as far as can be told.
TEST_F(Commands, RefusalOfTheDaemonIsGivenAsItIs) {
  EXPECT_THAT(Failure({"del", "/var/packages/Photos"}, 1),
              AllOf(HasSubstr("run `appindex reindex`"), EndsWith("(code 601)\n")));
  daemon_.Stop();
  const ScriptedDaemon daemon(
      [](const Json::Value&) { return test::Failure(603, "not on a holiday"); });
  ASSERT_EQ(Run({"-q", "enqueue", "add", "/var/packages/Photos"}).status, 0);
  for (const std::vector<std::string>& arguments :
       std::vector<std::vector<std::string>>{{"add", "/var/packages/Photos"}, {"process-queue"}}) {
    EXPECT_THAT(Failure(arguments, 1),
                AllOf(StartsWith(std::string("appindex: ") + kSocket +
                                 ": the search daemon refuses: not on a holiday; "),
                      EndsWith("(code 603)\n")));
  }
  EXPECT_TRUE(Exists(kBatch)) << "the request is lost";
}

TEST_F(Commands, FailureIsAlsoGivenAsJson) {
  const Finished finished = Run({"--json", "search", "--lang", "ger", "photo"});
  EXPECT_EQ(finished.status, 1);
  const Json::Value error = Parse(finished.out)["error"];
  EXPECT_EQ(error["code"].asInt(), 601);
  EXPECT_THAT(error["message"].asString(), HasSubstr("appindex reindex"));
}

TEST_F(Commands, WrongUsageEndsWith2) {
  for (const std::vector<std::string>& arguments :
       std::vector<std::vector<std::string>>{{},
                                             {"enqueue"},
                                             {"add"},
                                             {"frobnicate"},
                                             {"search", "--limit", "0", "photo"},
                                             {"search", "--lang", "xyz", "photo"}}) {
    EXPECT_THAT(Failure(arguments, 2), StartsWith("appindex: "));
  }
}

TEST_F(Commands, OptionsOfAllCommandsMayStandBehindThem) {
  const Finished queued = Run({"enqueue", "add", "/var/packages/Photos", "--json", "-q"});
  EXPECT_EQ(queued.status, 0) << queued.err;
  EXPECT_EQ(Parse(queued.out)["requests"][0]["path"].asString(), ConfOf("Photos"));
  EXPECT_EQ(queued.err, "");
  EXPECT_TRUE(Parse(Run({"status", "--json"}).out)["daemon"]["reachable"].asBool());
  EXPECT_EQ(Parse(Run({"lint", "/var/packages/Photos", "--json"}).out)["checked"].size(), 1U);
  EXPECT_EQ(Run({"lint", "/var/packages/Photos", "-q"}).err, "");
}

TEST_F(Commands, NamesOfCommandsAreWordsOfAQueryToo) {
  ASSERT_EQ(Run({"reindex"}).status, 0);
  EXPECT_EQ(Data({"search", "status"})["query"].asString(), "status");
  EXPECT_EQ(Data({"search", "--lang", "ger", "add"})["query"].asString(), "add");
  EXPECT_EQ(Data({"search", "photo", "status", "reindex"})["query"].asString(),
            "photo status reindex");
  EXPECT_FALSE(Exists(kQueue));
}

TEST_F(Commands, LintOfTheRootChecksAllThatIsInstalled) {
  const Json::Value checked = Data({"lint", "/"})["checked"];
  ASSERT_EQ(checked.size(), 3U);
  EXPECT_EQ(checked[0].asString(), ConfOf("Backup"));
  EXPECT_EQ(checked[1].asString(), ConfOf("Photos"));
  EXPECT_EQ(checked[2].asString(), kFilesConf);
}

TEST_F(Commands, HelpNamesEveryExitCode) {
  const Finished finished = Run({"--help"});
  EXPECT_EQ(finished.status, 0);
  EXPECT_THAT(finished.out, HasSubstr("0: done, 1: failed, 2: wrong usage, 3: nothing found"));
}

// Searching.

TEST_F(Commands, SearchListsWhatIsFound) {
  ASSERT_EQ(Run({"reindex"}).status, 0);
  const Finished finished = Run({"search", "--lang", "ger", "fotoalbum"});
  EXPECT_EQ(finished.status, 0);
  EXPECT_EQ(finished.out, "  1. Fotoalbum  (Photos)\n");
  EXPECT_EQ(finished.err, "");
}

TEST_F(Commands, SearchSaysHowItMatched) {
  ASSERT_EQ(Run({"reindex"}).status, 0);
  EXPECT_THAT(Run({"search", "--lang", "ger", "foto"}).err, HasSubstr("beginning of words"));
  EXPECT_THAT(Run({"search", "--lang", "ger", "fotoalbun"}).err, HasSubstr("this is close"));
}

TEST_F(Commands, SearchTakesTheLanguageOfTheLocale) {
  ASSERT_EQ(Run({"reindex"}).status, 0);
  EXPECT_EQ(Run({"search", "sicherung"}, {{"LC_ALL", "de_AT.UTF-8"}}).out,
            "  1. Datensicherung  (Backup)\n");
  EXPECT_EQ(Run({"search", "sicherung"}, {{"LC_ALL", "C"}}).status, 3);
}

TEST_F(Commands, SearchWithoutHitsEndsWith3) {
  ASSERT_EQ(Run({"reindex"}).status, 0);
  const Finished finished = Run({"search", "zzzzzz"});
  EXPECT_EQ(finished.status, 3);
  EXPECT_EQ(finished.out, "");
  EXPECT_EQ(finished.err, "nothing found\n");
  EXPECT_EQ(Data({"search", "zzzzzz"})["total"].asInt(), 0);
}

TEST_F(Commands, SearchLimitsAndExplains) {
  ASSERT_EQ(Run({"reindex"}).status, 0);
  const Json::Value data =
      Data({"search", "--lang", "enu", "--limit", "2", "--explain", "everything"});
  EXPECT_EQ(data["total"].asInt(), 4);
  EXPECT_EQ(data["hits"].size(), 2U);
  EXPECT_EQ(data["matched"].asString(), "exact");
  EXPECT_EQ(data["lang"].asString(), "enu");
  EXPECT_EQ(data["query"].asString(), "everything");
  EXPECT_EQ(data["hits"][0]["explain"][0]["member"].asString(), "keywords");
  const Finished finished = Run({"search", "--limit", "2", "--explain", "everything"});
  EXPECT_THAT(finished.out, HasSubstr("\"everything\" word in keywords"));
  EXPECT_THAT(finished.err, HasSubstr("(2 more: see --limit)"));
}

TEST_F(Commands, SearchShowsDescriptions) {
  WriteFile(ConfOf("Notes"), R"({"app":"Notes","title":"Notebook","desc":"Keeps\nnotes."})");
  ASSERT_EQ(Run({"reindex"}).status, 0);
  EXPECT_EQ(Run({"search", "--lang", "enu", "notebook"}).out,
            "  1. Notebook  (Notes)\n     Keeps notes.\n");
}

TEST_F(Commands, SearchSaysWhenAQueryIsTooLongToCountAsAWhole) {
  ASSERT_EQ(Run({"reindex"}).status, 0);
  const Finished finished = Run({"search", "--lang", "enu", "everything " + std::string(300, 'x')});
  EXPECT_THAT(finished.err, HasSubstr("(the query is long: only its beginning counted)\n"));
}

TEST_F(Commands, SearchTakesSeveralWordsAsOneQuery) {
  ASSERT_EQ(Run({"reindex"}).status, 0);
  EXPECT_EQ(Data({"search", "--lang", "enu", "photo", "album"})["query"].asString(), "photo album");
}

}  // namespace
}  // namespace test
