// What a person is told when something fails.
#include "tool/failure.h"

#include <gmock/gmock.h>

#include "appindex/error.h"

namespace tool {
namespace {

using ::testing::AllOf;
using ::testing::EndsWith;
using ::testing::HasSubstr;
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

TEST(Explain, EachKindOfErrorSaysWhatToDo) {
  EXPECT_THAT(LineOf(601, "Request failed, msg=no such index: appindex_enu"),
              AllOf(HasSubstr("no such index: appindex_enu"), HasSubstr("run `appindex reindex`")));
  EXPECT_THAT(LineOf(605, "Request failed, msg=disk full"), HasSubstr("see to the disk"));
  EXPECT_THAT(LineOf(606, "Request failed, msg=not permitted"),
              HasSubstr("refuses: not permitted"));
  EXPECT_THAT(LineOf(603, "Request failed, msg=\"id\" must be a string"),
              EndsWith("refuses: \"id\" must be a string"));
  EXPECT_THAT(
      LineOf(506, "Exceed max retry, path=/tmp/velkor_appindex_process.lck"),
      AllOf(StartsWith("/tmp/velkor_appindex_process.lck: "), HasSubstr("appindex status")));
  EXPECT_THAT(LineOf(502, "opendir failed, path=/var/packages/"), StartsWith("/var/packages/: "));
  EXPECT_THAT(LineOf(502, "Failed to get unique"), StartsWith("/etc/tovoinfo.conf: "));
  EXPECT_THAT(
      LineOf(505, "/var/packages/Velkor/etc/appindex.cfg"),
      StartsWith("/var/packages/Velkor/etc/appindex.cfg: the state file cannot be written"));
}

TEST(Explain, CauseThatTheLibraryLostIsFoundAgain) {
  const std::string line = LineOf(506, "open failed, path=/no/such/dir/lock, reason=Success");
  EXPECT_THAT(line, AllOf(StartsWith("/no/such/dir/lock: "), HasSubstr("No such file or directory"),
                          Not(HasSubstr("Success"))));
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

}  // namespace
}  // namespace tool
