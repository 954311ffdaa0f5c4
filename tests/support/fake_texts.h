// The web interface's reader of texts in a test's hands: a program that links fake_texts.cpp has
// this instead of the host's.
#pragma once

#include <json/value.h>

#include <functional>
#include <string>
#include <vector>

namespace test {

struct FakeTexts {
  // What ParseTexts gives for a language directory; it may throw. Empty: no texts anywhere.
  std::function<Json::Value(const std::string& dir)> parse;
  std::vector<std::string> dirs;  // asked for, in order
};

FakeTexts& Texts();

}  // namespace test
