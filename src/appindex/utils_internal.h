// Internal seams of the module utils.
#pragma once

namespace velkor::appindex {

// The language that stands in for others, and the second one of every keyword.
constexpr char kEnglish[] = "enu";

// Reads platform and model from the device's unique string. Throws Error 502, logged, with both
// left as they were.
void PrepareModelAndPlatform();

}  // namespace velkor::appindex
