// One exchange with the search daemon and its retries, through the real socket client.
#include "appindex/elastic_control.h"

#include <gmock/gmock.h>
#include <json/value.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <memory>
#include <string>
#include <vector>

#include "appindex/elastic_control_internal.h"
#include "appindex/utilities/json_helpers.h"
#include "error_of.h"
#include "tests/support/controlled_time.h"
#include "tests/support/device_root_test.h"
#include "tests/support/scripted_daemon.h"

namespace velkor::appindex::elastic {
namespace {

using test::ErrorOf;
using test::Failure;
using test::FailureLine;
using test::Reaction;
using test::Reply;
using test::ScriptedDaemon;
using test::Success;
using test::Time;
using ::testing::AllOf;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

constexpr char kSocket[] = "/var/run/tovoelasticd.sock";
constexpr char kRecvCondition[] =
    "!conn.Recv(resp_raw) || !res.fromString(resp_raw) || !res.isMember(\"success\") || "
    "!res[\"success\"].isBool()";

Json::Value Parse(const std::string& text) {
  Json::Value value;
  EXPECT_TRUE(fromString(value, text)) << text;
  return value;
}

Json::Value Request() { return Parse(R"({"command":"commit","data":{"id":"appindex_enu"}})"); }

Json::Value Exchange() {
  Json::Value response;
  SendRequestImpl(response, Request());
  return response;
}

std::string ErrorOfExchange() {
  return ErrorOf([] { Exchange(); });
}
std::string ErrorOfSendRequest() {
  return ErrorOf([] { SendRequest(Request()); });
}

std::string NotReadyLine(int count) {
  return "elastic_control:74 elastic socket is not ready, retry ... " + std::to_string(count);
}

class ExchangeTest : public test::DeviceRootTest {};
class RetryTest : public test::DeviceRootTest {};

TEST_F(ExchangeTest, SocketFileAbsentForGoodLogsCountsOneToFifteenThenFailsToConnect) {
  EXPECT_EQ(ErrorOfExchange(), "913: Connect failed, req=" + toString(Request()));

  EXPECT_EQ(Time().sleeps, std::vector<unsigned>(15, 1));
  std::vector<std::string> lines;
  for (int count = 1; count <= 15; ++count) lines.push_back(NotReadyLine(count));
  lines.push_back(
      FailureLine("elastic_control", 84, "SendRequestImpl",
                  "Failed [!conn.Connect(kElasticdConnectTimeout)], reason: Connect failed, req=" +
                      toString(Request()) + " [err: No such file or directory]"));
  EXPECT_EQ(TakeLog(), lines);
}

TEST_F(ExchangeTest, SocketFileAppearingAfterThreeSecondsLogsThreeLinesThenExchanges) {
  std::unique_ptr<ScriptedDaemon> daemon;
  Time().on_sleep = [&](unsigned) {
    if (Time().sleeps.size() == 3)
      daemon = std::make_unique<ScriptedDaemon>(std::vector{Success()});
  };

  EXPECT_EQ(Exchange(), Parse(R"({"success":true})"));
  EXPECT_THAT(TakeLog(), ElementsAre(NotReadyLine(1), NotReadyLine(2), NotReadyLine(3)));
  EXPECT_THAT(daemon->Requests(), ElementsAre(Request()));
}

TEST_F(ExchangeTest, SocketFileAppearingInTheLastSecondOfTheWaitIsStillUsed) {
  std::unique_ptr<ScriptedDaemon> daemon;
  Time().on_sleep = [&](unsigned) {
    if (Time().sleeps.size() == 15)
      daemon = std::make_unique<ScriptedDaemon>(std::vector{Success()});
  };

  EXPECT_EQ(ErrorOfExchange(), "nothing");
  EXPECT_THAT(TakeLog(), SizeIs(15));
}

TEST_F(ExchangeTest, AnyFileAtTheSocketPathEndsTheWait) {
  test::WriteFile(kSocket, "no socket");
  EXPECT_EQ(ErrorOfExchange(), "913: Connect failed, req=" + toString(Request()));
  EXPECT_THAT(Time().sleeps, IsEmpty());
}

TEST_F(ExchangeTest, ALinkThatLeadsNowhereAtTheSocketPathIsWaitedFor) {
  ASSERT_EQ(symlink("/var/run/nowhere", kSocket), 0);
  EXPECT_EQ(ErrorOfExchange(), "913: Connect failed, req=" + toString(Request()));
  EXPECT_THAT(Time().sleeps, SizeIs(15));
}

TEST_F(ExchangeTest, AReplyOfSuccessAloneReturnsNormallyWithJustThatMember) {
  ScriptedDaemon daemon({Success()});
  EXPECT_EQ(Exchange(), Parse(R"({"success":true})"));
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(ExchangeTest, FurtherMembersOfAReplyAreKept) {
  const std::string reply = R"({"success":true,"total":3,"error":{"code":1},"hits":[{"id":"a"}]})";
  ScriptedDaemon daemon({Reply(reply)});
  EXPECT_EQ(Exchange(), Parse(reply));
}

TEST_F(ExchangeTest, ALargeRequestArrivesWholeAndUnchanged) {
  Json::Value request = Request();
  request["data"]["text"] = std::string(1 << 20, 'x') + "\n\"\\ 検索 \xF0\x9F\x94\x8D";
  ScriptedDaemon daemon({Success()});
  Json::Value response;
  SendRequestImpl(response, request);
  EXPECT_THAT(daemon.Requests(), ElementsAre(request));
}

TEST_F(ExchangeTest, EveryExchangeHasAConnectionOfItsOwn) {
  ScriptedDaemon daemon;
  for (int i = 0; i < 3; ++i) Exchange();
  EXPECT_EQ(daemon.Connections(), 3);
}

TEST_F(ExchangeTest, ASendThatFailsIs913WithTheSendReason) {
  Json::Value request = Request();
  request["data"]["text"] = std::string(4 << 20, 'x');  // more than a socket takes unread
  ScriptedDaemon daemon({{Reaction::kRejectSend, ""}});
  Json::Value response;
  EXPECT_EQ(ErrorOf([&] { SendRequestImpl(response, request); }),
            "913: Send failed, req=" + toString(request));
}

struct BadReply {
  const char* name;
  Reaction reaction;
};

class BadReplyTest : public test::DeviceRootTest, public ::testing::WithParamInterface<BadReply> {};

TEST_P(BadReplyTest, IsARecvFailure) {
  ScriptedDaemon daemon({GetParam().reaction});
  const std::string reason = "Recv failed, req=" + toString(Request());
  EXPECT_EQ(ErrorOfSendRequest(), "913: " + reason);
  EXPECT_THAT(TakeLog(), ElementsAre(::testing::StartsWith(FailureLine(
                             "elastic_control", 89, "SendRequestImpl",
                             std::string("Failed [") + kRecvCondition + "], reason: " + reason))));
  EXPECT_EQ(daemon.Connections(), 1);
}

INSTANTIATE_TEST_SUITE_P(
    , BadReplyTest,
    ::testing::Values(BadReply{"SuccessIsTheStringYes", Reply(R"({"success":"yes"})")},
                      BadReply{"SuccessIsANumber", Reply(R"({"success":1})")},
                      BadReply{"SuccessIsNull", Reply(R"({"success":null})")},
                      BadReply{"SuccessIsMissing", Reply(R"({"error":{"code":1,"msg":"m"}})")},
                      BadReply{"NotJson", Reply("success")},
                      BadReply{"JsonWithATail", Reply(R"({"success":true} x)")},
                      BadReply{"AnEmptyMessage", Reply("")},
                      BadReply{"JsonThatIsAnArray", Reply(R"(["success"])")},
                      BadReply{"JsonThatIsAString", Reply(R"("success")")},
                      BadReply{"JsonThatIsANumber", Reply("1")},
                      BadReply{"JsonThatIsNull", Reply("null")},
                      BadReply{"NoAnswer", {Reaction::kHangUp, ""}},
                      BadReply{"ATornMessage", {Reaction::kRawBytes, "{\"s"}},
                      BadReply{"AMessageBeyondAllBounds",
                               {Reaction::kRawBytes, "\xFF\xFF\xFF\xFF"}}),
    [](const auto& param_info) { return param_info.param.name; });

TEST_F(ExchangeTest, AReportedFailureCarriesTheDaemonsOwnCodeAndMessage) {
  for (const int code : {609, 601, 606, 611, 1399, 1401, 0, -7, 2147483647}) {
    ScriptedDaemon daemon({Failure(code, "no \"such\" index")});
    EXPECT_EQ(ErrorOfExchange(), std::to_string(code) + ": Request failed, msg=no \"such\" index");
  }
}

TEST_F(ExchangeTest, AReportedFailureWithoutErrnoLogsTheRequest) {
  ScriptedDaemon daemon({Failure(601, "m")});
  errno = 0;
  ErrorOfExchange();
  EXPECT_THAT(TakeLog(), ElementsAre(FailureLine("elastic_control", 94, "SendRequestImpl",
                                                 "Request failed: " + toString(Request()))));
}

TEST_F(ExchangeTest, AReportedFailureWithAnEmptyMessageHasAnEmptyTail) {
  ScriptedDaemon daemon({Failure(601, "")});
  EXPECT_EQ(ErrorOfExchange(), "601: Request failed, msg=");
}

struct BadError {
  const char* name;
  const char* error;   // the "error" member, or nothing
  const char* reason;  // before the data
};

class BadErrorTest : public test::DeviceRootTest, public ::testing::WithParamInterface<BadError> {};

TEST_P(BadErrorTest, IsAJsonErrorWithoutALine) {
  Json::Value reply = Parse(R"({"success":false})");
  if (*GetParam().error != '\0') reply["error"] = Parse(GetParam().error);
  ScriptedDaemon daemon({Reply(toString(reply))});

  EXPECT_EQ(ErrorOfSendRequest(),
            std::string("120: ") + GetParam().reason + AppendData(reply["error"]));
  EXPECT_THAT(TakeLog(), IsEmpty());
  EXPECT_THAT(Time().sleeps, IsEmpty());
}

INSTANTIATE_TEST_SUITE_P(
    , BadErrorTest,
    ::testing::Values(BadError{"NoError", "", "Not an object"},
                      BadError{"ErrorIsAString", R"("busy")", "Not an object"},
                      BadError{"NoCode", R"({"msg":"m"})", "Missing property: code"},
                      BadError{"NoMessage", R"({"code":1400})", "Missing property: msg"},
                      BadError{"NeitherIsMissingTheCodeFirst", "{}", "Missing property: code"},
                      BadError{"CodeIsAString", R"({"code":"608","msg":"m"})", "Not a string"},
                      BadError{"CodeBeyondAnInt", R"({"code":3000000000,"msg":"m"})",
                               "Not a string"},
                      BadError{"MessageIsAnArray", R"({"code":608,"msg":["m"]})", "Not a string"}),
    [](const auto& param_info) { return param_info.param.name; });

TEST_F(RetryTest, Code609IsThrownAtOnce) {
  ScriptedDaemon daemon({Failure(609, "broken")});
  EXPECT_EQ(ErrorOfSendRequest(), "609: Request failed, msg=broken");
  EXPECT_THAT(Time().sleeps, IsEmpty());
  EXPECT_EQ(daemon.Connections(), 1);
}

TEST_F(RetryTest, AnErrorThatIsNotRetriedKeepsItsWholeMessage) {
  ScriptedDaemon daemon({Failure(609, "broken")});
  try {
    SendRequest(Request());
    FAIL() << "no error";
  } catch (const Error& error) {
    EXPECT_STREQ(error.std::runtime_error::what(),
                 "Velkor error, code=609, reason=[Request failed, msg=broken]");
  }
}

class NotReadyTest : public test::DeviceRootTest, public ::testing::WithParamInterface<int> {};

TEST_P(NotReadyTest, IsRetriedEveryThirtySecondsWithoutLimitEachTimeOnANewConnection) {
  constexpr int kAttempts = 100;
  ScriptedDaemon daemon(std::vector<Reaction>(kAttempts, Failure(GetParam(), "not yet")));

  EXPECT_EQ(ErrorOfSendRequest(), "nothing");
  EXPECT_EQ(Time().sleeps, std::vector<unsigned>(kAttempts, 30));
  EXPECT_EQ(daemon.Connections(), kAttempts + 1);
  EXPECT_THAT(daemon.Requests(), AllOf(SizeIs(kAttempts + 1), Each(Request())));
}

TEST_P(NotReadyTest, LogsTheRequestAndTheRetry) {
  ScriptedDaemon daemon({Failure(GetParam(), "not yet")});
  errno = 0;
  SendRequest(Request());
  EXPECT_THAT(TakeLog(),
              ElementsAre(FailureLine("elastic_control", 94, "SendRequestImpl",
                                      "Request failed: " + toString(Request())),
                          "elastic_control:108 DB is not good yet, retry... (Error Code: " +
                              std::to_string(GetParam()) + ")"));
}

INSTANTIATE_TEST_SUITE_P(Code, NotReadyTest, ::testing::Values(607, 608, 610),
                         ::testing::PrintToStringParamName());

TEST_F(RetryTest, Code1400IsRetriedAfterFifteenToNineteenWholeMinutes) {
  Time().rands = {0, 1, 2, 3, 4, 5, 2147483647};
  ScriptedDaemon daemon(std::vector<Reaction>(7, Failure(1400, "busy")));

  EXPECT_EQ(ErrorOfSendRequest(), "nothing");
  EXPECT_THAT(Time().sleeps, ElementsAre(900, 960, 1020, 1080, 1140, 900, 1020));
  EXPECT_THAT(Time().rands, IsEmpty());
  EXPECT_EQ(daemon.Connections(), 8);
}

TEST_F(RetryTest, Code1400LogsTheRequestAndThatTheDaemonIsBusy) {
  ScriptedDaemon daemon({Failure(1400, "busy")});
  errno = 0;
  SendRequest(Request());
  EXPECT_THAT(TakeLog(), ElementsAre(FailureLine("elastic_control", 94, "SendRequestImpl",
                                                 "Request failed: " + toString(Request())),
                                     "elastic_control:114 Retry since tovoelasticd is busy"));
}

TEST_F(RetryTest, AFailureAfterRetriesEndsThem) {
  Time().rands = {2};
  ScriptedDaemon daemon({Failure(1400, "busy"), Failure(607, "starting"), Failure(601, "none")});
  EXPECT_EQ(ErrorOfSendRequest(), "601: Request failed, msg=none");
  EXPECT_THAT(Time().sleeps, ElementsAre(1020, 30));
}

TEST_F(RetryTest, ATransportFailureAfterARetryIsThrown) {
  ScriptedDaemon daemon({Failure(610, "not yet"), Reply("gone mad")});
  EXPECT_EQ(ErrorOfSendRequest(), "913: Recv failed, req=" + toString(Request()));
}

TEST_F(RetryTest, EachRetryWaitsForTheSocketFileAnew) {
  ScriptedDaemon daemon({Failure(608, "restarting")});
  Time().on_sleep = [](unsigned seconds) {
    if (seconds == 30) std::rename(kSocket, "/var/run/away");
    if (seconds == 1 && Time().sleeps.size() == 3) std::rename("/var/run/away", kSocket);
  };

  EXPECT_EQ(ErrorOfSendRequest(), "nothing");
  EXPECT_THAT(Time().sleeps, ElementsAre(30, 1, 1));
  const std::vector<std::string> lines = TakeLog();
  ASSERT_THAT(lines, SizeIs(4));
  EXPECT_EQ(lines[2], NotReadyLine(1));
  EXPECT_EQ(lines[3], NotReadyLine(2));
}

}  // namespace
}  // namespace velkor::appindex::elastic
