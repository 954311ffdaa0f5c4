// Telling beforehand what the library would stumble over.
#include "tool/trial.h"

#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include "appindex/index_queue_internal.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"

namespace tool {
namespace {

using test::ConfOf;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::StartsWith;
using velkor::appindex::kAdd;
using velkor::appindex::kDel;
using velkor::appindex::kReindex;

class TrialTest : public test::DeviceRootTest {
 protected:
  static Problem Of(int op, const std::string& descriptor) {
    test::WriteFile(ConfOf("App"), descriptor);
    return Trial().ProblemOf(op, ConfOf("App"));
  }
};

TEST_F(TrialTest, GoodDescriptorHasNone) {
  for (const int op : {kAdd, kDel, kReindex}) {
    const Problem problem = Of(op, R"({"app":"App","title":"App"})");
    EXPECT_EQ(problem.line, "");
    EXPECT_FALSE(problem.fails);
  }
}

TEST_F(TrialTest, WhatTheLibraryThrowsIsToldWithItsCode) {
  const Problem id = Of(kAdd, R"({"app":["App"],"title":"App"})");
  EXPECT_THAT(id.line, HasSubstr("not as it must be"));
  EXPECT_TRUE(id.fails);
  EXPECT_EQ(id.code, 120);
  for (const int op : {kAdd, kDel}) {
    const Problem no_text = Of(op, R"({"app":["App"],"title":["App"]})");
    EXPECT_THAT(no_text.line, StartsWith("a value stands where a text belongs"));
    EXPECT_TRUE(no_text.fails);
    EXPECT_EQ(no_text.code, 0);
  }
}

TEST_F(TrialTest, FilterWithoutADeviceIsTold) {
  test::WriteFile("/etc/tovoinfo.conf", "");
  const Problem problem = Of(kAdd, R"({"app":"App","title":"App","enable":{"model":["M1"]}})");
  EXPECT_THAT(problem.line, HasSubstr("/etc/tovoinfo.conf"));
  EXPECT_EQ(problem.code, 502);
}

TEST_F(TrialTest, DocumentThatTheDaemonRefusesIsTold) {
  const Problem problem = Of(kAdd, R"({"app":"App","title":"a\u0000b"})");
  EXPECT_EQ(problem.line,
            "the search daemon does not take the document of \"App\" in chs: its \"title\" "
            "holds the character NUL; `appindex lint` shows where");
  EXPECT_TRUE(problem.fails);
  EXPECT_EQ(problem.code, 603);
  EXPECT_EQ(Of(kDel, R"({"app":"App","title":"a\u0000b"})").line, "");
}

TEST_F(TrialTest, RequestsThatDoNothingAreToldAndDoNotFail) {
  const Problem malformed = Of(kAdd, "{,}");
  EXPECT_THAT(malformed.line, HasSubstr("not strict JSON"));
  EXPECT_FALSE(malformed.fails);
  const Problem other = Trial().ProblemOf(kAdd, "/var/packages/App/other.conf");
  EXPECT_THAT(other.line, StartsWith("does nothing"));
  EXPECT_FALSE(other.fails);
  EXPECT_EQ(Trial().ProblemOf(9, "/x").line, "");
}

TEST_F(TrialTest, RebuildNamesTheApplicationThatItFailsFor) {
  test::Install("Good");
  test::WriteFile(ConfOf("Empty"), "");  // a rebuild passes it over
  EXPECT_EQ(Trial().ProblemOf(kReindex, "").line, "");
  test::WriteFile(ConfOf("Bad"), R"({"app":["Bad"],"title":"Bad"})");
  const Problem problem = Trial().ProblemOf(kReindex, "");
  EXPECT_THAT(problem.line, StartsWith(ConfOf("Bad") + ": "));
  EXPECT_TRUE(problem.fails);
  EXPECT_EQ(problem.code, 120);
}

TEST_F(TrialTest, RebuildThatCannotBeginOrEndIsTold) {
  test::WriteFile(test::kRecord, "{");
  EXPECT_EQ(Trial().ProblemOf(kReindex, "").code, 504);
  unlink(test::kRecord);
  unlink("/etc/os-release");
  EXPECT_THAT(Trial().ProblemOf(kReindex, "").line, HasSubstr("os-release"));
  ASSERT_EQ(rmdir("/usr/tovo/tovoman/webman/modules"), 0);
  EXPECT_THAT(Trial().ProblemOf(kReindex, "").line, HasSubstr("webman/modules/"));
}

// Root reads every directory, so this is somebody else.
TEST_F(TrialTest, RebuildNamesTheDirectoryThatCannotBeRead) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: becomes another user";
  test::Install("Good");
  const std::string dir = "/var/packages/App/target/private";
  test::MakeDirs(dir);
  ASSERT_EQ(chmod(dir.c_str(), 0700), 0);
  EXPECT_EQ(Trial().ProblemOf(kReindex, "").line, "");
  ASSERT_EQ(seteuid(1001), 0);
  const Problem problem = Trial().ProblemOf(kReindex, "");
  ASSERT_EQ(seteuid(0), 0);
  EXPECT_EQ(problem.line,
            dir + "/: the directory cannot be read: Permission denied; run appindex as root");
  EXPECT_TRUE(problem.fails);
  EXPECT_EQ(problem.code, 502);
}

TEST_F(TrialTest, NothingIsLogged) {
  Of(kAdd, R"({"app":"App","title":"App","keywords":[["x"]]})");
  Of(kAdd, "{,}");
  Of(kReindex, "{,}");
  EXPECT_THAT(TakeLog(), IsEmpty());
}

}  // namespace
}  // namespace tool
