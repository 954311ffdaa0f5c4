// The shipped library with little memory to spend: what a package, a queue or a reply holds does
// not make it take more than so much.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <malloc.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <functional>
#include <iostream>
#include <new>
#include <string>

#include "appindex/elastic_control.h"
#include "appindex/error.h"
#include "appindex/index_mgr.h"
#include "host/framing.h"
#include "tests/integration/hostile_files.h"
#include "tests/integration/hostile_scale.h"
#include "tests/support/controlled_time.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"

namespace velkor::appindex {
namespace {

using test::ConfOf;
using test::Reaction;
using test::ScriptedDaemon;

constexpr rlim_t kMiB = rlim_t{1024} * 1024;

enum Outcome { kSuccess, kError, kJsonException, kNoMemory, kOther };

Outcome OutcomeOf(const std::function<void()>& call) {
  try {
    call();
  } catch (const Error&) {
    return kError;
  } catch (const Json::Exception&) {
    return kJsonException;
  } catch (const std::bad_alloc&) {
    return kNoMemory;
  } catch (...) {
    return kOther;
  }
  return kSuccess;
}

class LittleMemory : public test::DeviceRootTest {
 protected:
  // What `call` ends in, in a process that may take `mebibytes` more than it has.
  Outcome OutcomeWithin(rlim_t mebibytes, const std::function<void()>& call) {
    const pid_t child = fork();
    if (child == 0) {
      malloc_trim(0);  // what the test itself has freed is not to be had
      const rlim_t limit = OwnMemory() + mebibytes * kMiB;
      const rlimit limits = {limit, limit};
      if (setrlimit(RLIMIT_DATA, &limits) != 0) _exit(kOther);
      _exit(OutcomeOf(call));
    }
    int status = 0;
    rusage usage{};
    EXPECT_EQ(wait4(child, &status, 0, &usage), child);
    if (test::IsLongRun()) std::cout << "peak " << usage.ru_maxrss / 1024 << " MiB\n";
    EXPECT_TRUE(WIFEXITED(status)) << "signal " << WTERMSIG(status);
    return static_cast<Outcome>(WEXITSTATUS(status));
  }

 private:
  // What this process has of its own, in bytes: what RLIMIT_DATA counts. That of the address space
  // would count what the allocator has put aside for threads, and leave it to be had.
  rlim_t OwnMemory() const {
    const int fd = openat(OutsideRootFd(), "proc/self/statm", O_RDONLY | O_CLOEXEC);
    char text[128] = {};
    unsigned long pages = 0;
    if (fd < 0 || read(fd, text, sizeof(text) - 1) <= 0 ||
        std::sscanf(text, "%*u %*u %*u %*u %*u %lu", &pages) != 1) {
      _exit(kOther);
    }
    close(fd);
    return pages * static_cast<rlim_t>(sysconf(_SC_PAGESIZE));
  }
};

TEST_F(LittleMemory, AnnouncedLengthTakesNone) {
  ScriptedDaemon daemon({{Reaction::kRawBytes, host::FrameHeader(host::kMaxFrameBytes) + "{"}});
  EXPECT_EQ(OutcomeWithin(4, [] { elastic::IndexCommit("enu"); }), kError);
}

TEST_F(LittleMemory, LongestReplyIsTaken) {
  const std::string text(host::kMaxFrameBytes - 100, 'x');
  ScriptedDaemon daemon({test::Reply(R"({"success":true,"text":")" + text + "\"}")});
  EXPECT_EQ(OutcomeWithin(120, [] { elastic::IndexCommit("enu"); }), kSuccess);
}

TEST_F(LittleMemory, HugeFilesAreNotRead) {
  constexpr off_t kHuge = 100'000'000;
  ASSERT_TRUE(test::MakeHole("/var/packages/App/target/ui/texts/enu/strings", kHuge));
  ASSERT_TRUE(test::MakeHole(ConfOf("Huge"), kHuge));
  test::WriteFile(ConfOf("App"), R"({"app":"App","title":"a:t"})");
  ScriptedDaemon daemon;
  EXPECT_EQ(OutcomeWithin(8,
                          [] {
                            Add(ConfOf("App"), true);
                            Add(ConfOf("Huge"), true);
                          }),
            kSuccess);
}

// A hundred keywords of five times four megabytes, in two languages.
TEST_F(LittleMemory, KeywordsThatAskForMoreThanThereIsAreAFailedSend) {
  const std::string text(1'040'000, 'x');
  test::WriteFile("/var/packages/App/target/ui/texts/enu/strings", "[a]\nt=\"" + text + "\"\n");
  std::string keywords = R"({"text":"a:t","weight":5})";
  for (int i = 1; i < 100; ++i) keywords += R"(,{"text":"a:t","weight":5})";
  test::WriteFile(ConfOf("App"), R"({"app":"App","keywords":[)" + keywords + "]}");
  ScriptedDaemon daemon;
  EXPECT_EQ(OutcomeWithin(400, [] { Add(ConfOf("App"), true); }), kError);
}

// The lists of a descriptor take much more room in memory than in the file.
TEST_F(LittleMemory, DescriptorOfManyEmptyListsIsTaken) {
  std::string lists = "[]";
  while (lists.size() < test::Scaled<std::size_t>(200'000, 16'000'000)) lists += ",[]";
  test::WriteFile(ConfOf("App"), R"({"app":"App","other":[)" + lists + "]}");
  ScriptedDaemon daemon;
  EXPECT_EQ(OutcomeWithin(test::Scaled<rlim_t>(40, 2000), [] { Add(ConfOf("App"), true); }),
            kSuccess);
}

TEST_F(LittleMemory, TextsOfManySectionsAreTaken) {
  std::string texts;
  const auto bytes = test::Scaled<std::size_t>(50'000, 1'000'000);
  for (int i = 0; texts.size() < bytes; ++i) texts += "[" + std::to_string(i) + "]\nk=\"\"\n";
  test::WriteFile("/var/packages/App/target/ui/texts/enu/strings", texts);
  for (const std::string& lang : test::LangsInOrder()) {
    if (lang == "enu") continue;
    ASSERT_EQ(symlink("enu", ("/var/packages/App/target/ui/texts/" + lang).c_str()), 0);
  }
  test::WriteFile(ConfOf("App"), R"({"app":"App","title":"1:k"})");
  ScriptedDaemon daemon;
  EXPECT_EQ(OutcomeWithin(test::Scaled<rlim_t>(80, 3000), [] { Add(ConfOf("App"), true); }),
            kSuccess);
}

TEST_F(LittleMemory, QueueTakesItsOwnSizeAFewTimes) {
  test::Install("App");
  const auto size = test::Scaled<std::size_t>(4'000'000, 100'000'000);
  const std::string name(size, 'n');
  test::Enqueue(R"({"op":1,"path":")" + ConfOf("App") + R"(","why":")" + name + "\"}");
  ScriptedDaemon daemon;
  EXPECT_EQ(OutcomeWithin(6 * size / kMiB + 8, ProcessQueue), kSuccess);
  EXPECT_FALSE(test::Exists(test::kBatch));

  std::string lines;
  for (std::size_t i = 0; lines.size() < size; ++i) {
    lines += test::Request(7, "/var/packages/p" + std::to_string(i) + "/index.conf") + "\n";
  }
  test::WriteFile(test::kQueue, lines);
  EXPECT_EQ(OutcomeWithin(6 * size / kMiB + 8, ProcessQueue), kSuccess);
  EXPECT_FALSE(test::Exists(test::kBatch));
}

TEST_F(LittleMemory, WithoutAnyTheBatchIsKept) {
  test::Install("App");
  test::Enqueue(R"({"op":3,"why":")" + std::string(20'000'000, 'n') + "\"}");
  ScriptedDaemon daemon;
  EXPECT_EQ(OutcomeWithin(10, ProcessQueue), kNoMemory);
  EXPECT_TRUE(test::Exists(test::kBatch));
  EXPECT_EQ(OutcomeWithin(200, ProcessQueue), kSuccess);
  EXPECT_FALSE(test::Exists(test::kBatch));
}

}  // namespace
}  // namespace velkor::appindex
