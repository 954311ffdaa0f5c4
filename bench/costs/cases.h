// Costs that are measured again and again within one process: each a piece of the library's work,
// and beside it the least that any library must do for the same result.
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace bench {

struct Case {
  enum Clock { kProcessor, kElapsed };

  std::string name;
  long size;     // how large the work is
  double parts;  // what is printed is the cost of one of so many parts
  std::function<void()> subject;
  std::function<void()> limit;
  Clock clock = kProcessor;
  int rounds = 15;
};

using Cases = std::vector<Case>;

// Each group is measured in a process of its own, which has entered an example device.

// Writing documents to a daemon that answers at once.
Cases ExchangeCases();
// Reading descriptors of more and more modules.
Cases DescriptorCases();
// Looking up texts in sections of more and more of them, and loading these.
Cases TextCases();
// Folding queues of more and more lines.
Cases QueueCases();
// Searching more and more packages for their descriptors.
Cases SearchCases(long packages, long directories);

}  // namespace bench
