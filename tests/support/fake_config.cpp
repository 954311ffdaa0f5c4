#include "tests/support/fake_config.h"

#include <algorithm>

#include "device/tovo_config.h"

namespace test {

FakeConfig& DeviceConfig() {
  static FakeConfig config;
  return config;
}

namespace {

int Answer(FakeText& fake, const std::string& arguments, char* buffer, int size) {
  fake.calls.push_back(arguments);
  if (fake.writes) {
    const std::string text = fake.text.substr(0, static_cast<std::size_t>(size) - 1);
    std::copy_n(text.c_str(), text.size() + 1, buffer);
  }
  return fake.result;
}

}  // namespace
}  // namespace test

int TLIBCFileGetKeyValue(const char* file, const char* key, char* value, int size, int flags) {
  if (!std::all_of(value, value + size, [](char c) { return c == '\0'; })) {
    test::DeviceConfig().key_value_buffer_zeroed = false;
  }
  const std::string arguments =
      std::string(file) + " " + key + " " + std::to_string(size) + " " + std::to_string(flags);
  return test::Answer(test::DeviceConfig().key_value, arguments, value, size);
}

int TLIBHbinfoUserAgentGet(const char* component, char* text, int size) {
  const std::string arguments = std::string(component) + " " + std::to_string(size);
  return test::Answer(test::DeviceConfig().user_agent, arguments, text, size);
}
