// What a call throws, as one text that a test compares.
#pragma once

#include <string>

#include "appindex/error.h"

namespace test {

// "CODE: REASON" of the velkor::Error that `call` throws, "nothing" when it throws none. An
// exception of any other type goes on to the test.
template <typename Call>
std::string ErrorOf(const Call& call) {
  try {
    call();
  } catch (const velkor::Error& error) {
    return std::to_string(static_cast<int>(error.code)) + ": " + error.reason;
  }
  return "nothing";
}

}  // namespace test
