#include "common/check.h"

#include <gmock/gmock.h>
#include <unistd.h>

#include <cstdio>
#include <cstring>
#include <string>
#include <thread>

#include "tests/support/device_root_test.h"
#include "tests/support/fake_user_db.h"

namespace {

using test::FailureLine;
using testing::ElementsAre;
using testing::IsEmpty;
using velkor::CheckOrThrow;
using velkor::CheckSite;
using velkor::Error;
using velkor::LogFailure;
using velkor::LogFailureText;
using velkor::LogNotice;
using velkor::MutedLog;

constexpr CheckSite kSite = {"config", 45, "Save"};

class CheckTest : public test::DeviceRootTest {
 protected:
  CheckTest() { test::UserDb() = test::FakeUserDb(); }
  ~CheckTest() override { test::UserDb().identity.reset(); }

  // The error that a failed check with this reason throws.
  template <typename MakeReason>
  static Error FailedWith(const MakeReason& make_reason) {
    try {
      CheckOrThrow(false, kSite, "!done", Error::kConfigSaveError, make_reason);
    } catch (const Error& error) {
      return error;
    }
    throw std::logic_error("the check did not throw");
  }

  static std::string Line(const std::string& text) {
    return FailureLine("config", 45, "Save", text);
  }
};

// While it lives, nothing reads the system log.
class NoSystemLog {
 public:
  NoSystemLog() : removed_(std::rename("/dev/log", "/dev/log.away") == 0) { errno = 0; }
  ~NoSystemLog() {
    EXPECT_TRUE(removed_);
    EXPECT_EQ(std::rename("/dev/log.away", "/dev/log"), 0);
  }

 private:
  bool removed_;
};

TEST_F(CheckTest, APassedCheckDoesNothing) {
  errno = ENOENT;
  int reasons_made = 0;
  CheckOrThrow(true, kSite, "!done", Error::kConfigSaveError, [&] {
    ++reasons_made;
    return std::string("why");
  });
  CheckOrThrow(true, kSite, "!done", Error::kConfigSaveError);
  LogFailure(true, kSite, "!done");
  EXPECT_EQ(errno, ENOENT);
  EXPECT_EQ(reasons_made, 0);
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(CheckTest, AFailedCheckWithErrnoZeroLogsThePlainLineAndLeavesErrnoZero) {
  errno = 0;
  const Error error = FailedWith([] { return std::string("why"); });
  EXPECT_EQ(errno, 0);
  EXPECT_EQ(error.code, Error::kConfigSaveError);
  EXPECT_EQ(error.reason, "why");
  EXPECT_THAT(TakeLog(), ElementsAre(Line("Failed [!done], reason: why")));
}

TEST_F(CheckTest, AFailedCheckWithErrnoTwoLogsItsTextAndLeavesErrnoZeroForTheCaller) {
  errno = 2;
  const Error error = FailedWith([] { return std::string("why"); });
  EXPECT_EQ(errno, 0);
  EXPECT_EQ(error.code, Error::kConfigSaveError);
  EXPECT_EQ(error.reason, "why");
  EXPECT_THAT(TakeLog(),
              ElementsAre(Line("Failed [!done], reason: why [err: No such file or directory]")));
}

TEST_F(CheckTest, ACodeWithoutAReasonLogsAnEmptyReason) {
  errno = 0;
  EXPECT_THROW(CheckOrThrow(false, kSite, "!done", Error::kCredentialsError), Error);
  EXPECT_THAT(TakeLog(), ElementsAre(Line("Failed [!done], reason: ")));
}

TEST_F(CheckTest, ACodeWithoutAReasonLogsAnEmptyReasonBeforeTheTextOfErrno) {
  errno = ENOENT;
  try {
    CheckOrThrow(false, kSite, "!done", Error::kCredentialsError);
    ADD_FAILURE() << "did not throw";
  } catch (const Error& error) {
    EXPECT_EQ(errno, 0);
    EXPECT_EQ(error.code, Error::kCredentialsError);
    EXPECT_EQ(error.reason, "");
  }
  EXPECT_THAT(TakeLog(),
              ElementsAre(Line("Failed [!done], reason:  [err: No such file or directory]")));
}

TEST_F(CheckTest, TheReasonIsMadeTwiceAndErrnoClearedBetween) {
  int reasons_made = 0;
  errno = EACCES;
  const Error error = FailedWith([&] {
    const std::string text = std::strerror(errno);
    return std::to_string(++reasons_made) + " " + text;
  });
  EXPECT_EQ(error.reason, "2 Success");
  EXPECT_THAT(
      TakeLog(),
      ElementsAre(Line("Failed [!done], reason: 1 Permission denied [err: Permission denied]")));
}

TEST_F(CheckTest, AReasonThatDisturbsErrnoDoesNotChangeTheLine) {
  errno = ENOENT;
  FailedWith([] {
    errno = EACCES;
    return std::string("why");
  });
  EXPECT_THAT(TakeLog(),
              ElementsAre(Line("Failed [!done], reason: why [err: No such file or directory]")));
}

TEST_F(CheckTest, TheProcessIdComesFirstAndTheEffectiveUserIdIsUnsigned) {
  test::UserDb().identity = test::FakeIdentity{4294967294U, 7};
  LogFailure(false, kSite, "!done");
  EXPECT_THAT(TakeLog(), ElementsAre("config:45 (" + std::to_string(getpid()) +
                                     ", 4294967294) (Save) Failed [!done]"));
}

TEST_F(CheckTest, TheEffectiveUserIsReadWhenTheLineIsWritten) {
  errno = 0;
  FailedWith([] {
    test::UserDb().identity = test::FakeIdentity{1001, 100};
    return std::string("why");
  });
  EXPECT_THAT(TakeLog(), ElementsAre("config:45 (" + std::to_string(getpid()) +
                                     ", 1001) (Save) Failed [!done], reason: why"));
}

TEST_F(CheckTest, LogFailureWithErrnoZeroLogsThePlainLineAndGoesOn) {
  errno = 0;
  LogFailure(false, kSite, "!done");
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(Line("Failed [!done]")));
}

TEST_F(CheckTest, LogFailureWithErrnoSetLogsItsTextAndClearsIt) {
  errno = ENOENT;
  LogFailure(false, kSite, "!done");
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(Line("Failed [!done] [err: No such file or directory]")));
}

TEST_F(CheckTest, ANamedFailureWithErrnoZeroLogsItsOwnText) {
  errno = 0;
  LogFailureText(kSite, "Malformed index.conf: {}");
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(Line("Malformed index.conf: {}")));
}

TEST_F(CheckTest, ANamedFailureWithErrnoSetEndsInItsTextAndClearsIt) {
  errno = ENOENT;
  LogFailureText(kSite, "Malformed index.conf: {}");
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(),
              ElementsAre(Line("Malformed index.conf: {} [err: No such file or directory]")));
}

TEST_F(CheckTest, AStaleErrnoShowsInTheNextFailureLineAndInNoFurtherOne) {
  errno = ENOENT;
  LogFailure(false, kSite, "first");
  LogFailure(false, kSite, "second");
  EXPECT_THAT(TakeLog(), ElementsAre(Line("Failed [first] [err: No such file or directory]"),
                                     Line("Failed [second]")));
}

TEST_F(CheckTest, ANoticeHasThePlaceAndItsTextAlone) {
  errno = 0;
  LogNotice("index_mgr", 260, "Add: /x/index.conf");
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre("index_mgr:260 Add: /x/index.conf"));
}

TEST_F(CheckTest, ANoticeNeitherShowsErrnoNorClearsIt) {
  errno = ENOENT;
  LogNotice("index_mgr", 290, "Reindex app");
  EXPECT_EQ(errno, ENOENT);
  EXPECT_THAT(TakeLog(), ElementsAre("index_mgr:290 Reindex app"));
}

TEST_F(CheckTest, PercentSignsInTextsAreWrittenAsTheyAre) {
  errno = 0;
  FailedWith([] { return std::string("100%s %n %m"); });
  LogFailure(false, kSite, "x % y %s");
  LogFailureText(kSite, "%d %m");
  LogNotice("config", 1, "%s");
  EXPECT_THAT(TakeLog(), ElementsAre(Line("Failed [!done], reason: 100%s %n %m"),
                                     Line("Failed [x % y %s]"), Line("%d %m"), "config:1 %s"));
}

TEST_F(CheckTest, WithoutASystemLogACheckThrowsAllTheSameAndErrnoIsZeroFromThenOn) {
  const NoSystemLog no_log;
  errno = EACCES;
  const Error error = FailedWith([] { return std::string("why: ") + std::strerror(errno); });
  EXPECT_EQ(errno, 0);
  EXPECT_EQ(error.code, Error::kConfigSaveError);
  EXPECT_EQ(error.reason, "why: Success");
}

TEST_F(CheckTest, WithoutASystemLogAFailureLineLeavesErrnoZero) {
  const NoSystemLog no_log;
  for (const int before : {0, ENOENT}) {
    errno = before;
    LogFailure(false, kSite, "!done");
    EXPECT_EQ(errno, 0) << before;
    errno = before;
    LogFailureText(kSite, "Malformed index.conf: {}");
    EXPECT_EQ(errno, 0) << before;
    errno = before;
    EXPECT_THROW(CheckOrThrow(false, kSite, "!done", Error::kCredentialsError), Error);
    EXPECT_EQ(errno, 0) << before;
  }
}

TEST_F(CheckTest, WithoutASystemLogANoticeLeavesErrnoAsItWas) {
  const NoSystemLog no_log;
  for (const int before : {0, ENOENT}) {
    errno = before;
    LogNotice("index_mgr", 290, "Reindex app");
    EXPECT_EQ(errno, before);
  }
}

TEST_F(CheckTest, AMutedThreadWritesNoLinesAndItsChecksFailAsEver) {
  errno = ENOENT;
  {
    const MutedLog muted;
    LogFailure(false, kSite, "!done");
    LogFailureText(kSite, "Malformed index.conf: {}");
    LogNotice("index_mgr", 290, "Reindex app");
    const Error error = FailedWith([] { return "why"; });
    EXPECT_EQ(error.code, Error::kConfigSaveError);
    EXPECT_EQ(error.reason, "why");
    errno = EIO;
  }
  EXPECT_EQ(errno, ENOENT) << "it is as it was before";
  EXPECT_THAT(TakeLog(), IsEmpty());
  LogFailure(false, kSite, "!done");
  EXPECT_THAT(TakeLog(), ElementsAre(Line("Failed [!done] [err: No such file or directory]")));
}

TEST_F(CheckTest, MutingIsNestedAndOfOneThread) {
  const MutedLog muted;
  { const MutedLog inner; }
  LogNotice("index_mgr", 290, "still muted");
  std::thread([] { LogNotice("index_mgr", 290, "of another thread"); }).join();
  EXPECT_THAT(TakeLog(), ElementsAre("index_mgr:290 of another thread"));
}

}  // namespace
