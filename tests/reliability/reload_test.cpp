// A program that loads the shipped library and lets it go a thousand times.
#include <dirent.h>
#include <dlfcn.h>
#include <gtest/gtest.h>
#include <json/value.h>
#include <malloc.h>

#include <fstream>
#include <memory>
#include <string>
#include <thread>

namespace {

// What a process holds.
struct Holdings {
  std::size_t bytes = mallinfo2().uordblks;
  std::size_t mappings = 0;
  std::size_t descriptors = Count("/proc/self/fd");
  std::size_t threads = Count("/proc/self/task");

  Holdings() {
    std::ifstream maps("/proc/self/maps");
    std::string line;
    while (std::getline(maps, line)) ++mappings;
  }

  static std::size_t Count(const char* directory) {
    const std::unique_ptr<DIR, int (*)(DIR*)> dir(opendir(directory), closedir);
    std::size_t entries = 0;
    while (readdir(dir.get()) != nullptr) ++entries;
    return entries;
  }
};

void LoadUseAndLetGo() {
  void* const library = dlopen(LIBRARY, RTLD_NOW | RTLD_LOCAL);
  ASSERT_NE(library, nullptr) << dlerror();
  using FromString = bool (*)(Json::Value&, const std::string&);
  const auto from_string = reinterpret_cast<FromString>(
      dlsym(library,
            "_ZN6velkor10fromStringERN4Json5ValueERKNSt7__cxx1112basic_stringIcSt11char_traitsIcE"
            "SaIcEEE"));
  ASSERT_NE(from_string, nullptr) << dlerror();
  // What the library keeps for a thread goes with the thread; until then the library has to stay.
  std::thread([from_string] {
    Json::Value value;
    EXPECT_TRUE(from_string(value, R"({"a":[1,2,3]})"));
    EXPECT_EQ(value["a"].size(), 3U);
  }).join();
  EXPECT_EQ(dlclose(library), 0);
}

TEST(Reload, AThousandTimesLeavesNothingBehind) {
  constexpr int kUntilSettled = 20;
  constexpr int kTimes = 1000;
  constexpr std::size_t kLittle = 4096;  // bytes; less than five for each time
  for (int i = 0; i < kUntilSettled; ++i) LoadUseAndLetGo();
  const Holdings before;
  for (int i = 0; i < kTimes && !HasFailure(); ++i) LoadUseAndLetGo();
  const Holdings after;
  EXPECT_LE(after.bytes, before.bytes + kLittle);
  EXPECT_EQ(after.mappings, before.mappings);
  EXPECT_EQ(after.descriptors, before.descriptors);
  EXPECT_EQ(after.threads, before.threads);
}

}  // namespace
