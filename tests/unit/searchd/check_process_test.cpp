// Databases that cannot be checked because the system refuses what that takes.
#include "host/searchd/check_process.h"

#include <gmock/gmock.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <string>

#include "host/searchd/database_check.h"
#include "host/searchd/index_directory.h"
#include "host/searchd/request_error.h"
#include "tests/support/device_root_test.h"
#include "tests/unit/searchd/failing_calls.h"

namespace searchd {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;

constexpr char kPath[] = "/var/packages/Velkor/etc/index";

class UncheckedTest : public test::DeviceRootTest {
 protected:
  UncheckedTest() { PrepareIndexDirectory(kPath, false); }
  ~UncheckedTest() override { failing_call = {}; }

  static std::string FailureOf(DatabaseCheck& check) {
    try {
      check.Await();
    } catch (const RequestError& e) {
      EXPECT_EQ(e.GetCode(), Code::kStorage);
      return e.what();
    }
    return "";
  }
};

class RefusedOnceTest : public UncheckedTest, public ::testing::WithParamInterface<const char*> {};

TEST_P(RefusedOnceTest, IsLoggedAndTriedAgainWithTheNextUse) {
  CheckProcess process(STDERR_FILENO);
  DatabaseCheck check(kPath, process, DatabaseCheck::Files::kMade);
  const unsigned before = check.Await();
  failing_call = {GetParam(), ENFILE, 0};
  check.Renew();
  EXPECT_EQ(failing_call.name, "") << "it was not called";
  EXPECT_THAT(TakeLog(), ElementsAre(HasSubstr("cannot check " + std::string(kPath))));
  EXPECT_GT(check.Await(), before);
}

TEST_P(RefusedOnceTest, FailsTheUseThatMeetsIt) {
  CheckProcess process(STDERR_FILENO);
  DatabaseCheck check(kPath, process, DatabaseCheck::Files::kMade);
  check.Await();
  ASSERT_EQ(unlink((std::string(kPath) + "/tovoelasticd.index").c_str()), 0);
  failing_call = {GetParam(), ENFILE, 0};
  EXPECT_THAT(FailureOf(check), HasSubstr(std::strerror(ENFILE)));
  EXPECT_THAT(FailureOf(check), HasSubstr("tovoelasticd.index is missing"));
}

INSTANTIATE_TEST_SUITE_P(, RefusedOnceTest, ::testing::Values("pipe2", "sendmsg"),
                         [](const auto& call) { return std::string(call.param); });

TEST_F(UncheckedTest, AProcessThatCannotBeStartedIsReported) {
  failing_call = {"fork", EAGAIN, 1};  // not the one that the checking process itself comes from
  CheckProcess process(STDERR_FILENO);
  failing_call = {};
  DatabaseCheck check(kPath, process, DatabaseCheck::Files::kFound);
  EXPECT_THAT(FailureOf(check),
              HasSubstr("cannot check " + std::string(kPath) + ": " + std::strerror(EAGAIN)));
}

TEST_F(UncheckedTest, AnInterruptedWaitForTheResultGoesOn) {
  CheckProcess process(STDERR_FILENO);
  DatabaseCheck check(kPath, process, DatabaseCheck::Files::kFound);
  failing_call = {"read", EINTR, 0};
  EXPECT_EQ(FailureOf(check), "");
  EXPECT_EQ(failing_call.name, "") << "it was not called";
}

// As when reading the database makes the process crash.
TEST_F(UncheckedTest, ACheckThatEndsWithoutAResultHasFoundDamage) {
  failing_call = {"write", EPIPE, 0};
  CheckProcess process(STDERR_FILENO);
  failing_call = {};
  DatabaseCheck check(kPath, process, DatabaseCheck::Files::kFound);
  EXPECT_THAT(FailureOf(check), HasSubstr(std::string(kPath) + " is damaged: the attempt"));
  EXPECT_THAT(TakeLog(), ElementsAre(HasSubstr("an index cannot be used: " + std::string(kPath))));
}

}  // namespace
}  // namespace searchd
