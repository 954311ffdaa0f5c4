// What is told of a request that holds up others, and of a daemon that answers nonsense.
#include "tool/status.h"

#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>
#include <utime.h>

#include <ctime>

#include "appindex/index_mgr.h"
#include "appindex/utilities/json_helpers.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"
#include "tests/unit/tool/status_test_device.h"

namespace tool {
namespace {

using test::ConfOf;
using test::kBatch;
using test::kQueue;
using test::Request;
using ::testing::HasSubstr;
using ::testing::Not;

constexpr char kNoText[] = R"({"app":["no text"],"title":"Broken"})";

class StatusTest : public StatusTestDevice {
 protected:
  static void Age(const char* path, std::time_t seconds) {
    const utimbuf then = {0, std::time(nullptr) - seconds};
    ASSERT_EQ(utime(path, &then), 0);
  }
};

TEST_F(StatusTest, RequestThatHoldsUpTheBatchIsNamedWithCodeReasonAndTime) {
  test::Install("Good");
  test::WriteFile(ConfOf("Broken"), kNoText);
  test::WriteFile(kBatch, Request(1, ConfOf("Gone")) + "\n" + Request(1, ConfOf("Broken")) + "\n" +
                              Request(1, ConfOf("Good")) + "\n");
  Age(kBatch, 7500);
  const Json::Value data = Data();
  const Json::Value& culprit = data["held_up_by"];
  EXPECT_EQ(culprit["from"].asString(), "batch");
  EXPECT_EQ(culprit["op"].asString(), "add");
  EXPECT_EQ(culprit["path"].asString(), ConfOf("Broken"));
  EXPECT_THAT(culprit["problem"].asString(), HasSubstr("not as it must be"));
  EXPECT_EQ(culprit["code"].asInt(), 120);
  EXPECT_GE(culprit["waiting_seconds"].asInt(), 7500);
  EXPECT_EQ(culprit["since"], data["batch"]["written"]);
  EXPECT_THAT(culprit["since"].asString(), testing::MatchesRegex("....-..-..T..:..:..Z"));
  // A descriptor that is gone does nothing, and holds nobody up.
  EXPECT_EQ(data["order"][1]["path"].asString(), ConfOf("Gone"));
  EXPECT_FALSE(data["order"][1]["fails"].asBool());

  const std::string text = Text();
  EXPECT_THAT(text, HasSubstr("Held up by      add " + ConfOf("Broken") + "\n" +
                              "                ! something is not as it must be"));
  EXPECT_THAT(text, HasSubstr("(code 120)\n                all of the batch waits for it, since "));
  EXPECT_THAT(text, HasSubstr("last written 2 h 5 min ago"));
}

TEST_F(StatusTest, RequestThatWillFailIsNamedBeforeTheQueueIsABatch) {
  test::WriteFile(ConfOf("Broken"), R"({"app":"A","title":{}})");
  test::WriteFile(kQueue, Request(1, ConfOf("Broken")) + "\n");
  const Json::Value culprit = Data()["held_up_by"];
  EXPECT_EQ(culprit["from"].asString(), "queue");
  EXPECT_FALSE(culprit.isMember("code"));
  EXPECT_THAT(Text(), HasSubstr("Will fail       add " + ConfOf("Broken") +
                                "\n                ! a "
                                "value stands where a text belongs"));
}

TEST_F(StatusTest, RebuildNamesTheApplicationToBlame) {
  test::WriteFile(ConfOf("Broken"), kNoText);
  test::WriteFile(kBatch, "{\"op\":3}\n");
  EXPECT_THAT(Data()["held_up_by"]["problem"].asString(), HasSubstr(ConfOf("Broken") + ": "));
  EXPECT_THAT(Text(), HasSubstr("Held up by      reindex everything\n"));
}

// Root reads every directory, so this is somebody else; the library then fails as is told.
TEST_F(StatusTest, RebuildNamesTheDirectoryThatCannotBeRead) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: becomes another user";
  const std::string dir = "/var/packages/App/target/private";
  test::WriteFile(dir + "/index.conf", R"({"app":"App","title":"App"})");
  ASSERT_EQ(chmod(dir.c_str(), 0700), 0);
  test::WriteFile(kQueue, "{\"op\":3}\n");
  ASSERT_EQ(seteuid(1001), 0);
  const Json::Value culprit = Data()["held_up_by"];
  const std::string text = Text();
  const velkor::Error error = test::ThrownBy(velkor::appindex::Reindex);
  ASSERT_EQ(seteuid(0), 0);
  EXPECT_EQ(culprit["op"].asString(), "reindex");
  EXPECT_EQ(culprit["problem"].asString(),
            dir + "/: the directory cannot be read: Permission denied; run appindex as root");
  EXPECT_EQ(culprit["code"].asInt(), 502);
  EXPECT_EQ(error.code, 502);
  EXPECT_THAT(text,
              HasSubstr("Will fail       reindex everything\n                ! " + dir + "/: "));
}

TEST_F(StatusTest, CulpritBehindManyRequestsIsNamedAllTheSame) {
  std::string batch = Request(1, ConfOf("Z")) + "\n";
  for (int i = 0; i < 100; ++i) batch += Request(1, ConfOf("A" + std::to_string(i))) + "\n";
  test::WriteFile(kBatch, batch);
  test::WriteFile(ConfOf("Z"), kNoText);
  EXPECT_THAT(Text(), HasSubstr("Held up by      add " + ConfOf("Z") + "\n"));
}

TEST_F(StatusTest, WithoutAFailingRequestNobodyIsBlamed) {
  test::Install("Good");
  test::WriteFile(kBatch, Request(1, ConfOf("Good")) + "\n" + Request(1, ConfOf("Gone")) + "\n");
  EXPECT_FALSE(Data().isMember("held_up_by"));
  EXPECT_THAT(Text(), Not(HasSubstr("Held up by")));
  const test::ScriptedDaemon daemon({test::Reply(R"({"success":true,"indexes":[]})")});
  EXPECT_THAT(Text(), HasSubstr("Left because    not known here, no request of it fails"));
}

TEST_F(StatusTest, QueueThatCannotBeReadIsToldWithTheCause) {
  test::MakeDirs(kQueue);
  const Json::Value queue = Data()["queue"];
  EXPECT_TRUE(queue["exists"].asBool());
  EXPECT_EQ(queue["problem"].asString(), "Is a directory");
  EXPECT_FALSE(queue.isMember("requests"));
  EXPECT_THAT(Text(), HasSubstr("Queue           cannot be read: Is a directory\n"));
}

// What is gathered, put together by the test.

TEST(StatusOf, HoldersThatCannotBeSeenAreToldSo) {
  Status status;
  status.locks.push_back({"/tmp/lock", {{12, "shell"}, {13, ""}, {14, "", true}}});
  const Json::Value holders = ToJson(status)["locks"][0]["holders"];
  EXPECT_FALSE(holders[1].isMember("ended"));
  EXPECT_TRUE(holders[2]["ended"].asBool());
  const std::string text = ToText(status);
  EXPECT_THAT(text, HasSubstr("Locked          /tmp/lock by shell (12)\n"));
  EXPECT_THAT(text, HasSubstr("Locked          /tmp/lock by process (13)\n"));
  EXPECT_THAT(text, HasSubstr("Locked          /tmp/lock by a process that cannot be seen; the one "
                              "that took it\n                has ended (14)\n"));
}

TEST(StatusOf, BatchThatIsBeingWorkedIsNotSaidToBeLeft) {
  Status status;
  status.batch.state = RequestFile::kReadable;
  EXPECT_THAT(ToText(status), HasSubstr("Left because"));
  status.locks.push_back({"/var/packages/Velkor/etc/appindex.queue", {{12, "shell"}}});
  EXPECT_THAT(ToText(status), HasSubstr("Left because")) << "a writer of the queue works no batch";
  status.locks.push_back({"/tmp/velkor_appindex_process.lck", {{13, "appindex"}}});
  EXPECT_THAT(ToText(status), Not(HasSubstr("Left because")));
}

TEST(StatusOf, OneLanguageWithOtherDocumentsIsUneven) {
  Status status;
  status.indexes["enu"] = {Index::kWhole, 4, ""};
  status.indexes["ger"] = {Index::kWhole, 4, ""};
  EXPECT_TRUE(status.IsEven());
  status.indexes["ger"].documents = 3;
  EXPECT_FALSE(ToJson(status)["even"].asBool());
  EXPECT_THAT(ToText(status), HasSubstr("not as many in each language"));
}

TEST(StatusOf, UnknownVersionIsNotSaidToDiffer) {
  Status status;
  status.version = {"marovanos-7.1", "marovanos-7.2", ""};
  EXPECT_TRUE(ToJson(status)["version"]["differs"].asBool());
  status.version.problem = "/etc/os-release: gone";
  const Json::Value version = ToJson(status)["version"];
  EXPECT_FALSE(version["differs"].asBool());
  EXPECT_EQ(version["problem"].asString(), "/etc/os-release: gone");
  EXPECT_THAT(ToText(status), HasSubstr("System version  not known: /etc/os-release: gone\n"));
}

TEST_F(StatusTest, NamesCannotForgeLines) {
  test::WriteFile(kBatch, R"({"op":1,"path":"/x\nHeld up by  nobody\u001b[2J/index.conf"})");
  const std::string text = Text();
  EXPECT_THAT(text, HasSubstr("add     /x Held up by  nobody [2J/index.conf\n"));
}

// The daemon's answer to "index_list".

struct HostileReply {
  const char* indexes;
  bool answers;  // whether it counts as an answer
  friend void PrintTo(const HostileReply& reply, std::ostream* out) { *out << reply.indexes; }
};

class HostileList : public StatusTest, public testing::WithParamInterface<HostileReply> {};

TEST_P(HostileList, IsTakenOrToldAndNeverACrash) {
  const std::string reply = std::string(R"({"success":true,"indexes":)") + GetParam().indexes + "}";
  const test::ScriptedDaemon daemon({test::Reply(reply), test::Reply(reply)});
  const Json::Value data = Data();
  EXPECT_EQ(data["daemon"]["reachable"].asBool(), GetParam().answers) << reply;
  EXPECT_EQ(data["indexes"].size(), GetParam().answers ? 21U : 0U);
  EXPECT_THAT(Text(), HasSubstr("Search daemon   "));
}

INSTANTIATE_TEST_SUITE_P(
    , HostileList,
    testing::Values(HostileReply{"null", true}, HostileReply{"7", true}, HostileReply{"[]", true},
                    HostileReply{"{}", true}, HostileReply{"\"text\"", true},
                    HostileReply{"[{}]", true}, HostileReply{"[null]", true},
                    HostileReply{"[7]", false}, HostileReply{"[\"text\"]", false},
                    HostileReply{"[[]]", false}, HostileReply{R"([{"id":[]}])", false},
                    HostileReply{R"([{"id":"appindex_enu"}])", true},
                    HostileReply{R"([{"id":"appindex_enu","documents":-1}])", false},
                    HostileReply{R"([{"id":"appindex_enu","documents":"many"}])", false},
                    HostileReply{R"([{"id":"appindex_enu","error":{}}])", false},
                    HostileReply{R"([{"id":"appindex_enu","error":"\u001b[2J\nx"}])", true}),
    [](const auto& param_info) { return "Reply" + std::to_string(param_info.index); });

}  // namespace
}  // namespace tool
