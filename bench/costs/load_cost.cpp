// Loads the named shared libraries, which nothing of this program's own needs, as they are loaded
// for a program that is linked with them, and prints how many seconds of the processor that took.
#include <dlfcn.h>

#include <cstdio>

#include "bench/measure.h"

int main(int argc, char** argv) {
  bool loaded = argc > 1;
  const double seconds = bench::ProcessorSecondsOf([&] {
    for (int i = 1; i < argc; ++i) loaded = dlopen(argv[i], RTLD_LAZY) != nullptr && loaded;
  });
  if (!loaded) {
    std::fprintf(stderr, "load_cost: %s\n", dlerror());
    return 2;
  }
  std::printf("%.9f\n", seconds);
  return 0;
}
