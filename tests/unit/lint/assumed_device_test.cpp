#include <gtest/gtest.h>

#include "appindex/device_identity.h"
#include "appindex/utils_internal.h"

namespace velkor::appindex {
namespace {

Json::Value Lists(const char* member, const char* name) {
  Json::Value filter(Json::objectValue);
  filter[member].append(name);
  return filter;
}

TEST(AssumedDevice, StandsInForTheDeviceAndNoLonger) {
  {
    const AssumedDevice device("M1", "p1");
    EXPECT_EQ(GetModel(), "M1");
    EXPECT_EQ(GetPlatform(), "p1");
    EXPECT_TRUE(IsPassFilter(Lists("model", "M1"), true));
    EXPECT_FALSE(IsPassFilter(Lists("platform", "p1"), false));
  }
  const AssumedDevice other("M2", "");
  EXPECT_FALSE(IsPassFilter(Lists("model", "M1"), true));
  EXPECT_EQ(GetPlatform(), "");
}

}  // namespace
}  // namespace velkor::appindex
