// Work queues of chosen lengths.
#pragma once

#include <string>
#include <vector>

namespace bench {

constexpr long kQueuedPaths = 100;  // how many different ones a queue has, or as many as lines

inline std::vector<std::string> QueueLines(long lines) {
  std::vector<std::string> all;
  for (long n = 0; n < lines; ++n) {
    all.push_back("{\"op\":" + std::to_string(1 + n % 2) + ",\"path\":\"/var/packages/Package" +
                  std::to_string(n % kQueuedPaths) + "/target/ui/index.conf\"}");
  }
  return all;
}

inline std::string Joined(const std::vector<std::string>& lines) {
  std::string text;
  for (const std::string& line : lines) text += line + "\n";
  return text;
}

}  // namespace bench
