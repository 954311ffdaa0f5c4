// What a program sees of the tiny device: who has sent what.
#pragma once

#include <string>
#include <vector>

namespace tiny {

struct Device {
  bool listening = true;           // whether the search daemon takes connections
  std::vector<std::string> sent;   // each message that the search daemon got
  std::vector<std::string> acted;  // each user whom the library has become
};

Device& TheDevice();

}  // namespace tiny
