// appindex in a terminal: its progress, its emphasis, and its end in the middle of the work.
#include <gmock/gmock.h>

#include <algorithm>
#include <csignal>
#include <memory>
#include <sstream>

#include "tests/integration/real_device.h"
#include "tests/tool/daemon_gate.h"
#include "tests/tool/tool_process.h"

namespace test {
namespace {

using ::testing::ContainsRegex;
using ::testing::Each;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::SizeIs;

constexpr char kEraseToEnd[] = "\033[K";
constexpr char kCtrlC[] = "\003";
constexpr int kUsual = 80;
constexpr int kNarrow = 30;

class Terminal : public RealDeviceTest {
 protected:
  Outside Here() const { return {OutsideRootFd(), OutsidePath()}; }

  void Rebuild() const { ASSERT_EQ(RunTool(Here(), {"reindex"}).status, 0); }
};

// What was drawn over and over, in order.
std::vector<std::string> Frames(const std::string& output) {
  std::vector<std::string> frames;
  std::istringstream stream(output);
  std::string frame;
  while (std::getline(stream, frame, '\r')) {
    const std::size_t end = frame.find(kEraseToEnd);
    if (end != std::string::npos && end > 0) frames.push_back(frame.substr(0, end));
  }
  return frames;
}

// Nothing of the terminal is left otherwise than it was.
void ExpectRestored(const ToolInTerminal& tool, const termios& before) {
  const termios now = tool.Settings();
  EXPECT_EQ(now.c_lflag, before.c_lflag);
  EXPECT_EQ(now.c_iflag, before.c_iflag);
  EXPECT_EQ(now.c_oflag, before.c_oflag);
  EXPECT_THAT(tool.Output(), EndsWith("\n"));
  EXPECT_THAT(tool.Output(), Not(HasSubstr("\033[?"))) << "a mode of the terminal was changed";
}

TEST_F(Terminal, ProgressShowsBarAndCountsAndWhatIsWorkedOn) {
  Rebuild();
  ToolInTerminal tool(Here(), kUsual, {"add", "/var/packages/Photos"});
  EXPECT_EQ(tool.Wait(), 0);
  const std::vector<std::string> frames = Frames(tool.Output());
  ASSERT_THAT(frames, Not(IsEmpty()));
  EXPECT_EQ(frames.front(), "[--------------------]   0%   0/21");
  EXPECT_THAT(frames.back(), HasSubstr("[####################] 100%  21/21"));
  EXPECT_THAT(frames.back(), EndsWith("/s  0 s left  Photos trk"));
  EXPECT_THAT(tool.Output(), HasSubstr(std::string("\r") + kEraseToEnd + "Wrote 21 documents in"));
}

TEST_F(Terminal, ProgressOfTheQueueTellsTheRequest) {
  Rebuild();
  ASSERT_EQ(
      RunTool(Here(), {"enqueue", "add", "/var/packages/Photos", "/var/packages/Backup"}).status,
      0);
  ToolInTerminal tool(Here(), kUsual, {"process-queue"});
  EXPECT_EQ(tool.Wait(), 0);
  EXPECT_THAT(tool.Output(), HasSubstr("1 of 2: Backup trk"));
  EXPECT_THAT(tool.Output(), HasSubstr("2 of 2: Photos trk"));
}

TEST_F(Terminal, WaitForAnotherWorkerOfTheQueueIsTold) {
  auto lock = std::make_unique<velkor::LockFile>(kProcessLock, true);
  ToolInTerminal tool(Here(), kUsual, {"process-queue"});
  ASSERT_TRUE(tool.ReadUntil("\rwaiting for another process that works the queue"));
  lock.reset();
  EXPECT_EQ(tool.Wait(), 0);
  EXPECT_THAT(tool.Output(), EndsWith(std::string("\r") + kEraseToEnd + "Nothing was queued\r\n"));
}

TEST_F(Terminal, NarrowTerminalGetsAShortLine) {
  Rebuild();
  ToolInTerminal tool(Here(), kNarrow, {"add", "/var/packages/Photos"});
  EXPECT_EQ(tool.Wait(), 0);
  const std::vector<std::string> frames = Frames(tool.Output());
  ASSERT_THAT(frames, Not(IsEmpty()));
  EXPECT_EQ(frames.front(), "  0%   0/21");
  EXPECT_THAT(frames.back(), HasSubstr("100%  21/21"));
  EXPECT_THAT(frames, Each(SizeIs(testing::Lt(std::size_t{kNarrow}))));
}

TEST_F(Terminal, ProgressFollowsTheTerminalsWidth) {
  Rebuild();
  DaemonGate gate(1);
  ToolInTerminal tool(Here(), kUsual, {"add", "/var/packages/Photos"});
  gate.AwaitHeld();
  ASSERT_TRUE(tool.ReadUntil("0/21"));
  tool.Resize(kNarrow);
  gate.Open();
  EXPECT_EQ(tool.Wait(), 0);
  const std::vector<std::string> frames = Frames(tool.Output());
  EXPECT_THAT(frames.front(), HasSubstr("[----"));
  EXPECT_LT(frames.back().size(), std::size_t{kNarrow});
}

TEST_F(Terminal, WithoutATerminalThereIsNoProgress) {
  Rebuild();
  const Finished finished = RunTool(Here(), {"add", "/var/packages/Photos"});
  EXPECT_EQ(finished.status, 0);
  EXPECT_EQ(finished.out, "");
  EXPECT_THAT(finished.err, testing::MatchesRegex("Wrote 21 documents in [0-9.]+ s: [^\r\033]+\n"));
}

TEST_F(Terminal, QuietShowsNothing) {
  Rebuild();
  ToolInTerminal tool(Here(), kUsual, {"--quiet", "add", "/var/packages/Photos"});
  EXPECT_EQ(tool.Wait(), 0);
  EXPECT_EQ(tool.Output(), "");
}

TEST_F(Terminal, DumbTerminalGetsNoControlSequences) {
  Rebuild();
  ToolInTerminal tool(Here(), kUsual, {"add", "/var/packages/Photos"}, {{"TERM", "dumb"}});
  EXPECT_EQ(tool.Wait(), 0);
  EXPECT_THAT(tool.Output(), Not(HasSubstr("\033")));
}

TEST_F(Terminal, SearchEmphasisesWhatMatches) {
  Rebuild();
  ToolInTerminal tool(Here(), kUsual, {"search", "--lang", "ger", "foto"});
  EXPECT_EQ(tool.Wait(), 0);
  EXPECT_THAT(tool.Output(), HasSubstr("1. \033[1mFoto\033[0malbum"));
}

TEST_F(Terminal, SearchEmphasisesFormsAndWhatSlipsMean) {
  Rebuild();
  for (const char* typed : {"photos", "phtoo"}) {
    ToolInTerminal tool(Here(), kUsual, {"search", "--lang", "enu", typed});
    EXPECT_EQ(tool.Wait(), 0);
    EXPECT_THAT(tool.Output(), HasSubstr("1. \033[1mPhoto\033[0m Album")) << typed;
    EXPECT_THAT(tool.Output(), Not(HasSubstr("score"))) << "nobody asked for explanations";
  }
}

TEST_F(Terminal, SearchEmphasisesWhatKeywordsWereFoundBy) {
  InstallPackage("Mail", {{"enu", "Photo Post"}});
  WriteFile(ConfOf("Mail"), R"({"app":"Mail","title":"app:title","keywords":["photos","pics"]})");
  Rebuild();
  ToolInTerminal tool(Here(), kUsual, {"search", "--lang", "enu", "photos"});
  EXPECT_EQ(tool.Wait(), 0);
  EXPECT_THAT(tool.Output(), HasSubstr("\033[1mPhoto\033[0m Post"));
}

TEST_F(Terminal, DescriptionsAreWrappedToTheTerminal) {
  WriteFile(
      ConfOf("Notes"),
      R"({"app":"Notes","title":"Notebook","desc":"Keeps notes and lists, and finds them."})");
  Rebuild();
  for (const int columns : {kNarrow, 5, 1}) {  // the latter have no room beside the indent
    ToolInTerminal tool(Here(), columns, {"search", "--lang", "enu", "notebook"});
    EXPECT_EQ(tool.Wait(), 0);
    EXPECT_THAT(
        tool.Output(),
        HasSubstr(columns == kNarrow ? "     Keeps notes and lists,\r\n     and finds them.\r\n"
                                     : "     Keeps\r\n     notes\r\n     and\r\n"))
        << columns;
  }
}

TEST_F(Terminal, EmptyNoColorTakesNothing) {
  Rebuild();
  ToolInTerminal tool(Here(), kUsual, {"search", "--lang", "ger", "foto"}, {{"NO_COLOR", ""}});
  EXPECT_EQ(tool.Wait(), 0);
  EXPECT_THAT(tool.Output(), HasSubstr("\033[1mFoto\033[0malbum"));
}

TEST_F(Terminal, WithoutAWidthHasTheUsualOne) {
  Rebuild();
  ToolInTerminal tool(Here(), 0, {"add", "/var/packages/Photos"});
  EXPECT_EQ(tool.Wait(), 0);
  const std::vector<std::string> frames = Frames(tool.Output());
  ASSERT_THAT(frames, Not(IsEmpty()));
  EXPECT_EQ(frames.front(), "[--------------------]   0%   0/21");
}

TEST_F(Terminal, NoColorTakesTheEmphasisAndLeavesTheProgress) {
  Rebuild();
  const Environment no_color = {{"NO_COLOR", "1"}};
  ToolInTerminal search(Here(), kUsual, {"search", "--lang", "ger", "foto"}, no_color);
  EXPECT_EQ(search.Wait(), 0);
  EXPECT_THAT(search.Output(), HasSubstr("1. Fotoalbum"));
  EXPECT_THAT(search.Output(), Not(HasSubstr("\033")));

  ToolInTerminal add(Here(), kUsual, {"add", "/var/packages/Photos"}, no_color);
  EXPECT_EQ(add.Wait(), 0);
  EXPECT_THAT(add.Output(), HasSubstr("100%  21/21"));
  EXPECT_THAT(add.Output(), Not(ContainsRegex("\033\\[[0-9;]*m")));
}

TEST_F(Terminal, CtrlCInReindexSaysWhatIsLeftAndTheNextOneMendsIt) {
  Rebuild();
  {
    DaemonGate gate(30);
    ToolInTerminal tool(Here(), kUsual, {"reindex"});
    const termios before = tool.Settings();
    gate.AwaitHeld();
    tool.Type(kCtrlC);
    EXPECT_EQ(tool.Wait(), 128 + SIGINT);
    EXPECT_THAT(tool.Output(), HasSubstr("\r\nappindex: interrupted; the index is incomplete until "
                                         "`appindex reindex` has run to its end\r\n"));
    ExpectRestored(tool, before);
  }
  EXPECT_NE(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Photos"}));
  Rebuild();
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Photos"}));
}

TEST_F(Terminal, CtrlCInProcessQueueLosesNoRequest) {
  Rebuild();
  InstallPackage("Mail", {{"enu", "Mail Server"}});
  ASSERT_EQ(RunTool(Here(), {"enqueue", "add", "/var/packages/Mail"}).status, 0);
  {
    DaemonGate gate(10);
    ToolInTerminal tool(Here(), kUsual, {"process-queue"});
    const termios before = tool.Settings();
    gate.AwaitHeld();
    EXPECT_EQ(RunTool(Here(), {"enqueue", "del", "/var/packages/Photos"}).status, 0);
    tool.Type(kCtrlC);
    EXPECT_EQ(tool.Wait(), 128 + SIGINT);
    EXPECT_THAT(tool.Output(), HasSubstr("appindex: interrupted; no request is lost"));
    ExpectRestored(tool, before);
  }
  EXPECT_TRUE(Exists(kBatch));
  EXPECT_TRUE(Exists(kQueue));
  EXPECT_EQ(RunTool(Here(), {"process-queue"}).status, 0);
  EXPECT_FALSE(Exists(kBatch));
  EXPECT_FALSE(Exists(kQueue));
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Mail"}));
}

TEST_F(Terminal, SigtermIsTreatedAsCtrlC) {
  Rebuild();
  DaemonGate gate(5);
  ToolInTerminal tool(Here(), kUsual, {"add", "/var/packages/Photos"});
  gate.AwaitHeld();
  tool.Signal(SIGTERM);
  EXPECT_EQ(tool.Wait(), 128 + SIGTERM);
  EXPECT_THAT(tool.Output(), HasSubstr("interrupted; a part of the documents is written"));
}

TEST_F(Terminal, SigtermWithoutProgressIsOneLine) {
  Rebuild();
  DaemonGate gate(5);
  ToolInTerminal tool(Here(), kUsual, {"--quiet", "add", "/var/packages/Photos"});
  gate.AwaitHeld();
  tool.Signal(SIGTERM);
  EXPECT_EQ(tool.Wait(), 128 + SIGTERM);
  EXPECT_THAT(tool.Output(), testing::StartsWith("appindex: interrupted; "));
}

TEST_F(Terminal, HangUpThatWasIgnoredBeforeStaysIgnored) {
  Rebuild();
  ASSERT_NE(std::signal(SIGHUP, SIG_IGN), SIG_ERR);  // as nohup does
  DaemonGate gate(5);
  ToolInTerminal tool(Here(), kUsual, {"add", "/var/packages/Photos"});
  gate.AwaitHeld();
  tool.Signal(SIGHUP);
  gate.Open();
  EXPECT_EQ(tool.Wait(), 0);
  EXPECT_THAT(tool.Output(), HasSubstr("Wrote 21 documents in"));
}

TEST_F(Terminal, FailureWipesTheProgressAndIsOneLine) {
  Rebuild();
  WriteFile(ConfOf("Broken"), R"({"app":["no text"],"title":"Broken"})");
  ToolInTerminal tool(Here(), kUsual, {"add", "/var/packages/Broken"});
  EXPECT_EQ(tool.Wait(), 1);
  const std::size_t end = tool.Output().rfind(kEraseToEnd);
  ASSERT_NE(end, std::string::npos);
  const std::string line = tool.Output().substr(end + sizeof(kEraseToEnd) - 1);
  EXPECT_THAT(line, testing::StartsWith("appindex: " + ConfOf("Broken") + ": "));
  EXPECT_THAT(line, EndsWith("(code 120)\r\n"));
  EXPECT_EQ(std::count(line.begin(), line.end(), '\n'), 1);
}

}  // namespace
}  // namespace test
