// Working the queue.
#include <gmock/gmock.h>
#include <json/value.h>
#include <unistd.h>

#include <cerrno>

#include "appindex/index_mgr.h"
#include "appindex/utilities/json_helpers.h"
#include "queue_test_fixture.h"

namespace velkor::appindex {
namespace {

using test::AddCommands;
using test::ConfOf;
using test::DelCommands;
using test::Enqueue;
using test::FailureLine;
using test::Install;
using test::Joined;
using test::kBatch;
using test::kQueue;
using test::kSucceed;
using test::ReindexCommands;
using test::Request;
using test::ScriptedDaemon;
using test::ThrownBy;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

std::string AddNotice(const std::string& name) { return "index_mgr:190 Add: " + ConfOf(name); }
std::string DelNotice(const std::string& name) { return "index_mgr:255 Del: " + ConfOf(name); }

std::string BadLine(int site, const std::string& cmd, const std::string& reason,
                    const std::string& ending = "") {
  return FailureLine("index_mgr", site, "ProcessQueue",
                     "ProcessQueue failed, cmd: " + cmd + ", reason: " + reason + ending);
}

class IndexQueue : public test::QueueTest {};

// Nothing to do, or nobody to do it.

TEST_F(IndexQueue, WithoutQueueFilesReturnsAtOnceWithoutLookingForTheDaemon) {
  ProcessQueue();
  EXPECT_THAT(test::Calls().access.paths, IsEmpty());
  EXPECT_FALSE(test::Exists(kQueue));
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(IndexQueue, TakesTheProcessLockAlsoWithNothingToDo) {
  const LockFile lock(test::kProcessLock, true);
  EXPECT_EQ(ThrownBy([] { ProcessQueue(); }).code, Error::kLockFileError);
}

TEST_F(IndexQueue, WithoutTheDaemonTheQueueIsNeitherMovedNorRead) {
  test::WriteFile(kQueue, "not json\n{}\n");
  ProcessQueue();
  EXPECT_EQ(test::ReadFile(kQueue), "not json\n{}\n");
  EXPECT_FALSE(test::Exists(kBatch));
  EXPECT_THAT(test::Calls().access.paths, ElementsAre(test::kSocket));
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(IndexQueue, WithoutTheDaemonALeftoverBatchIsKept) {
  test::WriteFile(kQueue, "new\n");
  test::WriteFile(kBatch, "{}\n");
  ProcessQueue();
  EXPECT_EQ(test::ReadFile(kBatch), "{}\n");
  EXPECT_EQ(test::ReadFile(kQueue), "new\n");
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(IndexQueue, OnlyTheExistenceOfTheSocketFileIsTested) {
  test::WriteFile(test::kSocket, "");
  Enqueue(Request(7, "/x"));
  ProcessQueue();
  EXPECT_FALSE(test::Exists(kQueue));
  EXPECT_FALSE(test::Exists(kBatch));
}

TEST_F(IndexQueue, ReturnsWhenTheDaemonGoesAwayBetweenTwoBatches) {
  Install("A");
  Enqueue(Request(1, ConfOf("A")));
  ScriptedDaemon daemon([](const Json::Value& request) {
    if (request["command"] == "commit" && request["data"]["id"] == "appindex_trk") {
      test::WriteFile(kQueue, Request(2, ConfOf("A")) + "\n");
      unlink(test::kSocket);
    }
    return test::Success();
  });
  ProcessQueue();
  EXPECT_EQ(daemon.Commands(), AddCommands("A"));
  EXPECT_EQ(test::ReadFile(kQueue), Request(2, ConfOf("A")) + "\n");
  EXPECT_FALSE(test::Exists(kBatch));
}

// Folding.

TEST_F(IndexQueue, OneAddsTwoRemovesThreeRebuilds) {
  Install("A");
  Install("B");
  EXPECT_EQ(CommandsOf({Request(1, ConfOf("A")), Request(2, ConfOf("B")), R"({"op":3})"}),
            Joined({ReindexCommands({"A", "B"}), AddCommands("A"), DelCommands("B")}));
}

TEST_F(IndexQueue, RemovalAfterAnInstallationLeavesOnlyTheRemoval) {
  Install("A");
  EXPECT_EQ(CommandsOf({Request(1, ConfOf("A")), Request(2, ConfOf("A"))}), DelCommands("A"));
  EXPECT_THAT(TakeLog(), ElementsAre(DelNotice("A")));
}

TEST_F(IndexQueue, InstallationAfterARemovalLeavesOnlyTheInstallation) {
  Install("A");
  EXPECT_EQ(CommandsOf({Request(2, ConfOf("A")), Request(1, ConfOf("A"))}), AddCommands("A"));
}

TEST_F(IndexQueue, PathsAreHandledInKeyOrderNotInFileOrder) {
  for (const char* name : {"a", "B", "aa"}) Install(name);
  CommandsOf({Request(1, ConfOf("aa")), Request(1, ConfOf("a")), Request(1, ConfOf("B"))});
  EXPECT_THAT(TakeLog(), ElementsAre(AddNotice("B"), AddNotice("a"), AddNotice("aa")));
}

TEST_F(IndexQueue, PathsAreOrderedByUnsignedBytes) {
  Install("\xC3\xA9");
  Install("z");
  CommandsOf({Request(1, ConfOf("\xC3\xA9")), Request(1, ConfOf("z"))});
  EXPECT_THAT(TakeLog(), ElementsAre(AddNotice("z"), AddNotice("\xC3\xA9")));
}

TEST_F(IndexQueue, RebuildWithoutAPathRunsFirst) {
  Install("X");
  EXPECT_EQ(CommandsOf({Request(1, ConfOf("X")), R"({"op":3})"}),
            Joined({ReindexCommands({"X"}), AddCommands("X")}));
}

TEST_F(IndexQueue, RebuildsWithoutAPathCollapseIntoOne) {
  EXPECT_EQ(CommandsOf({R"({"op":3})", R"({"op":3})", R"({"op":3,"path":""})"}),
            ReindexCommands({}));
}

TEST_F(IndexQueue, RebuildsWithTwoKeysRunTwice) {
  EXPECT_EQ(CommandsOf({R"({"op":3,"path":"/p"})", R"({"op":3})"}),
            Joined({ReindexCommands({}), ReindexCommands({})}));
}

TEST_F(IndexQueue, PathThatIsNoStringIsTheEmptyPath) {
  EXPECT_EQ(CommandsOf({R"({"op":3,"path":5})", R"({"op":3,"path":["/p"]})",
                        R"({"op":3,"path":null})", R"({"op":3,"path":true})", R"({"op":3})"}),
            ReindexCommands({}));
}

TEST_F(IndexQueue, OtherOperationDoesNothingSilentlyAndStillOverrides) {
  Install("X");
  EXPECT_THAT(CommandsOf({Request(1, ConfOf("X")), Request(7, ConfOf("X")), Request(0, "/y"),
                          Request(-1, "/z")}),
              IsEmpty());
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(IndexQueue, OtherMembersAreIgnored) {
  Install("A");
  EXPECT_EQ(CommandsOf({R"({"by":["x"],"op":1,"path":")" + ConfOf("A") + R"("})"}),
            AddCommands("A"));
}

TEST_F(IndexQueue, LastLineWithoutALineEndCounts) {
  Install("A");
  Install("B");
  test::WriteFile(kQueue, Request(1, ConfOf("A")) + "\n" + Request(1, ConfOf("B")));
  EXPECT_EQ(CommandsOf({}), Joined({AddCommands("A"), AddCommands("B")}));
}

TEST_F(IndexQueue, PathIsHandedOnAsItStands) {
  Install("A");
  EXPECT_THAT(CommandsOf({Request(1, ConfOf("A") + ".bak"), Request(2, "/")}), IsEmpty());
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(IndexQueue, EmptyQueueIsRemoved) {
  test::WriteFile(kQueue, "");
  EXPECT_THAT(CommandsOf({}), IsEmpty());
}

// Bad lines.

TEST_F(IndexQueue, LinesThatAreNotJsonAreSkippedSilently) {
  Install("A");
  EXPECT_EQ(CommandsOf({"", "not json", R"({"op":1)", R"({"op":3} {"op":3})", "\xff",
                        std::string(100000, '['), Request(1, ConfOf("A"))}),
            AddCommands("A"));
  EXPECT_THAT(TakeLog(), ElementsAre(AddNotice("A")));
}

TEST_F(IndexQueue, LineWithoutOpIsLoggedAndTheNextIsRead) {
  Install("A");
  test::WriteFile(kBatch, R"({"path":"/x"})"
                          "\n" +
                              Request(1, ConfOf("A")) + "\n");
  ScriptedDaemon daemon(kSucceed);
  Enqueue("{}");  // both files there: nothing is missing, so nothing has set errno
  errno = 0;
  ProcessQueue();
  const std::vector<std::string> log = TakeLog();
  ASSERT_GE(log.size(), 2U);
  EXPECT_EQ(log[0], BadLine(350, R"({"path":"/x"})",
                            "Missing property: op" + AppendData(test::Parse(R"({"path":"/x"})"))));
  EXPECT_EQ(log[1], AddNotice("A"));
  EXPECT_EQ(daemon.Commands(), AddCommands("A"));
}

TEST_F(IndexQueue, BadLineShowsAStaleErrnoOnceAndClearsIt) {
  const std::string reason = "Missing property: op" + AppendData(Json::objectValue);
  CommandsOf({"{}", "{}"});  // that there was no leftover batch is still in errno
  EXPECT_THAT(TakeLog(),
              ElementsAre(BadLine(350, "{}", reason, " [err: No such file or directory]"),
                          BadLine(350, "{}", reason)));
}

TEST_F(IndexQueue, RawLineIsLoggedAsItStandsInTheQueue) {
  CommandsOf({"{}", "  { \"path\" : \"\\u0041\" }  "});
  const std::vector<std::string> log = TakeLog();
  ASSERT_EQ(log.size(), 2U);
  EXPECT_EQ(log[1], BadLine(350, "  { \"path\" : \"\\u0041\" }  ",
                            "Missing property: op" + AppendData(test::Parse(R"({"path":"A"})"))));
}

TEST_F(IndexQueue, OpThatIsNotAnIntegerIsLoggedAndSkipped) {
  for (const char* line :
       {R"({"op":"add"})", R"({"op":[1]})", R"({"op":{}})", R"({"op":99999999999})"}) {
    CommandsOf({"{}", line});
    const std::vector<std::string> log = TakeLog();
    ASSERT_EQ(log.size(), 2U) << line;
    EXPECT_EQ(log[1], BadLine(350, line, "Not a string" + AppendData(test::Parse(line))));
  }
}

TEST_F(IndexQueue, JsonThatIsNotAnObjectIsLoggedAndSkipped) {
  for (const char* line : {"5", "[1]", "\"op\"", "null", "true"}) {
    CommandsOf({"{}", line});
    const std::vector<std::string> log = TakeLog();
    ASSERT_EQ(log.size(), 2U) << line;
    EXPECT_EQ(log[1], BadLine(350, line, "Not an object" + AppendData(test::Parse(line))));
  }
}

// Batches.

TEST_F(IndexQueue, LeftoverBatchIsFinishedBeforeTheLiveQueueIsMoved) {
  Install("A");
  Install("B");
  test::WriteFile(kBatch, Request(1, ConfOf("B")) + "\n");
  Enqueue(Request(1, ConfOf("A")));
  std::vector<std::string> live;  // the live queue at each pause of B's, then of A's addition
  test::Time().on_usleep = [&live](unsigned) { live.push_back(test::ReadFile(kQueue)); };
  EXPECT_EQ(CommandsOf({}), Joined({AddCommands("B"), AddCommands("A")}));
  auto expected = std::vector<std::string>(21, Request(1, ConfOf("A")) + "\n");
  expected.resize(42);
  EXPECT_EQ(live, expected);
}

TEST_F(IndexQueue, RequestsOfTwoBatchesAreNotFolded) {
  Install("A");
  test::WriteFile(kBatch, Request(1, ConfOf("A")) + "\n");
  EXPECT_EQ(CommandsOf({Request(2, ConfOf("A"))}), Joined({AddCommands("A"), DelCommands("A")}));
}

TEST_F(IndexQueue, WhatIsAppendedMeanwhileIsWorkedInTheSameCall) {
  Install("A");
  Install("B");
  test::Time().on_usleep = [](unsigned) {
    test::Time().on_usleep = nullptr;
    Enqueue(Request(1, ConfOf("B")));
  };
  EXPECT_EQ(CommandsOf({Request(1, ConfOf("A"))}), Joined({AddCommands("A"), AddCommands("B")}));
}

TEST_F(IndexQueue, BatchIsKeptWhileItsEntriesAreCarriedOut) {
  Install("A");
  const std::string line = Request(1, ConfOf("A"));
  std::vector<std::string> seen;
  test::Time().on_usleep = [&seen](unsigned) { seen.push_back(test::ReadFile(kBatch)); };
  CommandsOf({line});
  EXPECT_EQ(seen, std::vector<std::string>(21, line + "\n"));
}

TEST_F(IndexQueue, FailedOperationKeepsTheWholeBatchForTheNextCall) {
  Install("A");
  Install("B");
  Enqueue(Request(1, ConfOf("A")));
  Enqueue(Request(2, ConfOf("B")));
  const std::string lines = test::ReadFile(kQueue);
  {
    ScriptedDaemon daemon([](const Json::Value& request) {
      return request["command"] == "document_del_by_id" ? test::Failure(605, "disk")
                                                        : test::Success();
    });
    const Error error = ThrownBy([] { ProcessQueue(); });
    EXPECT_EQ(error.code, 605);
    EXPECT_STREQ(error.what(), "Request failed, msg=disk");
  }
  EXPECT_EQ(test::ReadFile(kBatch), lines);
  EXPECT_FALSE(test::Exists(kQueue));
  ExpectUnlocked(test::kProcessLock);
  EXPECT_EQ(CommandsOf({}), Joined({AddCommands("A"), DelCommands("B")}));
}

TEST_F(IndexQueue, ExceptionOfTheJsonLibraryKeepsTheBatchToo) {
  test::WriteFile(ConfOf("A"), R"({"app":"A","title":["t"]})");
  Enqueue(Request(1, ConfOf("A")));
  ScriptedDaemon daemon(kSucceed);
  EXPECT_THROW(ProcessQueue(), Json::Exception);
  EXPECT_EQ(test::ReadFile(kBatch), Request(1, ConfOf("A")) + "\n");
}

TEST_F(IndexQueue, FailedRebuildKeepsTheBatch) {
  Enqueue(R"({"op":3})");
  rmdir("/usr/tovo/tovoman/webman/modules");
  ScriptedDaemon daemon(kSucceed);
  EXPECT_EQ(ThrownBy([] { ProcessQueue(); }).code, Error::kGeneralError);
  EXPECT_EQ(test::ReadFile(kBatch), "{\"op\":3}\n");
}

}  // namespace
}  // namespace velkor::appindex
