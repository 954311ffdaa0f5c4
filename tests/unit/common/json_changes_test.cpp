#include <gtest/gtest.h>
#include <json/value.h>

#include <string>

#include "appindex/utilities/json_helpers.h"
#include "json_samples.h"

namespace {

using velkor::JsonApplyChanges;

Json::Value Changed(const std::string& target, const std::string& changes) {
  Json::Value value = Parsed(target);
  JsonApplyChanges(value, Parsed(changes));
  return value;
}

TEST(JsonApplyChangesTest, RemovesMergesAndAddsMembers) {
  EXPECT_EQ(Changed(R"({"a":1,"b":{"c":1,"d":2}})", R"({"a":null,"b":{"d":3},"e":[1]})"),
            Parsed(R"({"b":{"c":1,"d":3},"e":[1]})"));
}

TEST(JsonApplyChangesTest, NullForAMissingMemberChangesNothing) {
  EXPECT_EQ(Changed(R"({"a":1})", R"({"b":null})"), Parsed(R"({"a":1})"));
}

TEST(JsonApplyChangesTest, NullDeepInsideRemovesThatMemberAlone) {
  EXPECT_EQ(Changed(R"({"a":{"b":{"c":1,"d":2}}})", R"({"a":{"b":{"c":null}}})"),
            Parsed(R"({"a":{"b":{"d":2}}})"));
}

TEST(JsonApplyChangesTest, ReplacesArraysWhole) {
  EXPECT_EQ(Changed(R"({"a":[1,2,3]})", R"({"a":[4]})"), Parsed(R"({"a":[4]})"));
}

TEST(JsonApplyChangesTest, ReplacesAnObjectByAScalar) {
  EXPECT_EQ(Changed(R"({"a":{"b":1}})", R"({"a":2})"), Parsed(R"({"a":2})"));
}

TEST(JsonApplyChangesTest, CreatesAnObjectForAMissingMember) {
  EXPECT_EQ(Changed("{}", R"({"a":{"b":{"c":1}}})"), Parsed(R"({"a":{"b":{"c":1}}})"));
}

TEST(JsonApplyChangesTest, LeavesNoNullOfAnObjectItCreates) {
  EXPECT_EQ(Changed("{}", R"({"a":{"b":null,"c":1}})"), Parsed(R"({"a":{"c":1}})"));
}

TEST(JsonApplyChangesTest, AnEmptyObjectForAMissingMemberGivesAnEmptyObject) {
  EXPECT_EQ(Changed("{}", R"({"a":{}})"), Parsed(R"({"a":{}})"));
}

TEST(JsonApplyChangesTest, AnEmptyObjectForAnObjectChangesNothing) {
  EXPECT_EQ(Changed(R"({"a":{"b":1}})", R"({"a":{}})"), Parsed(R"({"a":{"b":1}})"));
}

TEST(JsonApplyChangesTest, AnObjectForANullMemberTakesItsPlace) {
  EXPECT_EQ(Changed(R"({"a":null})", R"({"a":{"b":1}})"), Parsed(R"({"a":{"b":1}})"));
}

TEST(JsonApplyChangesTest, ANullTargetBecomesAnObject) {
  EXPECT_EQ(Changed("null", R"({"a":1})"), Parsed(R"({"a":1})"));
}

TEST(JsonApplyChangesTest, ChangesThatAreNoObjectChangeNothing) {
  for (const char* changes : {"null", "[{\"a\":2}]", "\"a\"", "1", "true"}) {
    EXPECT_EQ(Changed(R"({"a":1})", changes), Parsed(R"({"a":1})")) << changes;
  }
}

TEST(JsonApplyChangesTest, AnObjectForAScalarOrAnArrayIsTheJsonLibrarysOwnFailure) {
  for (const char* target : {R"({"a":0,"b":1})", R"({"a":0,"b":[1]})", R"({"a":0,"b":"x"})"}) {
    Json::Value value = Parsed(target);
    EXPECT_THROW(JsonApplyChanges(value, Parsed(R"({"a":9,"b":{"c":1}})")), Json::Exception)
        << target;
    EXPECT_EQ(value["a"], Json::Value(9)) << "the members before it stay changed";
  }
}

}  // namespace
