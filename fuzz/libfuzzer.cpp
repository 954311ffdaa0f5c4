// What libFuzzer calls.
#include <cstddef>
#include <cstdint>
#include <string>

#include "fuzz/target.h"

extern "C" int LLVMFuzzerInitialize(int* /*argc*/, char*** /*argv*/) {
  if (fuzz::Prepare != nullptr) fuzz::Prepare();
  return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  fuzz::Try(std::string(reinterpret_cast<const char*>(data), size));
  return 0;
}
