// The state of everything as people and programs read it: its width, and how far the search daemon
// answers.
#include <gmock/gmock.h>

#include <sstream>

#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"
#include "tests/unit/tool/status_test_device.h"

namespace tool {
namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::Not;

constexpr std::size_t kColumns = 80;

class StatusTextTest : public StatusTestDevice {};

TEST_F(StatusTextTest, ProblemsStayWithinTheColumns) {
  const std::string word(200, 'x');
  test::WriteFile(test::ConfOf("Broken"),
                  R"({"app":["no text and more words", ")" + word + R"("],"title":"Broken"})");
  test::WriteFile("/var/packages/Velkor/etc/appindex.cfg", "{");
  test::WriteFile(test::kBatch, test::Request(1, test::ConfOf("Broken")) + "\n");
  const std::string text = Text();
  std::istringstream lines(text);
  std::string line;
  while (std::getline(lines, line)) EXPECT_LE(line.size(), kColumns) << line;
  EXPECT_THAT(text, HasSubstr("xxx~"));
  EXPECT_THAT(text, HasSubstr("`appindex lint`")) << "nothing is lost behind a long word";
  EXPECT_THAT(text, HasSubstr("(code 120)\n"));
}

TEST_F(StatusTextTest, LongPathsStayWhole) {
  const std::string path = test::ConfOf(std::string(100, 'P'));
  test::WriteFile(path, R"({"app":["no text"],"title":"Broken"})");
  test::WriteFile(test::kBatch, "{\"op\":3}\n");
  EXPECT_THAT(Text(), HasSubstr("\n                ! " + path + ":\n"));
}

TEST_F(StatusTextTest, DaemonThatIsNotThereDoesNotAnswer) {
  EXPECT_THAT(Text(), HasSubstr("Search daemon   does not answer\n"
                                "                ! /var/run/tovoelasticd.sock: the search daemon "
                                "does not answer:"));
  const Json::Value data = Data();
  EXPECT_FALSE(data["daemon"]["reachable"].asBool());
  EXPECT_FALSE(data["daemon"].isMember("code"));
  EXPECT_FALSE(data.isMember("even")) << "it is not known";
}

TEST_F(StatusTextTest, RefusalIsAnAnswerAndToldWithItsCode) {
  const test::Reaction refusal = test::Failure(605, "the registry cannot be read");
  const test::ScriptedDaemon daemon({refusal, refusal});
  EXPECT_THAT(Text(),
              AllOf(HasSubstr("Search daemon   refuses\n"), HasSubstr("the registry cannot be"),
                    HasSubstr("(code 605)"), Not(HasSubstr("does not answer"))));
  const Json::Value data = Data();
  EXPECT_TRUE(data["daemon"]["reachable"].asBool());
  EXPECT_THAT(data["daemon"]["problem"].asString(), HasSubstr("the registry cannot be read"));
  EXPECT_EQ(data["daemon"]["code"].asInt(), 605);
  EXPECT_FALSE(data.isMember("even"));
}

TEST_F(StatusTextTest, EvenIsToldOfWhatTheDaemonLists) {
  const test::ScriptedDaemon daemon({test::Reply(R"({"success":true,"indexes":[]})")});
  EXPECT_TRUE(Data()["even"].asBool());
}

}  // namespace
}  // namespace tool
