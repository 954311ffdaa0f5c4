// Telling beforehand what the library would stumble over.
#include "tool/trial.h"

#include <gmock/gmock.h>

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
  static std::string Problem(int op, const std::string& descriptor) {
    test::WriteFile(ConfOf("App"), descriptor);
    return ProblemOf(op, ConfOf("App"));
  }
};

TEST_F(TrialTest, GoodDescriptorHasNone) {
  EXPECT_EQ(Problem(kAdd, R"({"app":"App","title":"App"})"), "");
  EXPECT_EQ(Problem(kDel, R"({"app":"App","title":"App"})"), "");
  EXPECT_EQ(FirstProblem(), "");
}

TEST_F(TrialTest, WhatTheLibraryThrowsIsTold) {
  EXPECT_THAT(Problem(kAdd, R"({"app":["App"],"title":"App"})"), HasSubstr("not as it must be"));
  EXPECT_THAT(Problem(kAdd, R"({"app":"App","title":["App"]})"), HasSubstr("string"));
  EXPECT_THAT(Problem(kDel, R"({"app":["App"],"title":"App"})"), HasSubstr("string"));
}

TEST_F(TrialTest, FilterWithoutADeviceIsTold) {
  test::WriteFile("/etc/tovoinfo.conf", "");
  EXPECT_THAT(Problem(kAdd, R"({"app":"App","title":"App","enable":{"model":["M1"]}})"),
              HasSubstr("/etc/tovoinfo.conf"));
}

TEST_F(TrialTest, RequestsThatDoNothingAreTold) {
  EXPECT_THAT(Problem(kAdd, "{,}"), HasSubstr("not strict JSON"));
  EXPECT_THAT(ProblemOf(kAdd, "/var/packages/App/other.conf"), StartsWith("does nothing"));
  EXPECT_EQ(ProblemOf(kReindex, ""), "");
  EXPECT_EQ(ProblemOf(9, "/x"), "");
}

TEST_F(TrialTest, FirstProblemNamesTheDescriptor) {
  test::Install("Good");
  test::WriteFile(ConfOf("Bad"), R"({"app":["Bad"],"title":"Bad"})");
  EXPECT_THAT(FirstProblem(), StartsWith(ConfOf("Bad") + ": "));
}

TEST_F(TrialTest, NothingIsLogged) {
  Problem(kAdd, R"({"app":"App","title":"App","keywords":[["x"]]})");
  Problem(kAdd, "{,}");
  FirstProblem();
  EXPECT_THAT(TakeLog(), IsEmpty());
}

}  // namespace
}  // namespace tool
