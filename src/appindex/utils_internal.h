// Internal seam of the module utils.
#pragma once

namespace velkor::appindex {

// Reads platform and model from the device's unique string. Throws Error 502, logged, with both
// left as they were.
void PrepareModelAndPlatform();

}  // namespace velkor::appindex
