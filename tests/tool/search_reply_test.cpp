// appindex search, and show, beside a daemon whose replies are not as they must be.
#include <gmock/gmock.h>

#include <algorithm>
#include <ostream>
#include <string>
#include <vector>

#include "appindex/utilities/json_helpers.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"
#include "tests/tool/tool_process.h"

namespace test {
namespace {

using ::testing::AllOf;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::StartsWith;

constexpr char kGood[] = R"({"success":true,"total":1,"matched":"prefix","cut":true,"hits":[
    {"id":"Notes","owner":"","title":"Notes","desc":"Keeps them","score":80.1,"explain":[
        {"text":"note","member":"title","found":"beginning","worth":50}]}]})";

// A member of the reply, and of the values below those that it may have.
struct Row {
  const char* name;
  const char* place;
  std::vector<std::string> may_be;
  friend void PrintTo(const Row& row, std::ostream* out) { *out << row.place; }
};

const std::vector<std::string> kValues = {"null",      "true", "-1", "1.5", "7",
                                          R"("text")", "[]",   "{}", "[7]", "[[]]"};

class SearchReply : public DeviceRootTest {
 protected:
  // The reply in whose place of that path `text` stands.
  static std::string With(const std::string& place, const std::string& text) {
    Json::Value reply = Parse(kGood);
    velkor::fromString(Json::Path(place).make(reply), text);
    return velkor::toString(reply);
  }

  // What appindex ends with that gets this reply.
  Finished Run(const std::string& reply, const std::vector<std::string>& arguments) const {
    const ScriptedDaemon daemon({Reply(reply)});
    return RunTool({OutsideRootFd(), OutsidePath()}, arguments);
  }

  // The line that it ends with, which is one, and says what is wrong.
  static void ExpectNonsense(const Finished& finished, const std::string& reply) {
    EXPECT_EQ(finished.status, 4) << reply;
    EXPECT_EQ(std::count(finished.err.begin(), finished.err.end(), '\n'), 1) << finished.err;
    EXPECT_THAT(finished.err, AllOf(StartsWith(std::string("appindex: ") + kSocket),
                                    HasSubstr("an answer that makes no sense: "),
                                    HasSubstr("; install the daemon that belongs to this appindex"),
                                    EndsWith(" (code 913)\n")));
  }
};

class WrongType : public SearchReply, public testing::WithParamInterface<Row> {};

TEST_P(WrongType, EndsWith4AndALineThatNamesTheMember) {
  for (const std::string& value : kValues) {
    const std::string reply = With(GetParam().place, value);
    const Finished finished = Run(reply, {"search", "--explain", "note"});
    if (std::count(GetParam().may_be.begin(), GetParam().may_be.end(), value) != 0) {
      EXPECT_EQ(finished.status, 0) << reply << finished.err;
    } else {
      ExpectNonsense(finished, reply);
      EXPECT_EQ(finished.out, "") << "a part of it is shown";
    }
  }
}

TEST_P(WrongType, IsToldInJsonToo) {
  const std::string reply = With(GetParam().place, "[[]]");
  const Finished finished = Run(reply, {"--json", "search", "note"});
  ExpectNonsense(finished, reply);
  EXPECT_EQ(Parse(finished.out)["error"]["code"].asInt(), 913);
}

const std::vector<std::string> kTexts = {R"("text")"};
const std::vector<std::string> kNumbers = {"-1", "1.5", "7"};

INSTANTIATE_TEST_SUITE_P(
    , WrongType,
    testing::Values(Row{"total", ".total", {"7"}}, Row{"hits", ".hits", {"[]"}},
                    Row{"matched", ".matched", kTexts}, Row{"cut", ".cut", {"true"}},
                    Row{"hit", ".hits[0]", {}}, Row{"id", ".hits[0].id", kTexts},
                    Row{"title", ".hits[0].title", kTexts}, Row{"desc", ".hits[0].desc", kTexts},
                    Row{"score", ".hits[0].score", kNumbers},
                    Row{"explain", ".hits[0].explain", {"[]"}},
                    Row{"part", ".hits[0].explain[0]", {}},
                    Row{"text", ".hits[0].explain[0].text", kTexts},
                    Row{"member", ".hits[0].explain[0].member", kTexts},
                    Row{"found", ".hits[0].explain[0].found", kTexts},
                    Row{"worth", ".hits[0].explain[0].worth", kNumbers}),
    [](const auto& row) { return std::string(row.param.name); });

TEST_F(SearchReply, NamesTheMember) {
  for (const auto& [place, line] : std::vector<std::pair<std::string, std::string>>{
           {".total", "\"total\" is not a count; "},
           {".hits[0]", "one of \"hits\" is not an object; "},
           {".hits[0].id", "\"id\" is not a text; "},
           {".hits[0].explain[0]", "one of \"explain\" is not an object; "}}) {
    EXPECT_THAT(Run(With(place, "[7]"), {"search", "note"}).err, HasSubstr(line));
  }
}

TEST_F(SearchReply, NeedsWhatIsShownOfEveryHitAndNoMore) {
  for (const char* name : {"total", "hits", "matched", "cut"}) {
    Json::Value reply = Parse(kGood);
    reply.removeMember(name);
    const Finished finished = Run(velkor::toString(reply), {"search", "note"});
    const bool is_needed = name == std::string("total") || name == std::string("hits");
    EXPECT_EQ(finished.status, is_needed ? 4 : 0) << name;
  }
  for (const char* name : {"id", "owner", "title", "desc", "score", "explain"}) {
    Json::Value reply = Parse(kGood);
    reply["hits"][0].removeMember(name);
    const Finished finished = Run(velkor::toString(reply), {"search", "--explain", "note"});
    const bool is_needed = name == std::string("id") || name == std::string("score");
    EXPECT_EQ(finished.status, is_needed ? 4 : 0) << name;
  }
}

TEST_F(SearchReply, IsNotAskedForByShow) {
  ScriptedDaemon daemon([](const Json::Value&) { return Reply("nonsense"); });
  Install("App");
  const Finished finished =
      RunTool({OutsideRootFd(), OutsidePath()}, {"--json", "show", ConfOf("App")});
  EXPECT_EQ(finished.status, 0) << finished.err;
  EXPECT_EQ(Parse(finished.out)["descriptors"][0]["documents"].size(), 21U);
  EXPECT_EQ(daemon.Connections(), 0);
}

}  // namespace
}  // namespace test
