// What is written, and in which portions: a device with one application, then with more of them.
#pragma once

#include <algorithm>
#include <cstddef>
#include <initializer_list>
#include <vector>

#include "bench/speed/texts.h"

namespace bench {

// Numbers of applications at which costs are looked at, the last one being all of them.
inline std::vector<std::size_t> Sizes(std::size_t applications) {
  std::vector<std::size_t> sizes;
  for (const std::size_t size : std::initializer_list<std::size_t>{1, 5, 20, 100, 500}) {
    if (size < applications) sizes.push_back(size);
  }
  sizes.push_back(applications);
  return sizes;
}

// Calls `work(lang, document)` for each document of the applications from `begin` to before `end`,
// in the order in which the library writes them.
template <typename Work>
void ForEachDocument(const Texts& texts, std::size_t begin, std::size_t end, const Work& work) {
  for (std::size_t application = begin; application < end; ++application) {
    for (std::size_t lang = 0; lang < texts.Langs().size(); ++lang) {
      for (std::size_t item = 0; item < kItemsPerApplication; ++item) {
        work(lang, texts.Document(lang, MakeItem(application, item)));
      }
    }
  }
}

}  // namespace bench
