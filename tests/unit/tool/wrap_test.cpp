#include "tool/wrap.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace tool {
namespace {

using Lines = std::vector<std::string>;

TEST(WrapTest, LeavesWhatFitsAsItIs) {
  EXPECT_EQ(Wrapped("keeps notes", 11), Lines{"keeps notes"});
  EXPECT_EQ(Wrapped("", 10), Lines{""});
}

TEST(WrapTest, BreaksBetweenWords) {
  EXPECT_EQ(Wrapped("keeps notes and lists", 11), (Lines{"keeps notes", "and lists"}));
  EXPECT_EQ(Wrapped("keeps notes and lists", 10), (Lines{"keeps", "notes and", "lists"}));
}

TEST(WrapTest, LeavesAWordWholeThatIsTooLong) {
  EXPECT_EQ(Wrapped("a Benachrichtigungszentrale b", 8),
            (Lines{"a", "Benachrichtigungszentrale", "b"}));
}

TEST(WrapTest, BreaksScriptsWithoutSpacesWhereTheyMayBeBroken) {
  EXPECT_EQ(Wrapped("写真を管理する", 8), (Lines{"写真を管", "理する"}));
  EXPECT_EQ(Wrapped("จัดการรูปภาพ", 6), (Lines{"จัดการ", "รูปภาพ"}));
}

TEST(WrapTest, CountsFullWidthLettersTwice) {
  EXPECT_EQ(Wrapped("ＦＴＰｆｔｐ", 6), (Lines{"ＦＴＰ", "ｆｔｐ"}));
  EXPECT_EQ(Wrapped("ＦＴＰｆｔｐ", 12), Lines{"ＦＴＰｆｔｐ"});
}

TEST(WrapTest, CountsLettersWithMarksOnce) {
  EXPECT_EQ(Wrapped("e\u0301e\u0301 e\u0301", 4), Lines{"e\u0301e\u0301 e\u0301"});
}

}  // namespace
}  // namespace tool
