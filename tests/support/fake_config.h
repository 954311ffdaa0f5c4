// The device's configuration reader and version query in a test's hands: a program that links
// fake_config.cpp has these instead of the host's. TLIBCErrGet stays the host's.
#pragma once

#include <string>
#include <vector>

namespace test {

// One function of the device that fills a buffer.
struct FakeText {
  int result = 0;
  std::string text;                // written with a terminator, whatever the result is
  bool writes = true;              // false: leaves the buffer as it is
  std::vector<std::string> calls;  // each call's arguments but the buffer, separated by blanks
};

struct FakeConfig {
  FakeText key_value;                   // TLIBCFileGetKeyValue
  bool key_value_buffer_zeroed = true;  // before every call
  FakeText user_agent;                  // TLIBHbinfoUserAgentGet
};

FakeConfig& DeviceConfig();

}  // namespace test
