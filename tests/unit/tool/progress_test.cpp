// The line that shows progress.
#include "tool/progress.h"

#include <gmock/gmock.h>

namespace tool {
namespace {

using ::testing::HasSubstr;
using ::testing::Not;

Progress Halfway() {
  Progress progress;
  progress.done = 42;
  progress.total = 84;
  progress.elapsed = std::chrono::milliseconds(500);
  progress.current = "PhotoAlbum ger";
  return progress;
}

TEST(RenderProgress, UsualTerminalGetsEverything) {
  EXPECT_EQ(RenderProgress(Halfway(), 80),
            "[##########----------]  50%  42/84  84/s  1 s left  PhotoAlbum ger");
}

TEST(RenderProgress, WideTerminalGetsALongerBar) {
  EXPECT_THAT(RenderProgress(Halfway(), 120),
              HasSubstr("[" + std::string(16, '#') + std::string(16, '-') + "]"));
}

TEST(RenderProgress, NarrowTerminalLosesTheLeastNeededFirst) {
  EXPECT_EQ(RenderProgress(Halfway(), 50), "[#####-----]  50%  42/84  84/s  1 s left");
  EXPECT_EQ(RenderProgress(Halfway(), 40), " 50%  42/84  84/s  1 s left  PhotoAlbu~");
  EXPECT_EQ(RenderProgress(Halfway(), 28), " 50%  42/84  84/s  1 s left");
  EXPECT_EQ(RenderProgress(Halfway(), 22), " 50%  42/84  1 s left");
  EXPECT_EQ(RenderProgress(Halfway(), 16), " 50%  42/84");
  EXPECT_EQ(RenderProgress(Halfway(), 8), " 50%");
}

TEST(RenderProgress, LineIsAlwaysShorterThanTheTerminal) {
  Progress progress = Halfway();
  progress.request = 10;
  progress.requests = 12;
  for (int columns = 0; columns < 150; ++columns) {
    EXPECT_LE(RenderProgress(progress, columns).size(),
              static_cast<std::size_t>(std::max(columns - 1, 0)))
        << columns;
  }
}

TEST(RenderProgress, BeginningHasNoRateAndNoTimeLeft) {
  Progress progress;
  progress.total = 84;
  EXPECT_EQ(RenderProgress(progress, 80), "[--------------------]   0%   0/84");
}

TEST(RenderProgress, NothingToDoIsNoDivisionByZero) {
  EXPECT_EQ(RenderProgress(Progress(), 80), "[--------------------]   0%  0/0");
}

TEST(RenderProgress, CountsKeepTheirWidth) {
  Progress progress = Halfway();
  progress.total = 12345;
  progress.done = 7;
  EXPECT_THAT(RenderProgress(progress, 80), HasSubstr("%      7/12345  "));
}

TEST(RenderProgress, TimeLeftIsRoundedUpAndReadable) {
  Progress progress = Halfway();
  progress.total = 42 * 200;
  EXPECT_THAT(RenderProgress(progress, 80), HasSubstr("1 min left"));
}

TEST(RenderProgress, RequestIsToldWhereThereAreSeveral) {
  Progress progress = Halfway();
  progress.request = 1;
  progress.requests = 1;
  EXPECT_THAT(RenderProgress(progress, 80), Not(HasSubstr(" of ")));
  progress.requests = 3;
  EXPECT_THAT(RenderProgress(progress, 80), HasSubstr("1 of 3: PhotoAlbum ger"));
}

TEST(RenderProgress, WaitingTakesTheLine) {
  Progress progress = Halfway();
  progress.waiting = "waiting for the search daemon to start";
  EXPECT_EQ(RenderProgress(progress, 80), " 50%  waiting for the search daemon to start");
  EXPECT_EQ(RenderProgress(progress, 20), " 50%  waiting for ~");
  progress.total = 0;
  EXPECT_EQ(RenderProgress(progress, 80), "waiting for the search daemon to start");
}

TEST(ProgressLine, CountsOverAllRequests) {
  ProgressLine line(false);
  line.OnRequest(1, 2);
  line.OnWork(2);
  line.OnDocument("/var/packages/A/index.conf", "enu");
  line.OnRequest(2, 2);
  line.OnWork(1);
  line.OnDocument("/var/packages/B/index.conf", "enu");
  EXPECT_EQ(line.documents(), 2U);
  EXPECT_EQ(line.requests(), 2U);
}

// What a visible line writes to standard error while `work` is done.
template <typename Work>
std::string Written(const Work& work) {
  testing::internal::CaptureStderr();
  {
    ProgressLine line(true);
    work(line);
  }
  return testing::internal::GetCapturedStderr();
}

TEST(ProgressLine, SaysWhatItWaitsForAndWhenALongWaitEnds) {
  using std::chrono::seconds;
  using Wait = velkor::appindex::Observer::Wait;
  const auto waiting = [](Wait reason, seconds pause) {
    return Written([&](ProgressLine& line) { line.OnWait(reason, pause); });
  };
  EXPECT_THAT(waiting(Wait::kLock, seconds(0)), HasSubstr("another process that works the queue"));
  EXPECT_THAT(waiting(Wait::kSocket, seconds(1)),
              testing::AllOf(HasSubstr("waiting for the search daemon to start"),
                             Not(HasSubstr("next try"))));
  EXPECT_THAT(waiting(Wait::kNotReady, seconds(30)),
              testing::ContainsRegex("the search daemon's database; next try at [0-9:]+"));
  EXPECT_THAT(waiting(Wait::kBusy, seconds(900)),
              testing::ContainsRegex("the search daemon is busy; next try at [0-9:]+"));
}

TEST(ProgressLine, EndsTheWaitWithTheNextDocument) {
  const std::string written = Written([](ProgressLine& line) {
    line.OnWork(1);
    line.OnWait(velkor::appindex::Observer::Wait::kSocket, std::chrono::seconds(1));
    line.OnDocument("/var/packages/A/index.conf", "enu");
  });
  EXPECT_THAT(written.substr(written.rfind("100%")), Not(HasSubstr("waiting")));
}

TEST(ProgressLine, NamesAPathThatIsNoApplicationsAsItIs) {
  EXPECT_THAT(Written([](ProgressLine& line) {
                line.OnWork(1);
                line.OnDocument("/data/index.conf", "enu");
              }),
              HasSubstr("/data/index.conf enu"));
}

TEST(ProgressLine, WritesNothingUnlessItIsVisible) {
  testing::internal::CaptureStderr();
  {
    ProgressLine line(false);
    line.OnWork(1);
    line.OnWait(velkor::appindex::Observer::Wait::kBusy, std::chrono::seconds(900));
    line.OnDocument("/var/packages/A/index.conf", "enu");
  }
  EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
}

TEST(ProgressLine, TakesMoreDocumentsThanWereCounted) {
  ProgressLine line(false);
  line.OnWork(0);
  line.OnDocument("/var/packages/A/index.conf", "enu");
  EXPECT_EQ(line.documents(), 1U);
}

}  // namespace
}  // namespace tool
