// The device's identity, its languages and the device filter, read from the device root.
#include <gmock/gmock.h>
#include <json/value.h>
#include <unistd.h>

#include <string>

#include "appindex/device_identity.h"
#include "appindex/utilities/json_helpers.h"
#include "error_of.h"
#include "tests/support/device_root_test.h"

namespace velkor::appindex {
namespace {

using test::ErrorOf;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr char kInfoFile[] = "/etc/tovoinfo.conf";

void WriteUnique(const std::string& unique) {
  test::WriteFile(kInfoFile, "unique=\"" + unique + "\"\n");
}

Json::Value Parse(const std::string& text) {
  Json::Value value;
  EXPECT_TRUE(fromString(value, text)) << text;
  return value;
}

TEST(SupportedLangsTest, AreTheTwentyOneCodesInByteOrder) {
  EXPECT_THAT(GetSupportedLangs(), ElementsAre("chs", "cht", "csy", "dan", "enu", "fre", "ger",
                                               "hun", "ita", "jpn", "krn", "nld", "nor", "plk",
                                               "ptb", "ptg", "rus", "spn", "sve", "tha", "trk"));
}

TEST(SupportedLangsTest, AreOneSetForTheProcess) {
  EXPECT_EQ(&GetSupportedLangs(), &GetSupportedLangs());
}

class IdentityTest : public test::DeviceRootTest {};

TEST_F(IdentityTest, PlatformAndModelAreThePartsOfTheUniqueString) {
  EXPECT_EQ(GetPlatform(), "helios");
  EXPECT_EQ(GetModel(), "M420_plus");
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(IdentityTest, TheModelMayBeAskedForFirst) {
  EXPECT_EQ(GetModel(), "M420_plus");
  EXPECT_EQ(GetPlatform(), "helios");
}

TEST_F(IdentityTest, LeadingTextBeforeThePrefixStillMatches) {
  WriteUnique("rev2-marovant_x86_ABC_Plus");
  EXPECT_EQ(GetPlatform(), "x86");
  EXPECT_EQ(GetModel(), "ABC_Plus");
}

TEST_F(IdentityTest, OneFirstUseFillsBothForTheLifeOfTheProcess) {
  GetPlatform();
  unlink(kInfoFile);
  EXPECT_EQ(GetModel(), "M420_plus");
  EXPECT_EQ(GetPlatform(), "helios");
}

TEST_F(IdentityTest, WithoutASecondUnderscoreThrows502) {
  WriteUnique("marovant_x86");
  EXPECT_EQ(ErrorOf([] { GetPlatform(); }), "502: Malformed hb unique: marovant_x86");
  EXPECT_EQ(ErrorOf([] { GetModel(); }), "502: Malformed hb unique: marovant_x86");
}

TEST_F(IdentityTest, AnUnreadableUniqueStringThrows502) {
  unlink(kInfoFile);
  EXPECT_EQ(ErrorOf([] { GetPlatform(); }), "502: Failed to get unique");
  EXPECT_EQ(ErrorOf([] { GetModel(); }), "502: Failed to get unique");
}

TEST_F(IdentityTest, AFailureIsNotKept) {
  WriteUnique("nonsense");
  EXPECT_EQ(ErrorOf([] { GetModel(); }), "502: Malformed hb unique: nonsense");
  WriteUnique("marovant_eos_M220");
  EXPECT_EQ(GetModel(), "M220");
  EXPECT_EQ(GetPlatform(), "eos");
}

struct Filter {
  const char* name;
  const char* json;
  bool passes_as_allow_list;  // with pass_value true
  bool passes_as_deny_list;   // with pass_value false
};

constexpr bool kListed[] = {true, false};
constexpr bool kNotListed[] = {false, true};
constexpr bool kNoFilter[] = {true, true};

Filter Case(const char* name, const char* json, const bool (&expected)[2]) {
  return {name, json, expected[0], expected[1]};
}

class FilterTest : public test::DeviceRootTest, public ::testing::WithParamInterface<Filter> {};

TEST_P(FilterTest, PassesAsItLists) {
  const Json::Value filter = Parse(GetParam().json);
  EXPECT_EQ(IsPassFilter(filter, true), GetParam().passes_as_allow_list);
  EXPECT_EQ(IsPassFilter(filter, false), GetParam().passes_as_deny_list);
}

// The device is the model M420_plus of the platform helios.
INSTANTIATE_TEST_SUITE_P(
    , FilterTest,
    ::testing::Values(
        Case("NullPassesEither", "null", kNoFilter), Case("ArrayPassesEither", "[]", kNoFilter),
        Case("ArrayOfTheModelPassesEither", R"(["M420_plus"])", kNoFilter),
        Case("StringPassesEither", R"("M420_plus")", kNoFilter),
        Case("NumberPassesEither", "5", kNoFilter), Case("BoolPassesEither", "false", kNoFilter),
        Case("EmptyObjectListsNothing", "{}", kNotListed),
        Case("OtherMembersListNothing", R"({"Model":["M420_plus"],"x":["helios"]})", kNotListed),
        Case("ModelIsListed", R"({"model":["M220","M420_plus"]})", kListed),
        Case("PlatformIsListed", R"({"platform":["eos","helios"]})", kListed),
        Case("OtherModelButThisPlatform", R"({"model":["M220"],"platform":["helios"]})", kListed),
        Case("ThisModelButOtherPlatform", R"({"model":["M420_plus"],"platform":["eos"]})", kListed),
        Case("OtherModelAlone", R"({"model":["M220"]})", kNotListed),
        Case("OtherModelAndOtherPlatform", R"({"model":["M220"],"platform":["eos"]})", kNotListed),
        Case("EmptyLists", R"({"model":[],"platform":[]})", kNotListed),
        Case("ModelAsAPlainStringIsNoList", R"({"model":"M420_plus"})", kNotListed),
        Case("PlatformAsAPlainStringIsNoList", R"({"platform":"helios"})", kNotListed),
        Case("ModelAsAnObjectIsNoList", R"({"model":{"a":"M420_plus"}})", kNotListed),
        Case("PlatformAsAnObjectIsNoList", R"({"platform":{"a":"helios"}})", kNotListed),
        Case("NullModelFallsThroughToThePlatform", R"({"model":null,"platform":["helios"]})",
             kListed),
        Case("ModelNoListFallsThroughToThePlatform", R"({"model":"M1","platform":["helios"]})",
             kListed),
        Case("NullPlatform", R"({"platform":null})", kNotListed),
        Case("NamesAreCaseSensitive", R"({"model":["m420_PLUS"],"platform":["Helios"]})",
             kNotListed),
        Case("NamesAreWhole", R"({"model":["M420","M420_plus2"],"platform":["heli"]})", kNotListed),
        Case("ElementsThatAreNoStringsAreSkipped",
             R"({"model":[null,5,true,{"a":1},["M420_plus"],"M420_plus"]})", kListed),
        Case("ANestedListListsNothing", R"({"model":[["M420_plus"]]})", kNotListed)),
    [](const auto& param_info) { return param_info.param.name; });

class FilterWithoutIdentityTest : public test::DeviceRootTest {
 protected:
  FilterWithoutIdentityTest() { unlink(kInfoFile); }
};

TEST_F(FilterWithoutIdentityTest, EntriesWithoutFiltersPass) {
  EXPECT_TRUE(IsPassFilter(Json::Value(), true));
  EXPECT_TRUE(IsPassFilter(Json::Value(), false));
  EXPECT_TRUE(IsPassFilter(Parse("{}"), false));
  EXPECT_FALSE(IsPassFilter(Parse("{}"), true));
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(FilterWithoutIdentityTest, AFilterThatNamesAModelThrows502) {
  EXPECT_EQ(ErrorOf([] { IsPassFilter(Parse(R"({"model":["M420_plus"]})"), true); }),
            "502: Failed to get unique");
}

TEST_F(FilterWithoutIdentityTest, AFilterThatNamesAPlatformThrows502) {
  EXPECT_EQ(ErrorOf([] { IsPassFilter(Parse(R"({"platform":["helios"]})"), false); }),
            "502: Failed to get unique");
}

}  // namespace
}  // namespace velkor::appindex
