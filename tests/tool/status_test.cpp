// appindex status: what it tells of the daemon, the queue, the locks, the version and the indexes.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include "tests/integration/real_device.h"
#include "tests/support/scripted_daemon.h"
#include "tests/tool/tool_process.h"

namespace test {
namespace {

using ::testing::HasSubstr;
using ::testing::Not;

class StatusCommand : public RealDeviceTest {
 protected:
  Finished Run(const std::vector<std::string>& arguments) const {
    return RunTool({OutsideRootFd(), OutsidePath()}, arguments);
  }
  Json::Value Status() const { return Parse(Run({"--json", "status"}).out); }
  std::string Text() const { return Run({"status"}).out; }
};

TEST_F(StatusCommand, FreshDeviceHasNothing) {
  const Finished finished = Run({"status"});
  EXPECT_EQ(finished.status, 0);
  EXPECT_THAT(finished.out, HasSubstr("Search daemon   answers\n"));
  EXPECT_THAT(finished.out, HasSubstr("Queue           none\n"));
  EXPECT_THAT(finished.out, HasSubstr("Indexed for     none yet"));
  EXPECT_THAT(finished.out, HasSubstr("enu none"));
}

TEST_F(StatusCommand, WithoutTheDaemonTheRestIsTold) {
  daemon_.Stop();
  Enqueue(Request(1, ConfOf("Photos")));
  const Finished finished = Run({"--json", "status"});
  EXPECT_EQ(finished.status, 4);
  const Json::Value status = Parse(finished.out);
  EXPECT_FALSE(status["daemon"]["reachable"].asBool());
  EXPECT_THAT(status["daemon"]["problem"].asString(), HasSubstr("start tovoelasticd"));
  EXPECT_EQ(status["queue"]["requests"].asInt(), 1);
  EXPECT_EQ(status["version"]["current"].asString(), kVersion);
  EXPECT_TRUE(status["indexes"].empty());
}

TEST_F(StatusCommand, DaemonThatRefusesEndsWith1) {
  daemon_.Stop();
  const test::Reaction refusal = Failure(605, "the registry cannot be read");
  const ScriptedDaemon daemon({refusal, refusal});
  const Finished finished = Run({"status"});
  EXPECT_EQ(finished.status, 1);
  EXPECT_THAT(finished.out, HasSubstr("Search daemon   refuses\n"));
  EXPECT_EQ(Status()["daemon"]["code"].asInt(), 605);
}

TEST_F(StatusCommand, OrderIsThatOfTheLibrary) {
  WriteFile(kBatch, Request(2, ConfOf("Photos")) + "\n");
  WriteFile(kQueue, Request(1, ConfOf("Photos")) + "\n" + Request(1, ConfOf("Backup")) +
                        "\nnot json\n{\"op\":3}\n" + Request(2, ConfOf("Photos")) + "\n");
  const Json::Value status = Status();
  EXPECT_EQ(status["batch"]["requests"].asInt(), 1);
  EXPECT_EQ(status["queue"]["lines"].asInt(), 5);
  EXPECT_EQ(status["queue"]["requests"].asInt(), 3);
  std::vector<std::string> order;
  for (const Json::Value& step : status["order"]) {
    order.push_back(step["from"].asString() + " " + step["op"].asString() + " " +
                    step["path"].asString());
  }
  EXPECT_THAT(order, testing::ElementsAre("batch del " + ConfOf("Photos"), "queue reindex ",
                                          "queue add " + ConfOf("Backup"),
                                          "queue del " + ConfOf("Photos")));
  EXPECT_THAT(Text(), HasSubstr(" 3. add     " + ConfOf("Backup")));
}

TEST_F(StatusCommand, RequestThatHoldsUpTheBatchIsNamed) {
  WriteFile(ConfOf("Broken"), R"({"app":["no text"],"title":"Broken"})");
  WriteFile(kBatch, Request(1, ConfOf("Backup")) + "\n" + Request(1, ConfOf("Broken")) + "\n" +
                        Request(1, ConfOf("Gone")) + "\n");
  const Json::Value order = Status()["order"];
  EXPECT_FALSE(order[0].isMember("problem"));
  EXPECT_THAT(order[1]["problem"].asString(), HasSubstr("not as it must be"));
  EXPECT_THAT(order[2]["problem"].asString(), HasSubstr("cannot be read: No such file"));
  EXPECT_THAT(Text(), HasSubstr("! cannot be read: No such file"));
}

TEST_F(StatusCommand, HolderOfTheQueueIsNamedAlsoWhenItHasTheLockFromAnother) {
  WriteFile(kQueue, "");
  const Fd queue(open(kQueue, O_RDWR | O_CLOEXEC));
  const pid_t taker = fork();  // as the program flock of a shell: it ends, the shell has the lock
  if (taker == 0) _exit(flock(queue.Get(), LOCK_EX));
  ASSERT_EQ(waitpid(taker, nullptr, 0), taker);
  const Json::Value lock = Status()["locks"][1];
  EXPECT_EQ(lock["path"].asString(), kQueue);
  ASSERT_EQ(lock["holders"].size(), 1U);
  EXPECT_EQ(lock["holders"][0]["pid"].asInt(), getpid());
  EXPECT_THAT(Text(), HasSubstr("Locked          " + std::string(kQueue) + " by appindex_test"));
}

TEST_F(StatusCommand, HolderOfALockIsNamed) {
  EXPECT_THAT(Text(), Not(HasSubstr("Locked")));
  const velkor::LockFile lock(kProcessLock, true);
  const Json::Value locks = Status()["locks"];
  EXPECT_EQ(locks[0]["path"].asString(), kProcessLock);
  ASSERT_EQ(locks[0]["holders"].size(), 1U);
  EXPECT_EQ(locks[0]["holders"][0]["pid"].asInt(), getpid());
  EXPECT_EQ(locks[0]["holders"][0]["program"].asString(), "appindex_test");
  EXPECT_TRUE(locks[1]["holders"].empty());
  EXPECT_THAT(Text(), HasSubstr(std::string("Locked          ") + kProcessLock +
                                " by appindex_test (" + std::to_string(getpid()) + ")\n"));
}

TEST_F(StatusCommand, WhatIsInPlaceOfTheProcessLockIsToldAndLeftAlone) {
  Enqueue(Request(1, ConfOf("Photos")));
  MakeDirs(kProcessLock);
  EXPECT_EQ(Status()["locks"][0]["code"].asInt(), 506);
  EXPECT_THAT(Text(), HasSubstr(std::string("No lock         ") + kProcessLock + "\n"));
  const Finished finished = Run({"process-queue"});
  EXPECT_EQ(finished.status, 1);
  EXPECT_THAT(finished.err, testing::EndsWith("(code 506)\n"));
  ASSERT_EQ(rmdir(kProcessLock), 0);
  ASSERT_EQ(mkfifo(kProcessLock, 0600), 0);
  const Json::Value lock = Status()["locks"][0];
  EXPECT_THAT(lock["problem"].asString(), HasSubstr("it is a FIFO"));
  EXPECT_FALSE(lock.isMember("code"));
}

TEST_F(StatusCommand, WaitingWithoutLimitIsToldOfABatchThatIsWorked) {
  WriteFile(kBatch, Request(1, ConfOf("Photos")) + "\n");
  EXPECT_FALSE(Status().isMember("waiting"));
  const velkor::LockFile lock(kProcessLock, true);
  EXPECT_THAT(Status()["waiting"].asString(), HasSubstr("without limit"));
}

TEST_F(StatusCommand, WaitingWithoutLimitIsToldOfADaemonThatIsNotReady) {
  daemon_.Stop();
  const ScriptedDaemon daemon([](const Json::Value&) { return Failure(607, "starting up"); });
  const Finished finished = Run({"status"});
  EXPECT_EQ(finished.status, 1);
  EXPECT_THAT(finished.out, HasSubstr("Search daemon   is not ready\n"));
  EXPECT_THAT(finished.out, HasSubstr("Waiting         whoever works the queue waits 30 s"));
}

TEST_F(StatusCommand, VersionsAreCompared) {
  ASSERT_EQ(Run({"reindex"}).status, 0);
  EXPECT_FALSE(Status()["version"]["differs"].asBool());
  EXPECT_THAT(Text(), Not(HasSubstr("is due")));
  WriteFile("/etc/os-release", "ID=marovanos\nVERSION_ID=8.0\n");
  const Json::Value version = Status()["version"];
  EXPECT_TRUE(version["differs"].asBool());
  EXPECT_EQ(version["recorded"].asString(), kVersion);
  EXPECT_EQ(version["current"].asString(), "marovanos-8.0");
  EXPECT_THAT(Text(), HasSubstr("`appindex reindex` is due"));
}

TEST_F(StatusCommand, StateFileThatIsNoJsonIsNamed) {
  WriteFile("/var/packages/Velkor/etc/appindex.cfg", "{");
  EXPECT_THAT(Status()["version"]["problem"].asString(), HasSubstr("appindex.cfg"));
}

TEST_F(StatusCommand, DocumentsAreCountedByLanguage) {
  ASSERT_EQ(Run({"reindex"}).status, 0);
  const Json::Value status = Status();
  ASSERT_EQ(status["indexes"].size(), 21U);
  for (const Json::Value& index : status["indexes"]) EXPECT_EQ(index["documents"].asInt(), 4);
  EXPECT_TRUE(status["even"].asBool());
  EXPECT_THAT(Text(), HasSubstr("Documents       chs 4"));
}

TEST_F(StatusCommand, DamagedAndMissingIndexesAreNamed) {
  ASSERT_EQ(Run({"reindex"}).status, 0);
  Json::Value id;
  id["id"] = "appindex_ger";
  RealDaemon::Ask("index_delete", id);
  daemon_.Stop();
  unlink("/var/packages/Velkor/etc/appindex.db/fre/docdata.glass");
  daemon_.Start();
  const Json::Value status = Status();
  EXPECT_EQ(status["indexes"][5]["lang"].asString(), "fre");
  EXPECT_EQ(status["indexes"][5]["state"].asString(), "damaged");
  EXPECT_THAT(status["indexes"][5]["problem"].asString(), HasSubstr("docdata.glass"));
  EXPECT_EQ(status["indexes"][6]["state"].asString(), "missing");
  EXPECT_FALSE(status["even"].asBool());
  const std::string text = Text();
  EXPECT_THAT(text, HasSubstr("fre damaged"));
  EXPECT_THAT(text, HasSubstr("ger none"));
  EXPECT_THAT(text, HasSubstr("Damaged         fre: "));
  EXPECT_THAT(text, HasSubstr("not as many in each language"));
}

}  // namespace
}  // namespace test
