// What a person is told when something fails.
#include "tool/failure.h"

#include <gmock/gmock.h>
#include <unistd.h>

#include <iostream>
#include <string>
#include <utility>
#include <vector>

#include "appindex/error.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"

namespace tool {
namespace {

using ::testing::AllOf;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::MatchesRegex;
using ::testing::Not;
using ::testing::StartsWith;
using velkor::Error;

std::string LineOf(int code, const std::string& reason) {
  return Explain(Error(code, reason)).line;
}

TEST(Explain, UnreachableDaemonIsNamedWithoutTheRequest) {
  const Report report = Explain(Error(913, R"(Connect failed, req={"command":"commit"})"));
  EXPECT_THAT(report.line, AllOf(StartsWith("/var/run/tovoelasticd.sock: "),
                                 HasSubstr("start tovoelasticd"), Not(HasSubstr("commit"))));
  EXPECT_EQ(report.code, 913);
  EXPECT_EQ(report.exit_code, kDaemonUnreachable);
}

// Every failure of the library: one line with the file, as far as one is to blame, the cause and
// what to do.

struct Row {
  int code;
  std::string reason;
  std::string line;  // as root; a regular expression
};

class EveryError : public test::DeviceRootTest, public testing::WithParamInterface<Row> {};

TEST_P(EveryError, IsFileCauseAndAdvice) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: others are told to become it";
  test::MakeDirs("/var/packages/App");
  test::MakeDirs(test::kBatch);
  const Report report = Explain(Error(GetParam().code, GetParam().reason));
  EXPECT_THAT(report.line, MatchesRegex(GetParam().line));
  EXPECT_EQ(report.code, GetParam().code);
  EXPECT_EQ(report.line.find('\n'), std::string::npos);
  EXPECT_THAT(report.line, StartsWith(report.cause + "; "));
  EXPECT_LT(report.cause.size() + 2, report.line.size()) << "no advice";
}

constexpr char kDaemon[] = "/var/run/tovoelasticd.sock: the search daemon ";

std::string Daemon(const std::string& rest) { return kDaemon + rest; }

INSTANTIATE_TEST_SUITE_P(
    , EveryError,
    testing::Values(
        Row{120, "Not a string, data={}",
            "something is not as it must be: Not a string, data=\\{\\}; `appindex lint` checks "
            "descriptors"},
        Row{502, "rename failed, reason=x",
            "/var/packages/Velkor/etc/appindex.queue: the queue cannot be moved aside; the system "
            "log has the cause"},
        Row{502, "Failed to open appindex queue, reason=x",
            "/var/packages/Velkor/etc/appindex.queue.tmp: the batch of requests cannot be read: Is "
            "a directory; put a regular file in its place"},
        Row{502, "opendir failed, path=/var/packages/Gone/",
            "/var/packages/Gone/: the directory cannot be read: No such file or directory; see "
            "whether the path is right"},
        Row{502, "opendir failed, path=/var/packages/App/",
            "/var/packages/App/: the directory cannot be read; try again later"},
        Row{502, "Failed to get unique", "/etc/tovoinfo.conf: the key \"unique\" .*; write it .*"},
        Row{502, "Malformed hb unique: M1",
            "/etc/tovoinfo.conf: \"unique\" is not \"marovant_PLATFORM_MODEL\": M1; correct it"},
        Row{502, "TLIBHbinfoUserAgentGet failed",
            "/etc/os-release: the system's version cannot be read; let it have .*"},
        Row{502, "/var/packages/Velkor/etc/appindex.cfg",
            "/var/packages/Velkor/etc/appindex.cfg: the mode of the file cannot be set; see .*"},
        Row{502, "anything\nelse", "anything else; the system log has the failure"},
        Row{503, "TOVOUserGetByUID failed",
            "the user cannot be switched: TOVOUserGetByUID failed; see to the user database"},
        Row{504, "Cannot load json: /etc/passwd",
            "/etc/passwd: the state file is not JSON; remove it and run `appindex reindex`"},
        Row{504, "Cannot load json: /var/packages",
            "/var/packages: the state file cannot be read: Is a directory; put .* in its place"},
        Row{505, "/no/appindex.cfg",
            "/no/appindex.cfg: the state file cannot be written: No such file or directory; see "
            "whether the path is right"},
        Row{506, "Exceed max retry, path=/tmp/lock",
            "/tmp/lock: another process has held this lock for about half a minute; `appindex "
            "status` names it, try again when it is done"},
        Row{506, "open failed, path=/no/lock, reason=Success",
            "/no/lock: the lock file cannot be opened: No such file or directory; see whether .*"},
        Row{506, "open failed, path=/tmp/lock, reason=Success",
            "/tmp/lock: the lock file cannot be opened; try again later"},
        Row{506, "open failed, path=/etc/passwd, reason=Success",
            "/etc/passwd: the lock file cannot be opened; try again later"},
        Row{506, "open failed, path=/etc/passwd/lock, reason=Success",
            "/etc/passwd/lock: the lock file cannot be opened: Not a directory; see whether .*"},
        Row{506, "open failed, path=/var/packages/App, reason=Success",
            "/var/packages/App: the lock file cannot be opened: Is a directory; put .*"},
        Row{506, "No locks available",
            "a lock cannot be taken: No locks available; try again later"},
        Row{801, "", "the user Velkor, .* cannot be looked up; add it to the user database"},
        Row{913, "Connect failed, req={}",
            Daemon("does not answer; start tovoelasticd and try again")},
        Row{601, "Request failed, msg=no such index: appindex_enu",
            Daemon("has no such index: appindex_enu; run `appindex reindex`")},
        Row{602, "Request failed, msg=index exists: x",
            Daemon("refuses: index exists: x; its lines in the system log may tell more")},
        Row{603, "Request failed, msg=\"id\" must be a string",
            Daemon("refuses: \"id\" must be a string; if it is about a descriptor's texts, "
                   "`appindex lint` shows where")},
        Row{604, "unknown command: x",
            Daemon("refuses: unknown command: x; install the daemon .*")},
        Row{605, "Request failed, msg=disk full",
            Daemon("cannot use an index: disk full; see to the disk, then run `appindex reindex`")},
        Row{606, "Request failed, msg=not permitted",
            Daemon("refuses: not permitted; see what its paths lead through: .*")},
        Row{607, "starting up", Daemon("is starting: starting up; try again soon")},
        Row{610, "x", Daemon("is starting: x; try again soon")},
        Row{609, "x", Daemon("refuses: x; its lines in the system log may tell more")},
        Row{1400, "locked", Daemon("is busy: locked; try again later, nothing is lost")}),
    [](const auto& param_info) {
      return "Code" + std::to_string(param_info.param.code) + "_" +
             std::to_string(param_info.index);
    });

TEST(AdviceOn, IsThereForEveryNumber) {
  for (int error = 0; error < 140; ++error) EXPECT_NE(AdviceOn(error), "") << error;
}

TEST(Explain, OtherUsersAreToldToBecomeRootWhereThatHelps) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: becomes another user";
  ASSERT_EQ(seteuid(65534), 0);
  for (const auto& [code, reason] :
       std::vector<std::pair<int, std::string>>{{503, "x"},
                                                {504, "Cannot load json: /proc/1/mem"},
                                                {505, "/usr/appindex.cfg"},
                                                {506, "open failed, path=/usr/lock, reason=x"},
                                                {606, "x"}}) {
    EXPECT_THAT(LineOf(code, reason), EndsWith("; run appindex as root")) << code;
  }
  EXPECT_EQ(
      LineOf(504, "Cannot load json: /etc/passwd"),
      "/etc/passwd: the state file is not JSON; remove it and run `appindex reindex`, both as "
      "root");
  ASSERT_EQ(seteuid(0), 0);  // who looks for leaks at the end must be who began
}

TEST(Explain, CauseThatTheLibraryLostIsFoundAgain) {
  const std::string line = LineOf(506, "open failed, path=/no/such/dir/lock, reason=Success");
  EXPECT_THAT(line, AllOf(StartsWith("/no/such/dir/lock: "), HasSubstr("No such file or directory"),
                          Not(HasSubstr("Success"))));
}

class ExplainOfALock : public test::DeviceRootTest {};

// It could be opened otherwise.
TEST_F(ExplainOfALock, AnothersFileInASharedDirectoryIsToBlame) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: gives a file away";
  test::WriteFile("/tmp/lock", "");
  ASSERT_EQ(chown("/tmp/lock", 1001, 100), 0);
  EXPECT_THAT(
      LineOf(506, "open failed, path=/tmp/lock, reason=Success"),
      AllOf(StartsWith("/tmp/lock: the lock file cannot be opened: it belongs to user 1001"),
            EndsWith("; remove it")));
}

TEST(Explain, LongReasonsAreCutAndStayOnOneLine) {
  const std::string line = LineOf(120, "Not a string, data=\n" + std::string(5000, 'x'));
  EXPECT_LT(line.size(), 500U);
  EXPECT_THAT(line, Not(HasSubstr("\n")));
}

TEST(Explain, OwnFailuresAreGivenAsTheyAre) {
  const Report report = Explain(Failure("/a: gone", kNothingFound, 120));
  EXPECT_EQ(report.line, "/a: gone");
  EXPECT_EQ(report.exit_code, kNothingFound);
  EXPECT_EQ(report.code, 120);
  EXPECT_EQ(Explain(std::runtime_error("other")).code, 0);
}

TEST(Explain, OwnFailuresAreCauseAndAdvice) {
  const Report report = Explain(Failure("/a: gone", "bring it back", kNothingFound, 120));
  EXPECT_EQ(report.line, "/a: gone; bring it back");
  EXPECT_EQ(report.cause, "/a: gone");
  EXPECT_EQ(report.exit_code, kNothingFound);
  EXPECT_EQ(report.code, 120);
}

TEST(ReportFailure, IsJsonTooWithACodeWhereThereIsOne) {
  Context context;
  context.json = true;
  const auto written = [&](int code) {
    testing::internal::CaptureStderr();
    testing::internal::CaptureStdout();
    ReportFailure(context, Failure("/a: gone", "bring it back", kFailed, code));
    std::cout.flush();
    return testing::internal::GetCapturedStderr() + testing::internal::GetCapturedStdout();
  };
  EXPECT_EQ(written(0),
            "appindex: /a: gone; bring it back\n"
            R"({"error":{"message":"/a: gone; bring it back"}})"
            "\n");
  EXPECT_EQ(written(120),
            "appindex: /a: gone; bring it back (code 120)\n"
            R"({"error":{"code":120,"message":"/a: gone; bring it back"}})"
            "\n");
}

TEST(ReportFailure, IsOneLineWhateverThePathHolds) {
  testing::internal::CaptureStderr();
  EXPECT_EQ(ReportFailure(Context(), Failure("/a\nb\033[2J: gone", "bring it back")), kFailed);
  EXPECT_EQ(testing::internal::GetCapturedStderr(), "appindex: /a b [2J: gone; bring it back\n");
}

}  // namespace
}  // namespace tool
