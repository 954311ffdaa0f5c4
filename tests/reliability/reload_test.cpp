// A program that loads the shipped library and lets it go a thousand times.
#include <dirent.h>
#include <dlfcn.h>
#include <gtest/gtest.h>
#include <json/value.h>
#include <malloc.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <fstream>
#include <memory>
#include <new>
#include <set>
#include <stdexcept>
#include <string>
#include <thread>

#include "appindex/config.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"

namespace {

using velkor::appindex::Config;

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

template <typename Function>
void Find(Function*& function, void* library, const std::string& name) {
  function = reinterpret_cast<Function*>(dlsym(library, name.c_str()));
  if (function == nullptr) throw std::runtime_error(dlerror());
}

// What is called of the library, by the names that compilers give the functions.
struct Library {
  explicit Library(void* handle) {
    const std::string string = "NSt7__cxx1112basic_stringIcSt11char_traitsIcESaIcEEE";
    Find(from_string, handle, "_ZN6velkor10fromStringERN4Json5ValueERK" + string);
    Find(languages, handle, "_ZN6velkor8appindex17GetSupportedLangsB5cxx11Ev");
    Find(construct, handle, "_ZN6velkor8appindex6ConfigC1Ev");
    Find(process_queue, handle, "_ZN6velkor8appindex12ProcessQueueEv");
    Find(upsert, handle,
         "_ZN6velkor8appindex7elastic11IndexUpsertERK" + string + "RKN4Json5ValueE");
  }

  bool (*from_string)(Json::Value&, const std::string&);
  const std::set<std::string>& (*languages)();
  void (*construct)(Config*);
  void (*process_queue)();
  void (*upsert)(const std::string&, const Json::Value&);
};

constexpr char kSavedVersion[] = "a version that is too long to be kept without memory";

void Use(const Library& library) {
  Json::Value value;
  EXPECT_TRUE(library.from_string(value, R"({"a":[1,2,3]})"));
  EXPECT_EQ(value["a"].size(), 3U);
  EXPECT_EQ(library.languages().size(), 21U);
  alignas(Config) unsigned char place[sizeof(Config)];
  auto* const config = reinterpret_cast<Config*>(place);
  library.construct(config);
  EXPECT_EQ(config->indexed_version, kSavedVersion);
  config->~Config();
  library.process_queue();
  value["id"] = "App";
  library.upsert("enu", value);
}

// The process sees the root of its device while it calls the library, and not while it loads it.
class Reload : public test::DeviceRootTest {
 protected:
  Reload() {
    test::WriteFile(test::kRecord, std::string(R"({"indexed_version":")") + kSavedVersion + "\"}",
                    0600);
    StartDaemon();
    Leave();
  }

  ~Reload() override {
    Enter();
    kill(daemon_, SIGKILL);
    waitpid(daemon_, nullptr, 0);
  }

  void LoadUseAndLetGo() const {
    void* const handle = dlopen(LIBRARY, RTLD_NOW | RTLD_LOCAL);
    ASSERT_NE(handle, nullptr) << dlerror();
    Enter();
    // What the library keeps for a thread goes with the thread; until then the library has to stay.
    std::thread([library = Library(handle)] { Use(library); }).join();
    Leave();
    EXPECT_EQ(dlclose(handle), 0);
    ASSERT_EQ(dlopen(LIBRARY, RTLD_NOW | RTLD_NOLOAD), nullptr) << "it is still loaded";
  }

 private:
  // In a process of its own, which keeps the requests.
  void StartDaemon() {
    int ready[2];
    if (pipe(ready) != 0) throw std::runtime_error("no pipe");
    daemon_ = fork();
    if (daemon_ == 0) {
      prctl(PR_SET_PDEATHSIG, SIGKILL);
      const test::ScriptedDaemon daemon;
      close(ready[0]);
      close(ready[1]);
      for (;;) pause();
    }
    close(ready[1]);
    char byte;
    if (read(ready[0], &byte, 1) != 0) throw std::runtime_error("the daemon is not ready");
    close(ready[0]);
  }

  void Enter() const { EXPECT_TRUE(chroot(OutsidePath().c_str()) == 0 && chdir("/") == 0); }
  void Leave() const { EXPECT_TRUE(fchdir(OutsideRootFd()) == 0 && chroot(".") == 0); }

  pid_t daemon_ = -1;
};

TEST_F(Reload, AThousandTimesLeavesNothingBehind) {
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
