// The complete log lines of an exchange, with errno and the connection in the test's hands.
#include <gmock/gmock.h>
#include <json/value.h>

#include <cerrno>
#include <new>
#include <string>

#include "appindex/elastic_control_internal.h"
#include "appindex/utilities/json_helpers.h"
#include "error_of.h"
#include "system_calls.h"
#include "tests/support/controlled_time.h"
#include "tests/support/device_root_test.h"
#include "tests/support/fake_connection.h"

namespace velkor::appindex::elastic {
namespace {

using test::Calls;
using test::Connections;
using test::ErrorOf;
using test::FailureLine;
using test::Time;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

constexpr char kSocket[] = "/var/run/tovoelasticd.sock";
constexpr char kDaemonFailure[] = R"({"success":false,"error":{"code":601,"msg":"none"}})";

Json::Value Request() {
  Json::Value request;
  request["command"] = "commit";
  return request;
}

// A way for an exchange to fail, and what is logged then behind the function's name.
struct Site {
  const char* name;
  void (*arrange)();
  int line;
  std::string text;
  std::string error;  // as ErrorOf gives it
};

Site CheckSite(const char* name, void (*arrange)(), int line, const std::string& condition,
               const std::string& reason_start) {
  const std::string reason = reason_start + toString(Request());
  return {name, arrange, line, "Failed [" + condition + "], reason: " + reason, "913: " + reason};
}

const std::string& RecvCondition() {
  static const std::string condition =
      "!conn.Recv(resp_raw) || !res.fromString(resp_raw) || !res.isMember(\"success\") || "
      "!res[\"success\"].isBool()";
  return condition;
}

class SiteTest : public test::DeviceRootTest, public ::testing::WithParamInterface<Site> {
 protected:
  SiteTest() {
    test::WriteFile(kSocket, "");
    GetParam().arrange();
  }

  static std::string ErrorWithErrno(int error) {
    return ErrorOf([error] {
      Json::Value response;
      errno = error;
      SendRequestImpl(response, Request());
    });
  }
  static std::string Line(const std::string& tail) {
    return FailureLine("elastic_control", GetParam().line, "SendRequestImpl",
                       GetParam().text + tail);
  }
};

TEST_P(SiteTest, LogsThePlainLineWhenErrnoIsZero) {
  EXPECT_EQ(ErrorWithErrno(0), GetParam().error);
  EXPECT_THAT(TakeLog(), ElementsAre(Line("")));
}

TEST_P(SiteTest, LogsStaleErrnoAndClearsIt) {
  EXPECT_EQ(ErrorWithErrno(ENOENT), GetParam().error);
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(Line(" [err: No such file or directory]")));
}

TEST_P(SiteTest, ClosesItsConnection) {
  ErrorWithErrno(0);
  EXPECT_THAT(Connections().paths, SizeIs(1));
  EXPECT_EQ(Connections().connected, 0);
}

INSTANTIATE_TEST_SUITE_P(
    , SiteTest,
    ::testing::Values(CheckSite(
                          "Connect", [] { Connections().connects = false; }, 84,
                          "!conn.Connect(kElasticdConnectTimeout)", "Connect failed, req="),
                      CheckSite(
                          "Send", [] { Connections().sends = false; }, 86,
                          "!conn.Send(req.toString())", "Send failed, req="),
                      CheckSite(
                          "RecvEvenIfATextCame", [] { Connections().receives = false; }, 89,
                          RecvCondition(), "Recv failed, req="),
                      CheckSite(
                          "ReplyIsNotJson", [] { Connections().reply = "yes"; }, 89,
                          RecvCondition(), "Recv failed, req="),
                      CheckSite(
                          "ReplyWithoutSuccess", [] { Connections().reply = "{}"; }, 89,
                          RecvCondition(), "Recv failed, req="),
                      CheckSite(
                          "SuccessIsNotABool", [] { Connections().reply = R"({"success":"yes"})"; },
                          89, RecvCondition(), "Recv failed, req="),
                      Site{"DaemonReportsFailure", [] { Connections().reply = kDaemonFailure; }, 94,
                           "Request failed: " + toString(Request()),
                           "601: Request failed, msg=none"}),
    [](const auto& param_info) { return param_info.param.name; });

class FakeConnectionTest : public test::DeviceRootTest {};

TEST_F(FakeConnectionTest, ConnectsToTheDaemonsSocketWithTheLongTimeOut) {
  test::WriteFile(kSocket, "");
  SendRequest(Request());
  EXPECT_THAT(Connections().paths, ElementsAre(kSocket));
  EXPECT_THAT(Connections().timeouts, ElementsAre(864000L));
}

TEST_F(FakeConnectionTest, SendsTheRequestsTextAsOneMessageAndReceivesIntoAnEmptyString) {
  test::WriteFile(kSocket, "");
  SendRequest(Request());
  EXPECT_THAT(Connections().sent, ElementsAre(toString(Request())));
  EXPECT_TRUE(Connections().recv_into_empty);
}

TEST_F(FakeConnectionTest, ASuccessfulExchangeClosesItsConnection) {
  test::WriteFile(kSocket, "");
  SendRequest(Request());
  EXPECT_EQ(Connections().connected, 0);
}

TEST_F(FakeConnectionTest, AFailureReplyWithoutACodeClosesItsConnection) {
  test::WriteFile(kSocket, "");
  Connections().reply = R"({"success":false,"error":{"msg":"m"}})";
  EXPECT_EQ(ErrorOf([] { SendRequest(Request()); }),
            "120: Missing property: code, data={\"msg\":\"m\"}");
  EXPECT_EQ(Connections().connected, 0);
}

TEST_F(FakeConnectionTest, AnExceptionThatIsNoErrorPassesThrough) {
  test::WriteFile(kSocket, "");
  Connections().on_send = [] { throw std::bad_alloc(); };
  EXPECT_THROW(SendRequest(Request()), std::bad_alloc);
  EXPECT_EQ(Connections().connected, 0);
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(FakeConnectionTest, SocketFileAbsentForGoodIsCheckedSixteenTimesAndTheConnectIsTried) {
  SendRequest(Request());
  EXPECT_EQ(Calls().access.paths, std::vector<std::string>(16, kSocket));
  EXPECT_THAT(Time().sleeps, SizeIs(15));
  EXPECT_THAT(Connections().timeouts, SizeIs(1));
}

TEST_F(FakeConnectionTest, ASocketFileThatIsThereIsCheckedOnce) {
  test::WriteFile(kSocket, "");
  SendRequest(Request());
  EXPECT_THAT(Calls().access.paths, ElementsAre(kSocket));
}

}  // namespace
}  // namespace velkor::appindex::elastic
