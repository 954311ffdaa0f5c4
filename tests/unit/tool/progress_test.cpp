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

TEST(ProgressLine, TakesMoreDocumentsThanWereCounted) {
  ProgressLine line(false);
  line.OnWork(0);
  line.OnDocument("/var/packages/A/index.conf", "enu");
  EXPECT_EQ(line.documents(), 1U);
}

}  // namespace
}  // namespace tool
