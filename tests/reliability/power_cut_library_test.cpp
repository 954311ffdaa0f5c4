// A power cut while requests are queued and carried out and while the record is saved: every
// request that was written and synced was carried out or is afterwards, and the record is the old
// one or the new one.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <fstream>
#include <map>
#include <memory>
#include <set>
#include <string>

#include "appindex/config.h"
#include "appindex/error.h"
#include "appindex/index_mgr.h"
#include "appindex/index_queue_internal.h"
#include "host/device_root.h"
#include "tests/reliability/environment.h"
#include "tests/reliability/id_daemon.h"
#include "tests/reliability/power_cut.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tool/queue_writer.h"

namespace {

namespace fs = std::filesystem;

constexpr int kThrew = 101;

// What `look` returns, from 0 to 100, in a process of its own whose root is `root`; -1 when it ends
// otherwise.
template <typename Look>
int InRoot(const fs::path& root, const Look& look) {
  const pid_t child = fork();
  if (child == 0) {
    try {
      host::EnterDeviceRoot(root);
      _exit(look());
    } catch (...) {
      _exit(kThrew);
    }
  }
  int status = 0;
  waitpid(child, &status, 0);
  return WIFEXITED(status) && WEXITSTATUS(status) < kThrew ? WEXITSTATUS(status) : -1;
}

class PowerCutLibrary : public testing::Test {
 protected:
  PowerCutLibrary() {
    for (const char* directory : {"tmp", "var/run", "var/packages/Velkor/etc", "etc"}) {
      fs::create_directories(root_.Path() / directory);
    }
    Write("etc/passwd", "root:x:0:0::/root:/bin/sh\n");
    Write("etc/group", "root:x:0:\n");
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

  // Reopens so many states that differ, or as many as the environment says; all where there are no
  // more.
  void CutAndReopen(const char* subject, std::size_t states,
                    const test::PowerCut::Reopen& reopen) const {
    cut_->EndRecording();
    const unsigned seed = test::Seed();
    states = test::NumberFrom("TEISEIGATRO_POWER_CUT_STATES", states);
    const std::size_t possible = cut_->CountStates(std::max(states, kFewest) + 1);
    const bool all = possible <= states;
    const std::size_t different =
        all ? cut_->CutEverywhere(reopen) : cut_->Cut(states, seed, reopen);
    std::printf("power cut, %s: seed %u, %zu acts recorded, %zu different states%s\n", subject,
                seed, cut_->Acts(), different, all ? ", all that there can be" : "");
    EXPECT_EQ(different, std::min(states, possible));
    EXPECT_GT(possible, kFewest);
  }

  // What is being written can end anywhere, to begin with.
  static constexpr std::size_t kFewest = 50;

  const test::TemporaryDirectory root_;
  std::unique_ptr<test::PowerCut> cut_;
};

class PowerCutQueue : public PowerCutLibrary {
 protected:
  enum Found { kCarriedOut, kUnknownRequest, kLeftOver };

  PowerCutQueue() {
    for (const char* name : kNames) {
      test::WriteFile(root_.Path().string() + test::ConfOf(name),
                      std::string(R"({"app":")") + name + R"(","title":"Title"})");
    }
    cut_ = std::make_unique<test::PowerCut>(root_.Path());
  }

  void Enqueue(const std::string& name) {
    Run("enqueue", test::ConfOf(name));
    written_[name] = cut_->Now();
  }

  // Carries out what is on disk, where another writer has appended a request before: it must not
  // be spoilt by what it found.
  static int CarryOut() {
    tool::AppendToQueue({tool::QueueRequest(1, test::ConfOf(kAfter))});
    for (const char* file : {test::kQueue, test::kBatch}) {
      if (!test::Exists(file)) continue;
      for (const auto& [path, op] : velkor::appindex::ReadBatch(file)) {
        if (!test::Exists(path) || op != velkor::appindex::kAdd) return kUnknownRequest;
      }
    }
    velkor::appindex::ProcessQueue();
    return test::Exists(test::kQueue) || test::Exists(test::kBatch) ? kLeftOver : kCarriedOut;
  }

  // The applications that the index of each language has.
  static std::set<std::string> Indexed(const test::IdDaemon& daemon) {
    const auto committed = daemon.Committed();
    EXPECT_EQ(committed.size(), test::LangsInOrder().size());
    for (const auto& [index, ids] : committed) EXPECT_EQ(ids, committed.begin()->second) << index;
    return committed.empty() ? std::set<std::string>() : committed.begin()->second;
  }

  static constexpr const char* kAfter = "After";
  static constexpr const char* kNames[] = {"First", "Second", "Third", "Fourth", "Fifth", kAfter};

  std::map<std::string, std::size_t> written_;  // and synced, from when on
};

TEST_F(PowerCutQueue, LosesNoRequestThatWasWritten) {
  using Names = std::set<std::string>;
  Enqueue("First");
  Enqueue("Second");
  {
    const test::IdDaemon daemon(root_.Path());
    Run("process", test::ConfOf("Third"));
    ASSERT_EQ(Indexed(daemon), (Names{"First", "Second", "Third"}));
  }
  Enqueue("Fourth");
  Enqueue("Fifth");
  CutAndReopen("the queue", 25, [&](const fs::path& root, std::size_t at) {
    const test::IdDaemon daemon(root);  // which has forgotten what it was told before the cut
    EXPECT_EQ(InRoot(root, CarryOut), kCarriedOut) << "cut at " << at;
    const Names indexed = Indexed(daemon);
    EXPECT_EQ(indexed.count(kAfter), 1U) << "the request after the power cut, at " << at;
    const std::size_t first_batch = cut_->BehindRemovalOf("appindex.queue.tmp", 1);
    const std::size_t second_batch = cut_->BehindRemovalOf("appindex.queue.tmp", 2);
    written_["Third"] = first_batch;  // at the latest
    for (const auto& [name, written] : written_) {
      std::size_t done = static_cast<std::size_t>(-1);
      if (name == "First" || name == "Second") done = first_batch;
      if (name == "Third") done = second_batch;
      const bool due = at >= written && at < done;
      EXPECT_TRUE(!due || indexed.count(name) == 1) << name << " is lost, cut at " << at;
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
  CutAndReopen("the record", 25, [&](const fs::path& root, std::size_t at) {
    const int found = InRoot(root, RecordOnDisk);
    const int oldest = at >= second ? kSecond : at >= first ? kFirst : kNone;
    const int newest = at > first ? kSecond : at > 0 ? kFirst : kNone;
    EXPECT_GE(found, oldest) << "cut at " << at;
    EXPECT_LE(found, newest) << "cut at " << at;
    return !HasFailure();
  });
}

}  // namespace
