// Texts as people read them.
#include "tool/output.h"

#include <gtest/gtest.h>

#include <cstdlib>

namespace tool {
namespace {

TEST(Output, DurationTakesTheUnitThatFits) {
  EXPECT_EQ(Duration(0), "0 s");
  EXPECT_EQ(Duration(59), "59 s");
  EXPECT_EQ(Duration(60), "1 min");
  EXPECT_EQ(Duration(3599), "59 min");
  EXPECT_EQ(Duration(3600), "1 h 0 min");
  EXPECT_EQ(Duration(47 * 3600 + 120), "47 h 2 min");
  EXPECT_EQ(Duration(48 * 3600), "2 days");
}

TEST(Output, ShortenedCutsBetweenCharacters) {
  EXPECT_EQ(Shortened("abc", 3), "abc");
  EXPECT_EQ(Shortened("abcd", 3), "ab~");
  EXPECT_EQ(Shortened("äöü", 3), "äöü");
  EXPECT_EQ(Shortened("äöüß", 3), "äö~");
  EXPECT_EQ(Shortened("abc", 1), "~");
  EXPECT_EQ(Shortened("abc", 0), "");
  EXPECT_EQ(Shortened("", 0), "");
}

TEST(Output, OneLineHasNoControlCharacters) {
  EXPECT_EQ(OneLine("Überblick 写真"), "Überblick 写真");
  EXPECT_EQ(OneLine("a\nb\r\x1B[2Jc\x7F"), "a b  [2Jc ");
  EXPECT_EQ(OneLine("a\xC2\x9B"
                    "b\xC2\xA0"
                    "c"),
            "a b\xC2\xA0"
            "c");
  EXPECT_EQ(OneLine("torn \xC2"), "torn \xC2");
}

TEST(Output, CountedTakesThePlural) {
  EXPECT_EQ(Counted(0, "request"), "0 requests");
  EXPECT_EQ(Counted(1, "request"), "1 request");
  EXPECT_EQ(Counted(2, "request"), "2 requests");
}

TEST(Output, RemarksAreOneLineAndNoneWithQuiet) {
  Context context;
  testing::internal::CaptureStderr();
  Remark(context, "a\nb");
  context.quiet = true;
  Remark(context, "c");
  EXPECT_EQ(testing::internal::GetCapturedStderr(), "a b\n");
}

TEST(Output, FileIsNoTerminalAndHasTheUsualWidth) {
  unsetenv("TERM");
  unsetenv("NO_COLOR");
  constexpr int kNoFile = -1;
  EXPECT_FALSE(IsTerminal(kNoFile));
  EXPECT_FALSE(MayEmphasise(kNoFile));
  EXPECT_EQ(TerminalWidth(kNoFile), 80);
}

TEST(Output, StyledIsPlainWhereItMayNotEmphasise) {
  EXPECT_EQ(Styled("text", Look::kBold, false), "text");
  EXPECT_EQ(Styled("text", Look::kPlain, true), "text");
  EXPECT_EQ(Styled("text", Look::kBold, true), "\033[1mtext\033[0m");
}

}  // namespace
}  // namespace tool
