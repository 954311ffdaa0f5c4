// No exported call leaves a descriptor open, and every one is close-on-exec while it lasts.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <json/value.h>
#include <sys/syscall.h>
#include <syslog.h>
#include <unistd.h>

#include <atomic>
#include <functional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "appindex/config.h"
#include "appindex/device_identity.h"
#include "appindex/elastic_control.h"
#include "appindex/index_mgr.h"
#include "appindex/string_pool.h"
#include "appindex/utilities.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"

namespace {

std::atomic<int> g_closed{0};
std::atomic<int> g_closed_inheritable{0};

}  // namespace

// Looks at each descriptor that is closed, which is every one that is not leaked.
extern "C" __attribute__((visibility("default"))) int close(int fd) {
  const int flags = fcntl(fd, F_GETFD);
  if (flags >= 0) {
    ++g_closed;
    if ((flags & FD_CLOEXEC) == 0) ++g_closed_inheritable;
  }
  return static_cast<int>(syscall(SYS_close, fd));
}

namespace velkor::appindex {
namespace {

using test::ConfOf;
using test::Enqueue;
using test::Request;
using test::ScriptedDaemon;

constexpr int kMaxDescriptor = 1024;

std::set<int> OpenDescriptors() {
  std::set<int> open;
  for (int fd = 0; fd < kMaxDescriptor; ++fd) {
    if (fcntl(fd, F_GETFD) >= 0) open.insert(fd);
  }
  return open;
}

using Call = std::pair<const char*, std::function<void()>>;

// The call, served by a daemon of its own that reacts with `script`, then with success. When it
// returns, the daemon's own descriptors are closed too.
std::function<void()> Served(const std::function<void()>& call,
                             const std::vector<test::Reaction>& script = {}) {
  return [call, script] {
    ScriptedDaemon daemon(script);
    call();
  };
}

class LibraryDescriptors : public test::DeviceRootTest {
 protected:
  LibraryDescriptors() {
    openlog(nullptr, LOG_NDELAY, LOG_USER);  // the log's own descriptor, which stays
    test::WriteFile("/var/packages/App/target/ui/texts/enu/strings", "[app]\nt=\"T\"\n");
    test::WriteFile(ConfOf("App"), R"({"app":"App","title":"app:t","keywords":[{}]})");
    test::WriteFile(ConfOf("Bad"), "{");
    test::WriteFile("/tmp/file", "[1]");
  }

  // Makes each call, which may throw an Error, and looks at what it leaves open.
  static void ExpectNoneLeft(const std::vector<Call>& calls) {
    for (const auto& [name, call] : calls) {
      const std::set<int> before = OpenDescriptors();
      g_closed_inheritable = 0;
      try {
        call();
      } catch (const Error&) {
      }
      EXPECT_EQ(OpenDescriptors(), before) << name << " left a descriptor open";
      EXPECT_EQ(g_closed_inheritable, 0) << name << " had one that programs would inherit";
    }
    EXPECT_GT(g_closed, 0) << "no closing was seen";
  }
};

TEST_F(LibraryDescriptors, IndexManagerLeavesNoneOpen) {
  ExpectNoneLeft({
      {"Add", Served([] { Add(ConfOf("App"), true); })},
      {"Add of a malformed descriptor", Served([] { Add(ConfOf("Bad"), true); })},
      {"Add of no descriptor", Served([] { Add(ConfOf("Gone"), true); })},
      {"Add to a missing index",
       Served([] { Add(ConfOf("App"), true); }, {test::Failure(601, "none")})},
      {"Del", Served([] { Del(ConfOf("App"), true); })},
      {"Reindex", Served([] { Reindex(); })},
      {"failing Reindex", Served([] { Reindex(); }, {test::Failure(605, "disk")})},
  });
}

TEST_F(LibraryDescriptors, QueueProcessorLeavesNoneOpen) {
  const auto queue_and_process = [] {
    Enqueue(Request(1, ConfOf("App")));
    Enqueue("{}");
    Enqueue(R"({"op":3})");
    ProcessQueue();
  };
  ExpectNoneLeft({
      {"nothing to do", [] { ProcessQueue(); }},
      {"no daemon", queue_and_process},
      {"failing daemon", Served(queue_and_process, {test::Failure(605, "disk")})},
      {"working daemon", Served(queue_and_process)},
      {"rename that fails", Served([] {
         test::MakeDirs(test::kBatch);
         Enqueue("{}");
         ProcessQueue();
       })},
      {"process lock held elsewhere",
       [] {
         const LockFile held(test::kProcessLock, true);
         ProcessQueue();
       }},
  });
}

TEST_F(LibraryDescriptors, DaemonCommandsLeaveNoneOpen) {
  const auto create = [] { elastic::AppIndexCreate("enu"); };
  ExpectNoneLeft({
      {"AppIndexCreate", Served(create)},
      {"AppIndexDelete", Served([] { elastic::AppIndexDelete("enu"); })},
      {"IndexUpsert", Served([] { elastic::IndexUpsert("enu", test::Parse(R"({"id":"A"})")); })},
      {"IndexDelete", Served([] { elastic::IndexDelete("enu", "A"); })},
      {"IndexCommit", Served([] { elastic::IndexCommit("enu"); })},
      {"no daemon", create},
      {"reported failure", Served(create, {test::Failure(605, "disk")})},
      {"busy daemon", Served(create, {test::Failure(1400, "busy"), test::Failure(607, "starts")})},
      {"hang-up", Served(create, {{test::Reaction::kHangUp, ""}})},
      {"torn reply", Served(create, {{test::Reaction::kRawBytes, "ab"}})},
      {"reply that is not JSON", Served(create, {test::Reply("no")})},
      {"reply without an error", Served(create, {test::Reply(R"({"success":false})")})},
  });
}

TEST_F(LibraryDescriptors, IdentityRecordAndTextsLeaveNoneOpen) {
  ExpectNoneLeft({
      {"GetPlatform", [] { GetPlatform(); }},
      {"GetSupportedLangs", [] { GetSupportedLangs(); }},
      {"Config", [] { Config().Save(); }},
      {"GetCurrentVersion", [] { Config().GetCurrentVersion(); }},
      {"StringPool",
       [] {
         StringPool pool;
         pool.SetTextsRootByConfPath(ConfOf("App"));
         pool.GetString("ger", "app:t");
       }},
      {"broken record",
       [] {
         test::WriteFile(test::kRecord, "{");
         Config();
       }},
      {"record in the place of a directory",
       [] {
         unlink(test::kRecord);
         Config config;
         test::MakeDirs(test::kRecord);
         config.Save();
       }},
  });
}

TEST_F(LibraryDescriptors, UtilitiesLeaveNoneOpen) {
  Json::Value value;
  ExpectNoneLeft({
      {"fromFile", [&] { fromFile(value, "/tmp/file"); }},
      {"fromFile of a directory", [&] { fromFile(value, "/tmp"); }},
      {"fromFile of no file", [&] { fromFile(value, "/tmp/gone"); }},
      {"toFile", [&] { toFile(value, "/tmp/copy"); }},
      {"toFile into no directory", [&] { toFile(value, "/gone/copy"); }},
      {"toFile over a directory", [&] { toFile(value, "/usr"); }},
      {"LockFile", [] { const LockFile lock("/tmp/lock", true); }},
      {"LockFile in no directory", [] { const LockFile lock("/gone/lock", true); }},
      {"CPFile", [] { CPFile("/tmp/file", "/tmp/copy"); }},
      {"CPFile of no file", [] { CPFile("/tmp/gone", "/tmp/copy"); }},
      {"MVFile", [] { MVFile("/tmp/copy", "/tmp/moved"); }},
      {"MVFile into no directory", [] { MVFile("/tmp/moved", "/gone/moved"); }},
      {"IsDirExist", [] { IsDirExist("/tmp", true); }},
      {"IsMountPoint", [] { IsMountPoint("/tmp"); }},
      {"CheckACLPerm", [] { CheckACLPerm("/tmp", 4); }},
      {"RealPath", [] { RealPath("/tmp/../tmp"); }},
      {"ChownVelkor", [] { ChownVelkor("/tmp/file"); }},
      {"SDKCredentials", [] { const sdk::SDKCredentials guard; }},
      {"SDKCredentials of root", [] { const sdk::SDKCredentials guard("root"); }},
      {"SDKCredentials of nobody", [] { const sdk::SDKCredentials guard("nobody there"); }},
  });
}

}  // namespace
}  // namespace velkor::appindex
