// One exchange with the search daemon, and what is told when there is none.
#include "tool/daemon.h"

#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <future>

#include "appindex/error.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"
#include "tool/failure.h"

namespace tool {
namespace {

using ::testing::AllOf;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::StartsWith;

class AskDaemonTest : public test::DeviceRootTest {
 protected:
  static Failure FailureOf(std::chrono::microseconds patience = kAnswerPatience) {
    try {
      AskDaemon("index_list", Json::Value(Json::objectValue), patience);
    } catch (const Failure& failure) {
      return failure;
    }
    return Failure("", "", kDone);
  }
};

TEST_F(AskDaemonTest, ReplyIsReturned) {
  const test::ScriptedDaemon daemon({test::Reply(R"({"success":true,"indexes":[]})")});
  EXPECT_TRUE(AskDaemon("index_list")["indexes"].isArray());
}

TEST_F(AskDaemonTest, DaemonThatIsNotThereIsNamed) {
  const Failure failure = FailureOf();
  EXPECT_THAT(failure.what(),
              AllOf(StartsWith("/var/run/tovoelasticd.sock: the search daemon does not answer: No "
                               "such file"),
                    EndsWith("; start tovoelasticd and try again")));
  EXPECT_EQ(failure.exit_code(), kDaemonUnreachable);
  EXPECT_EQ(failure.code(), 913);
}

TEST_F(AskDaemonTest, OtherUsersAreToldToBecomeRootWhereTheSocketIsNotTheirs) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: becomes another user";
  const test::ScriptedDaemon daemon;
  ASSERT_EQ(chmod(test::kSocket, 0600), 0);
  ASSERT_EQ(seteuid(65534), 0);
  const Failure failure = FailureOf();
  ASSERT_EQ(seteuid(0), 0);
  EXPECT_THAT(failure.what(), AllOf(HasSubstr("does not answer: Permission denied"),
                                    EndsWith("; run appindex as root")));
  EXPECT_EQ(failure.exit_code(), kDaemonUnreachable);
}

TEST_F(AskDaemonTest, DaemonThatAcceptsAndSaysNothingIsLeftAfterAWhile) {
  std::promise<void> asked;
  const test::ScriptedDaemon daemon([&](const Json::Value&) {
    asked.get_future().wait();
    return test::Success();
  });
  const Failure failure = FailureOf(std::chrono::microseconds(0));
  asked.set_value();
  EXPECT_THAT(failure.what(), HasSubstr("the search daemon has not answered in 0 s; "));
  EXPECT_EQ(failure.exit_code(), kDaemonUnreachable);
  EXPECT_EQ(failure.code(), 913);
}

TEST_F(AskDaemonTest, TheWaitIsOverWithTheAnswer) {
  const test::ScriptedDaemon daemon;
  AskDaemon("index_list");
  EXPECT_EQ(alarm(0), 0U) << "a timer still runs";
  struct sigaction action {};
  sigaction(SIGALRM, nullptr, &action);
  EXPECT_EQ(action.sa_handler, SIG_DFL);
}

TEST_F(AskDaemonTest, OtherEndsOfTheExchangeAreTold) {
  const test::ScriptedDaemon daemon(
      {{test::Reaction::kHangUp, ""},
       test::Reply("nonsense"),
       test::Reply("[]"),
       test::Reply(R"({"success":1})"),
       test::Reply(R"({"success":false})"),
       test::Reply(R"({"success":false,"error":[]})"),
       test::Reply(R"({"success":false,"error":{"code":"601"}})"),
       test::Reply(R"({"success":false,"error":{"code":601,"msg":5}})")});
  EXPECT_THAT(FailureOf().what(), HasSubstr("closed the connection without an answer; "));
  for (int reply = 1; reply < 8; ++reply) {
    const Failure failure = FailureOf();
    EXPECT_THAT(failure.what(), HasSubstr("an answer that makes no sense: it is no reply; "));
    EXPECT_EQ(failure.exit_code(), kDaemonUnreachable);
  }
}

TEST_F(AskDaemonTest, RefusalIsTheDaemonsOwn) {
  const test::ScriptedDaemon daemon({test::Failure(605, "index is damaged")});
  const velkor::Error error = test::ThrownBy([] { AskDaemon("index_list"); });
  EXPECT_EQ(error.code, 605);
  EXPECT_EQ(error.reason, "index is damaged");
}

}  // namespace
}  // namespace tool
