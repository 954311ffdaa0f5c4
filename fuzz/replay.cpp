// Tries every file of the directories that it is given, and of the directories in them.
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <map>
#include <string>

#include "fuzz/target.h"

namespace {

namespace fs = std::filesystem;

// Before anything is tried: a target may put another root in place of "/".
std::map<std::string, std::string> ReadInputs(int argc, char** argv) {
  std::map<std::string, std::string> inputs;
  for (int i = 1; i < argc; ++i) {
    for (const fs::directory_entry& entry : fs::recursive_directory_iterator(argv[i])) {
      if (!entry.is_regular_file()) continue;
      std::ifstream file(entry.path(), std::ios::binary);
      inputs[entry.path()].assign(std::istreambuf_iterator<char>(file), {});
    }
  }
  return inputs;
}

}  // namespace

int main(int argc, char** argv) {
  const std::map<std::string, std::string> inputs = ReadInputs(argc, argv);
  if (inputs.empty()) {
    std::fprintf(stderr, "usage: %s DIRECTORY..., with at least one file in them\n", argv[0]);
    return 2;
  }
  if (fuzz::Prepare != nullptr) fuzz::Prepare();
  for (const auto& [name, input] : inputs) {
    std::printf("%s\n", name.c_str());
    std::fflush(stdout);
    fuzz::Try(input);
  }
  std::printf("%zu inputs\n", inputs.size());
  return 0;
}
