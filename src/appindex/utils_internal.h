// Internal seams of the module utils.
#pragma once

#include <optional>
#include <string>

namespace velkor::appindex {

// The language that stands in for others, and the second one of every keyword.
constexpr char kEnglish[] = "enu";

// Reads platform and model from the device's unique string. Throws Error 502, logged, with both
// left as they were.
void PrepareModelAndPlatform();

// As long as it lives, the library takes the device for another: a name that is given stands in for
// the device's own. At most one at a time.
class AssumedDevice {
 public:
  AssumedDevice(std::optional<std::string> model, std::optional<std::string> platform);
  ~AssumedDevice();
  AssumedDevice(const AssumedDevice&) = delete;
  AssumedDevice& operator=(const AssumedDevice&) = delete;
};

}  // namespace velkor::appindex
