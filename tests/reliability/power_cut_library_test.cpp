// A power cut while requests are queued and taken and while the record is saved: no request that
// was written is lost, and the record is the old one or the new one.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <fstream>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "appindex/config.h"
#include "appindex/error.h"
#include "appindex/index_queue_internal.h"
#include "host/device_root.h"
#include "tests/reliability/environment.h"
#include "tests/reliability/power_cut.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tool/queue_writer.h"

namespace {

namespace fs = std::filesystem;

// What `look` returns, from 0 to 100, in a process of its own whose root is `root`; -1 when it ends
// otherwise.
template <typename Look>
int InRoot(const fs::path& root, const Look& look) {
  const pid_t child = fork();
  if (child == 0) {
    host::EnterDeviceRoot(root);
    _exit(look());
  }
  int status = 0;
  waitpid(child, &status, 0);
  return WIFEXITED(status) && WEXITSTATUS(status) <= 100 ? WEXITSTATUS(status) : -1;
}

class PowerCutLibrary : public testing::Test {
 protected:
  PowerCutLibrary() {
    for (const char* directory : {"tmp", "var/run", "var/packages/Velkor/etc", "etc"}) {
      fs::create_directories(root_.Path() / directory);
    }
    Write("etc/passwd", "root:x:0:0::/root:/bin/sh\n");
    Write("etc/group", "root:x:0:\n");
    Write("var/run/tovoelasticd.sock", "");  // as if the daemon ran
  }

  void Write(const std::string& file, const std::string& content) const {
    std::ofstream(root_.Path() / file) << content;
  }

  // Runs the subject with the recorder.
  void Run(const std::string& act, const std::string& argument = "") const {
    const pid_t child = fork();
    if (child == 0) {
      cut_->RecordThisProcess();
      execl(POWER_CUT_SUBJECT, "power_cut_subject", root_.Path().c_str(), act.c_str(),
            argument.c_str(), nullptr);
      _exit(127);
    }
    int status = -1;
    waitpid(child, &status, 0);
    ASSERT_EQ(status, 0) << act << " " << argument;
  }

  // Runs the reopening of so many states, or of how many the environment says.
  void CutAndReopen(const char* subject, unsigned states,
                    const std::function<bool(const fs::path& root, std::size_t at)>& reopen) {
    cut_->EndRecording();
    const unsigned seed = test::Seed();
    states = static_cast<unsigned>(test::NumberFrom("TEISEIGATRO_POWER_CUT_STATES", states));
    const std::size_t different = cut_->Cut(states, seed, reopen);
    std::printf("power cut, %s: seed %u, %zu acts recorded, %u states, %zu different\n", subject,
                seed, cut_->Acts(), states, different);
    EXPECT_GT(different, 1U);
  }

  const test::TemporaryDirectory root_;
  std::unique_ptr<test::PowerCut> cut_;
};

class PowerCutQueue : public PowerCutLibrary {
 protected:
  static constexpr int kNotARequest = 64;

  void Enqueue(const std::string& path) {
    Run("enqueue", path);
    written_[path] = cut_->Now();
  }

  // A bit for each of `paths` that is requested by what is on disk, kNotARequest for any other
  // path. Another writer has appended a request before: it must not be spoilt by what it found.
  static int RequestsOnDisk(const std::vector<std::string>& paths) {
    tool::AppendToQueue({tool::QueueRequest(1, paths.back())});
    int found = 0;
    for (const char* file : {test::kQueue, test::kBatch}) {
      if (!test::Exists(file)) continue;
      for (const auto& [path, op] : velkor::appindex::ReadBatch(file)) {
        const auto at = std::find(paths.begin(), paths.end(), path);
        found |= at == paths.end() ? kNotARequest : 1 << (at - paths.begin());
      }
    }
    return found;
  }

  static bool Has(int found, int path) { return (found & (1 << path)) != 0; }

  std::map<std::string, std::size_t> written_;  // from when on
};

TEST_F(PowerCutQueue, LosesNoRequestThatWasWritten) {
  cut_ = std::make_unique<test::PowerCut>(root_.Path());
  Enqueue("/first");
  Enqueue("/second");
  Run("process");
  Enqueue("/third");
  Enqueue("/fourth");
  const std::vector<std::string> paths = {"/first", "/second", "/third", "/fourth", "/after"};
  CutAndReopen("the queue", 60, [&](const fs::path& root, std::size_t at) {
    const int found = InRoot(root, [&] { return RequestsOnDisk(paths); });
    EXPECT_GE(found, 0) << "the queue cannot be used";
    EXPECT_EQ(found & kNotARequest, 0) << "a request that nobody has made";
    EXPECT_TRUE(Has(found, 4)) << "the request after the power cut";
    const bool batch_done = at >= cut_->BehindRemovalOf("appindex.queue.tmp");
    for (int i = 0; i < 4; ++i) {
      const std::string& path = paths[static_cast<std::size_t>(i)];
      const bool due = at >= written_[path] && !(i < 2 && batch_done);
      EXPECT_TRUE(!due || Has(found, i)) << path << " is lost, cut at " << at;
    }
    return !HasFailure();
  });
}

class PowerCutRecord : public PowerCutLibrary {
 protected:
  enum Found { kNone, kFirst, kSecond, kOtherText, kWrongMode, kUnreadable };

  static int RecordOnDisk() {
    try {
      const velkor::appindex::Config config;
      struct stat status {};
      if (stat(test::kRecord, &status) == 0 && (status.st_mode & 07777U) != 0600) return kWrongMode;
      if (config.indexed_version.empty()) return kNone;
      if (config.indexed_version == "first") return kFirst;
      return config.indexed_version == "second" ? kSecond : kOtherText;
    } catch (const velkor::Error&) {
      return kUnreadable;
    }
  }
};

TEST_F(PowerCutRecord, LeavesTheOldOneOrTheNewOne) {
  cut_ = std::make_unique<test::PowerCut>(root_.Path());
  Run("save", "first");
  const std::size_t first = cut_->Now();
  Run("save", "second");
  const std::size_t second = cut_->Now();
  CutAndReopen("the record", 40, [&](const fs::path& root, std::size_t at) {
    const int found = InRoot(root, RecordOnDisk);
    const int oldest = at >= second ? kSecond : at >= first ? kFirst : kNone;
    const int newest = at > first ? kSecond : at > 0 ? kFirst : kNone;
    EXPECT_GE(found, oldest) << "cut at " << at;
    EXPECT_LE(found, newest) << "cut at " << at;
    return !HasFailure();
  });
}

}  // namespace
