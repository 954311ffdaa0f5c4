// Telling beforehand what the library would stumble over.
#pragma once

#include <string>

#include "appindex/string_pool.h"

namespace tool {

// What is wrong with a request.
struct Problem {
  std::string line;    // for a reader; empty: nothing is wrong
  bool fails = false;  // it ends in an exception and keeps its batch; else it only does nothing
  int code = 0;        // of the velkor::Error; 0 for another exception
};

// Tries requests without sending anything, by the library's own steps up to there. What it knows
// beyond them is which documents the search daemon refuses. Texts are read once. Logs nothing.
class Trial {
 public:
  // Why a request fails, or does nothing although it means to do something. `op` is a number of the
  // queue's. What is wrong with one of the applications that a rebuild adds is told with its path.
  Problem ProblemOf(int op, const std::string& conf_path);

 private:
  void TryAdd(const std::string& conf_path);
  Problem ProblemOfRebuild();

  velkor::appindex::StringPool pool_;
};

}  // namespace tool
