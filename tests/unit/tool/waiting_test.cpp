// What is told of those who wait for the search daemon, and that the library waits as is told.
#include <gmock/gmock.h>

#include <algorithm>
#include <string>
#include <vector>

#include "appindex/elastic_control.h"
#include "tests/support/controlled_time.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"
#include "tests/unit/tool/status_test_device.h"

namespace tool {
namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::Not;
using ::testing::SizeIs;

struct Answer {
  int code;
  const char* daemon;  // how it is called
  const char* waiting;
  std::vector<unsigned> pauses;  // of the library, the shortest and the longest
  friend void PrintTo(const Answer& answer, std::ostream* out) { *out << answer.code; }
};

class Waiting : public StatusTestDevice, public testing::WithParamInterface<Answer> {};

TEST_P(Waiting, IsToldOfADaemonThatIsNotReadyOrBusy) {
  const test::ScriptedDaemon daemon(
      [](const Json::Value&) { return test::Failure(GetParam().code, "for now"); });
  const Json::Value data = Data();
  EXPECT_EQ(data["waiting"].asString(), GetParam().waiting);
  EXPECT_TRUE(data["daemon"]["reachable"].asBool());
  EXPECT_EQ(data["daemon"]["code"].asInt(), GetParam().code);
  EXPECT_THAT(data["daemon"]["problem"].asString(), HasSubstr(": for now; try again "));
  EXPECT_THAT(Text(), AllOf(HasSubstr(std::string("Search daemon   ") + GetParam().daemon + "\n"),
                            HasSubstr("(code " + std::to_string(GetParam().code) + ")\n"),
                            HasSubstr("\nWaiting         whoever works the queue waits ")));
}

TEST_P(Waiting, IsWhatTheLibraryDoesAgainAndAgain) {
  constexpr std::size_t kTimes = 1000;
  std::size_t asked = 0;
  const test::ScriptedDaemon daemon([&](const Json::Value&) {
    return asked++ < kTimes ? test::Failure(GetParam().code, "for now") : test::Success();
  });
  test::Time() = test::ControlledTime();
  test::Time().rands = {0, 1, 2, 3, 4};
  velkor::appindex::elastic::AppIndexDelete("enu");
  const std::vector<unsigned>& pauses = test::Time().sleeps;
  EXPECT_THAT(pauses, SizeIs(kTimes));
  EXPECT_EQ(*std::min_element(pauses.begin(), pauses.end()), GetParam().pauses[0]);
  EXPECT_EQ(*std::max_element(pauses.begin(), pauses.end()), GetParam().pauses[1]);
}

constexpr char kSoon[] = "whoever works the queue waits 30 s and asks again, without limit";
constexpr char kLate[] = "whoever works the queue waits 15 to 19 min and asks again, without limit";

INSTANTIATE_TEST_SUITE_P(, Waiting,
                         testing::Values(Answer{607, "is not ready", kSoon, {30, 30}},
                                         Answer{608, "is not ready", kSoon, {30, 30}},
                                         Answer{610, "is not ready", kSoon, {30, 30}},
                                         Answer{1400, "is busy", kLate, {15 * 60, 19 * 60}}),
                         [](const auto& answer) {
                           return "Code" + std::to_string(answer.param.code);
                         });

class WaitingTest : public StatusTestDevice {};

TEST_F(WaitingTest, IsNotToldOfOtherCodesNorOfADaemonThatIsNotThere) {
  EXPECT_FALSE(Data().isMember("waiting"));
  const test::ScriptedDaemon daemon([](const Json::Value&) { return test::Failure(609, "no"); });
  EXPECT_FALSE(Data().isMember("waiting"));
  EXPECT_THAT(Text(), AllOf(HasSubstr("Search daemon   refuses\n"), Not(HasSubstr("Waiting"))));
}

// What is gathered, put together by the test.
TEST(WaitingOf, ABatchThatIsWorkedIsToldAndNothingElse) {
  Status status;
  const std::string lock = test::kProcessLock;
  status.locks = {{lock, {}}, {test::kQueue, {{12, "writer"}}}};
  EXPECT_EQ(status.Waiting(), "") << "nobody works, there is nothing to be done";
  status.batch.state = RequestFile::kReadable;
  EXPECT_EQ(status.Waiting(), "") << "nobody works";
  status.locks[0].holders.push_back({13, "appindex"});
  EXPECT_THAT(ToText(status),
              HasSubstr("Waiting         while the search daemon says nothing, is not ready (asked "
                        "again\n                after 30 s) or is busy (asked again after 15 to 19 "
                        "min), whoever\n                works the batch waits, without limit\n"));
  EXPECT_EQ(ToJson(status)["waiting"].asString(), status.Waiting());
  status.batch.state = RequestFile::kUnreadable;
  EXPECT_NE(status.Waiting(), "") << "it is there";
  status.batch.state = RequestFile::kMissing;
  EXPECT_EQ(status.Waiting(), "") << "there is nothing to be done";
}

}  // namespace
}  // namespace tool
