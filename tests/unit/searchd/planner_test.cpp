#include "host/searchd/planner.h"

#include <gtest/gtest.h>

#include <string>

#include "tests/unit/searchd/memory_index.h"

namespace searchd {
namespace {

Plan PlanFor(const std::string& text, const std::string& language = "enu") {
  Analyzer analyzer(LanguageOfIndex("x_" + language));
  return MakePlan(SearchedFields(Mapping::Parse(test::Mappings())), analyzer, text);
}

Strings TextsOf(const Reading& reading) {
  Strings texts;
  for (const Clause& clause : reading) texts.push_back(clause.text);
  return texts;
}

std::string Repeated(const std::string& text, std::size_t count) {
  std::string all;
  for (std::size_t i = 0; i < count; ++i) all += text;
  return all;
}

TEST(PlannerTest, SearchesTheMembersOfAllAndThoseThatAreNotNamed) {
  Strings members;
  for (const Field& field : SearchedFields(Mapping::Parse(test::Mappings()))) {
    members.push_back(field.member);
  }
  EXPECT_EQ(members, (Strings{"desc", "keywords", "search_title", "title", ""}));
  EXPECT_TRUE(SearchedFields(Mapping::Parse(test::FromText(
                                 R"({"property_id":"id","default":{"_all":false}})")))
                  .empty());
}

TEST(PlannerTest, ReadsPartsBetweenSpacesAndTheirWords) {
  const Plan plan = PlanFor(" wi-fi  setup ");
  EXPECT_EQ(TextsOf(plan.parts), (Strings{"wi-fi", "setup"}));
  EXPECT_EQ(TextsOf(plan.words), (Strings{"wi", "fi", "setup"}));
  EXPECT_FALSE(plan.whole.empty());
  EXPECT_TRUE(PlanFor("wifi setup").words.empty()) << "the same as the parts";
}

TEST(PlannerTest, ReadsWordsWhereNoSpaceIs) {
  EXPECT_EQ(TextsOf(PlanFor("文件管理", "chs").words), (Strings{"文件", "管理"}));
  EXPECT_EQ(TextsOf(PlanFor("จัดการไฟล์", "tha").words), (Strings{"จัดการ", "ไฟล์"}));
}

TEST(PlannerTest, IsEmptyWithoutText) {
  for (const char* text : {"", " ", "\t\n", "\u3000", "\u200B"}) {
    EXPECT_TRUE(PlanFor(text).IsEmpty()) << '"' << text << '"';
    EXPECT_FALSE(PlanFor(text).cut);
  }
}

TEST(PlannerTest, LooksAtSixteenWords) {
  EXPECT_FALSE(PlanFor(Repeated("m ", 16)).cut);
  EXPECT_EQ(PlanFor(Repeated("m ", 16)).parts.size(), 16U);
  EXPECT_TRUE(PlanFor(Repeated("m ", 17)).cut);
  EXPECT_EQ(PlanFor(Repeated("m ", 17)).parts.size(), 16U);
}

TEST(PlannerTest, WordsWithoutSpacesBeyondSixteenAreLookedAtAsOnePart) {
  const Plan plan = PlanFor(Repeated("文件", 17), "chs");
  EXPECT_EQ(plan.words.size(), 16U);
  EXPECT_EQ(TextsOf(plan.parts), Strings{Repeated("文件", 17)});
}

TEST(PlannerTest, LooksAtCharactersNotBytes) {
  EXPECT_FALSE(PlanFor(Repeated("x", kMaxQueryCharacters)).cut);
  EXPECT_TRUE(PlanFor(Repeated("x", kMaxQueryCharacters + 1)).cut);
  EXPECT_FALSE(PlanFor(Repeated("文", kMaxQueryCharacters)).cut);
  const Plan plan = PlanFor(Repeated("文", kMaxQueryCharacters + 1));
  EXPECT_TRUE(plan.cut);
  EXPECT_EQ(plan.text, Repeated("文", kMaxQueryCharacters));
}

TEST(PlannerTest, OnlyTheLastWordMayBeABeginning) {
  for (const Clause& clause : PlanFor("file stat").parts) {
    bool beginning = false;
    for (const Way& way : clause.ways) beginning = beginning || way.how == How::kBeginning;
    EXPECT_EQ(beginning, clause.text == "stat");
  }
}

}  // namespace
}  // namespace searchd
