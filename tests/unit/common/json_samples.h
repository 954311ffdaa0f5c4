// JSON values for the tests of the JSON helpers.
#pragma once

#include <gtest/gtest.h>
#include <json/value.h>

#include <string>

#include "appindex/utilities/json_helpers.h"

// The value of a JSON text that is known to be one.
inline Json::Value Parsed(const std::string& text) {
  Json::Value value;
  EXPECT_TRUE(velkor::fromString(value, text)) << text;
  return value;
}
