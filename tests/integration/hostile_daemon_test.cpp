// The shipped library and a search daemon that answers as badly as one can: each exchange ends in
// success or in an Error, and the next one goes well.
#include <gmock/gmock.h>
#include <json/value.h>

#include <climits>
#include <map>
#include <string>
#include <vector>

#include "appindex/elastic_control.h"
#include "host/framing.h"
#include "tests/support/controlled_time.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"
#include "tests/unit/appindex/error_of.h"

namespace velkor::appindex {
namespace {

using test::ErrorOf;
using test::Reaction;
using test::Reply;
using test::ScriptedDaemon;
using ::testing::HasSubstr;
using ::testing::StartsWith;

constexpr char kSuccess[] = R"({"success":true})";

std::string Frame(const std::string& text) { return host::FrameHeader(text.size()) + text; }

Reaction Raw(const std::string& bytes) { return {Reaction::kRawBytes, bytes}; }

// A value of each type, at its ends, as JSON texts.
const std::vector<std::string>& Values() {
  static const std::vector<std::string> values = {"null",
                                                  "true",
                                                  "false",
                                                  "0",
                                                  "-1",
                                                  "7",
                                                  "1.5",
                                                  "-0.0",
                                                  "1e300",
                                                  "4294967296",
                                                  "18446744073709551615",
                                                  "-9223372036854775808",
                                                  "\"\"",
                                                  "\"true\"",
                                                  "\"601\"",
                                                  "[]",
                                                  "[true]",
                                                  "[601,\"m\"]",
                                                  "{}",
                                                  "{\"a\":1}"};
  return values;
}

class HostileDaemon : public test::DeviceRootTest {
 protected:
  static std::string ErrorOfCommit() {
    return ErrorOf([] { elastic::IndexCommit("enu"); });
  }

  // What a commit ends in that is answered so; one more, answered well, succeeds.
  std::string ErrorAfter(const Reaction& reaction) {
    ScriptedDaemon daemon({reaction});
    const std::string error = ErrorOfCommit();
    EXPECT_EQ(ErrorOfCommit(), "nothing");
    EXPECT_EQ(daemon.Connections(), 2) << "no reaction is a reason to try again";
    TakeLog();
    return error;
  }

  void ExpectNoReply(const Reaction& reaction, const std::string& what) {
    EXPECT_THAT(ErrorAfter(reaction), StartsWith("913: Recv failed, req=")) << what;
  }
};

// Frames.

TEST_F(HostileDaemon, ReplyInSingleBytesIsReadWhole) {
  EXPECT_EQ(ErrorAfter({Reaction::kOneByOne, Frame(kSuccess)}), "nothing");
  const std::string failure = R"({"success":false,"error":{"code":605,"msg":"disk"}})";
  EXPECT_EQ(ErrorAfter({Reaction::kOneByOne, Frame(failure)}), "605: Request failed, msg=disk");
}

TEST_F(HostileDaemon, ReplyThatEndsInsideItsFrameIsNone) {
  const std::string frame = Frame(kSuccess);
  for (std::size_t cut = 0; cut < frame.size(); ++cut) {
    ExpectNoReply(Raw(frame.substr(0, cut)), "cut at " + std::to_string(cut));
  }
  EXPECT_EQ(ErrorAfter(Raw(frame)), "nothing") << "closed right behind it";
}

TEST_F(HostileDaemon, ConnectionThatEndsInsideTheRequestIsAFailedExchange) {
  const std::size_t size = Frame(R"({"command":"commit","data":{"id":"appindex_enu"}})").size();
  for (std::size_t bytes = 0; bytes <= size; ++bytes) {
    // Whether the end meets the request or the wait for the reply is a matter of luck.
    EXPECT_THAT(ErrorAfter({Reaction::kReadPart, "", bytes}), StartsWith("913: ")) << bytes;
  }
}

TEST_F(HostileDaemon, LengthsBeyondTheLimitAreRefusedAndThoseWithinAreWaitedFor) {
  const std::string most = host::FrameHeader(host::kMaxFrameBytes);
  ExpectNoReply(Raw(std::string("\0\0\0\0", 4)), "no text at all");
  ExpectNoReply(Raw(std::string("\0\0\0\0", 4) + Frame(kSuccess)), "a reply behind none");
  ExpectNoReply(Raw(host::FrameHeader(host::kMaxFrameBytes + 1) + kSuccess), "just over the limit");
  ExpectNoReply(Raw("\x7F\xFF\xFF\xFF"), "the largest number with a sign");
  ExpectNoReply(Raw("\x80\xFF\xFF\xFF"), "a number with a sign");
  ExpectNoReply(Raw("\xFF\xFF\xFF\xFF" + std::string(kSuccess)), "the largest number");
  ExpectNoReply(Raw(most + kSuccess), "the limit, and then the end");
}

TEST_F(HostileDaemon, LongestReplyIsTaken) {
  std::string reply = kSuccess;
  reply.resize(host::kMaxFrameBytes, ' ');
  EXPECT_EQ(ErrorAfter(Reply(reply)), "nothing");
}

TEST_F(HostileDaemon, BytesBehindTheReplyAreNotLookedAt) {
  const std::string failure = R"({"success":false,"error":{"code":605,"msg":"disk"}})";
  EXPECT_EQ(ErrorAfter(Raw(Frame(kSuccess) + "x")), "nothing");
  EXPECT_EQ(ErrorAfter(Raw(Frame(kSuccess) + Frame(failure))), "nothing");
  EXPECT_EQ(ErrorAfter(Raw(Frame(kSuccess) + std::string(100000, '\xFF'))), "nothing");
  EXPECT_EQ(ErrorAfter(Raw(Frame(failure) + Frame(kSuccess))), "605: Request failed, msg=disk");
}

// Texts.

TEST_F(HostileDaemon, ReplyThatIsNotJsonIsNone) {
  for (const std::string& text :
       {std::string("x"), std::string("{"), std::string("\0", 1), std::string(kSuccess) + '\0',
        "\xEF\xBB\xBF" + std::string(kSuccess), std::string(kSuccess) + kSuccess,
        std::string(R"({"success":true,})"), std::string(R"({"success":true,"success":true})"),
        std::string(R"({success:true})"), std::string(R"({"success":True})"),
        std::string("{\"success\":true /* yes */}"), std::string("\xFF\xFE{\0}\0", 6),
        std::string(1000000, '['), std::string(1000000, '{'),
        R"({"success":true,"deep":)" + std::string(500000, '[') + std::string(500000, ']') + "}"}) {
    ExpectNoReply(Reply(text), text.substr(0, 40));
  }
}

TEST_F(HostileDaemon, ReplyOfAnyOtherTypeIsNone) {
  for (const std::string& value : Values()) ExpectNoReply(Reply(value), value);
}

TEST_F(HostileDaemon, SuccessOfAnyTypeButABooleanIsNone) {
  for (const std::string& value : Values()) {
    if (value == "true" || value == "false") continue;
    ExpectNoReply(Reply(R"({"success":)" + value + "}"), value);
  }
  EXPECT_EQ(ErrorAfter(Reply(R"({"success":true})")), "nothing");
}

TEST_F(HostileDaemon, ErrorOfAnyOtherTypeIsAJsonError) {
  for (const std::string& value : Values()) {
    const std::string error = ErrorAfter(Reply(R"({"success":false,"error":)" + value + "}"));
    EXPECT_THAT(error, StartsWith(value[0] == '{' ? "120: Missing property: code, data="
                                                  : "120: Not an object, data="))
        << value;
  }
}

TEST_F(HostileDaemon, CodeIsTakenIfItConvertsToAnInt) {
  const std::map<std::string, int> converted = {{"null", 0}, {"true", 1}, {"false", 0},
                                                {"0", 0},    {"-1", -1},  {"7", 7},
                                                {"1.5", 1},  {"-0.0", 0}};
  for (const std::string& value : Values()) {
    const std::string error =
        ErrorAfter(Reply(R"({"success":false,"error":{"msg":"m","code":)" + value + "}}"));
    const auto code = converted.find(value);
    if (code == converted.end()) {
      EXPECT_THAT(error, StartsWith("120: Not a string, data=")) << value;
    } else {
      EXPECT_EQ(error, std::to_string(code->second) + ": Request failed, msg=m") << value;
    }
  }
}

TEST_F(HostileDaemon, MessageIsTakenIfItConvertsToText) {
  for (const std::string& value : Values()) {
    const std::string error =
        ErrorAfter(Reply(R"({"success":false,"error":{"code":605,"msg":)" + value + "}}"));
    const bool is_container = value[0] == '[' || value[0] == '{';
    EXPECT_THAT(error,
                StartsWith(is_container ? "120: Not a string, data=" : "605: Request failed, msg="))
        << value;
  }
}

TEST_F(HostileDaemon, CodesAtBothEndsOfAnIntArriveAsTheyAre) {
  for (const int code : {INT_MIN, INT_MIN + 1, INT_MAX - 1, INT_MAX}) {
    EXPECT_EQ(ErrorAfter(test::Failure(code, "m")),
              std::to_string(code) + ": Request failed, msg=m");
  }
  for (const char* code : {"-2147483649", "2147483648", "1e10"}) {
    EXPECT_THAT(ErrorAfter(Reply(R"({"success":false,"error":{"msg":"m","code":)" +
                                 std::string(code) + "}}")),
                StartsWith("120: Not a string, data="));
  }
}

TEST_F(HostileDaemon, MessageOfAnyContentIsReportedAndNotInterpreted) {
  EXPECT_EQ(ErrorAfter(test::Failure(605, "%s%n%d")), "605: Request failed, msg=%s%n%d");
  EXPECT_EQ(ErrorAfter(test::Failure(605, "a\nb\x1B[2J")), "605: Request failed, msg=a\nb\x1B[2J");
  const std::string wrong = "{\"success\":false,\"error\":{\"code\":605,\"msg\":\"\xFF\xC3\"}}";
  EXPECT_THAT(ErrorAfter(Reply(wrong)), StartsWith("605: Request failed, msg="));
  const std::string lone = R"({"success":false,"error":{"code":605,"msg":"\udc00\u0000"}})";
  EXPECT_THAT(ErrorAfter(Reply(lone)), StartsWith("605: Request failed, msg="));
  const std::string half = R"({"success":false,"error":{"code":605,"msg":"\ud800"}})";
  ExpectNoReply(Reply(half), "half a surrogate");
  const std::string long_text(host::kMaxFrameBytes / 2, 'm');
  EXPECT_EQ(ErrorAfter(test::Failure(605, long_text)), "605: Request failed, msg=" + long_text);
}

// Answers that pass.

TEST_F(HostileDaemon, ThousandAnswersThatItIsNotReadyOrBusyEndInSuccess) {
  const std::vector<int> codes = {607, 608, 1400, 610};
  std::vector<Reaction> script;
  std::vector<unsigned> pauses;
  for (std::size_t i = 0; i < 1000; ++i) {
    const int code = codes[i % codes.size()];
    script.push_back(test::Failure(code, "later"));
    const auto round = static_cast<int>(i / codes.size());
    if (code == 1400) test::Time().rands.push_back(round);
    pauses.push_back(code == 1400 ? static_cast<unsigned>(15 + round % 5) * 60 : 30);
  }
  ScriptedDaemon daemon(script);
  EXPECT_EQ(ErrorOfCommit(), "nothing");
  EXPECT_EQ(daemon.Connections(), 1001);
  EXPECT_EQ(test::Time().sleeps, pauses);
  EXPECT_EQ(TakeLog().size(), 2000U);
}

}  // namespace
}  // namespace velkor::appindex
