// The search daemon at a piece of work of its own, with every system call looked at.
#pragma once

#include <fcntl.h>

#include <atomic>
#include <condition_variable>
#include <filesystem>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "tests/crash/daemon_model.h"
#include "tests/crash/stepper.h"
#include "tests/support/searchd_test.h"

namespace test {

class DaemonStepwise : public SearchdTest {
 protected:
  // What is done beside the work.
  struct Course {
    bool idles = false;    // the daemon is idle after each request that leaves something to do
    bool deletes = false;  // in the end all indexes that it has open are deleted
  };

  struct Attempt {
    End end;
    bool ready = false;
    std::vector<int> codes;  // of the replies, up to the first that did not come
    std::size_t pauses = 0;  // in which it was idle, to their end
    std::vector<int> codes_of_deletions;
    std::vector<std::string> open_files;  // of the root, when all requests are answered
  };

  // By index: the ids of what searches find, or the code of their failure.
  using State = std::map<std::string, std::string>;

  void SetUp() override;
  void TearDown() override;

  // The work: an index is made, filled, changed and deleted, and another one is made anew.
  static std::vector<Json::Value> Work();
  // With these the daemon holds no index open any more.
  static std::vector<Json::Value> Deletions();

  // Runs the work in a traced daemon, from the same beginning each time. What its files are when
  // the work is answered is kept aside if it goes on with deletions.
  Attempt Run(const Stepper::Decide& decide, const Course& course);
  // For `decide`: which request is waiting for its reply, counted from 0; none before the first.
  std::optional<std::size_t> Asked() const;

  // Replaces the root by the files that were kept aside: what a daemon killed at that moment
  // leaves.
  void TakeKeptFiles();

  // What the answers promise of the work, and then of the deletions and the orderly end.
  static DaemonModel ModelOf(const Attempt& attempt, const Course& course);
  static DaemonModel ModelOfEnd(const Attempt& attempt, const Course& course);
  // Starts a daemon that nothing disturbs, and expects that it finds what `model` allows.
  void ExpectFound(const DaemonModel& model);

  // The work from the beginning, by the daemon that runs undisturbed, and the files that it leaves.
  std::vector<std::string> DoAgain();

  // Whether a call is one of those that are counted: those that `counts` holds for, in the root.
  bool IsCounted(const SystemCall& call, bool (*counts)(const SystemCall&)) const;

 private:
  void Make(const std::string& id, const std::string& directory, const std::string& document) const;
  std::string Beside(const char* what) const { return root_.string() + what; }
  std::string Ready() const { return Beside(".ready"); }
  void Become() const;
  void Ask(const std::vector<Json::Value>& requests, const Course& course, Attempt& attempt);
  void KeepFiles() const;
  int CodeOfReplyTo(const Json::Value& request) const;
  void NoteReplies(const SystemCall& call);
  void AwaitRest();
  std::optional<Step> StepOfIdleness(const SystemCall& call);
  bool LetIdle(std::size_t wakes);
  bool AwaitWakes(std::size_t count);
  std::vector<std::string> OpenFiles(pid_t daemon) const;
  State Found() const;

  int outside_ = open("/", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  Stepper stepper_{outside_};
  std::atomic<int> asked_ = -1;
  std::atomic<bool> may_be_idle_ = false;

  std::mutex mutex_;
  std::condition_variable changed_;
  std::size_t wakes_ = 0;  // of the daemon's waiting thread, by others of its threads
  pid_t replier_ = -1;     // the thread that has sent a reply and does not wait yet, or -1
  bool ended_ = false;
};

}  // namespace test
