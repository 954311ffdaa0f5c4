// The library, killed before each of its system calls in turn and run again; and the same while
// each of them fails, once and for good. What is on the device afterwards is what an undisturbed
// run leaves, nothing less and nothing more.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <sstream>

#include "appindex/config.h"
#include "appindex/index_mgr.h"
#include "appindex/utilities/json_helpers.h"
#include "tests/crash/index_model.h"
#include "tests/crash/stepwise.h"
#include "tests/support/controlled_time.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"

namespace velkor::appindex {
namespace {

using test::ConfOf;
using test::Excuse;
using test::Fault;
using test::Request;

constexpr char kEtc[] = "/var/packages/Velkor/etc";
constexpr char kOldRecord[] = "{\"indexed_version\":\"marovanos-7.1\"}\n";
constexpr char kNewRecord[] = "{\"indexed_version\":\"marovanos-7.2-64570\"}\n";

bool StartsWith(const std::string& text, const std::string& prefix) {
  return text.compare(0, prefix.size(), prefix) == 0;
}

// What packages and built-in modules bring. What of it cannot be read is logged and left out, and
// the request counts as carried out: so it is fixed for a descriptor, texts, and the entries of a
// directory.
bool IsOfAnApplication(const std::string& path) {
  return (StartsWith(path, "/var/packages") && !StartsWith(path, kEtc)) ||
         StartsWith(path, "/usr/tovo/");
}

Excuse ExcuseOfLibrary(const Fault& fault, long number, const std::vector<std::string>& paths) {
  Excuse excuse;
  excuse.may_pass_over = std::any_of(paths.begin(), paths.end(), IsOfAnApplication);
  // The batch is worked again as long as it is there.
  excuse.may_go_on = fault.for_good && (number == SYS_unlink || number == SYS_unlinkat);
  // A lock that fails for another reason than that it is held keeps its descriptor.
  excuse.may_keep_descriptor = number == SYS_flock && fault.error == ENOLCK;
  return excuse;
}

class LibraryStepwise : public test::DeviceRootTest {
 protected:
  void SetUp() override {
    const std::string refusal = test::Stepper::Refusal();
    if (!refusal.empty()) GTEST_SKIP() << refusal;
    for (const char* name : {"A", "B", "C"}) test::Install(name);
    // One whose texts are looked up.
    test::WriteFile(ConfOf("New"), R"({"app":"New","title":"app:title","desc":"app:desc",)"
                                   R"("keywords":["app:word"]})");
    const std::string texts = "[app]\ntitle=\"New\"\ndesc=\"What is new\"\nword=\"novelty\"\n";
    test::WriteFile("/var/packages/New/target/ui/texts/enu/strings", texts);
    test::WriteFile("/var/packages/New/target/ui/texts/ger/strings", texts);
    for (const std::string& lang : test::LangsInOrder()) {
      for (const char* id : {"A", "Gone"}) {
        Json::Value document;
        document["id"] = id;
        indexed_["appindex_" + lang][id] = document;
      }
    }
  }

  // The device before each run: A and Gone are indexed, by an earlier version of the system.
  void Prepare(const std::string& batch, const std::string& queue) {
    model_.Set(indexed_);
    for (const auto& entry : std::filesystem::directory_iterator(kEtc)) {
      std::filesystem::remove_all(entry.path());
    }
    if (!batch.empty()) test::WriteFile(test::kBatch, batch);
    if (!queue.empty()) test::WriteFile(test::kQueue, queue);
    test::WriteFile(test::kRecord, kOldRecord, 0600);
    // So many runs would leave so much that each fork is slower than the one before.
    daemon_.ForgetRequests();
    test::Time().usleeps.clear();
    TakeLog();
  }

  // The index that searches see, and what lies where the library writes, but for the directory of
  // the daemon's indexes: that the library cannot make it is ignored, and the daemon makes it too.
  std::string Result() {
    std::ostringstream result;
    for (const auto& [index, documents] : model_.Committed()) {
      for (const auto& [id, document] : documents) {
        result << index << " " << id << " " << toString(document) << "\n";
      }
    }
    std::vector<std::string> names;
    for (const auto& entry : std::filesystem::directory_iterator(kEtc)) {
      if (entry.path().filename() != "appindex.db") names.push_back(entry.path());
    }
    std::sort(names.begin(), names.end());
    for (const std::string& name : names) result << name << "\n";
    result << test::ReadFile(test::kRecord) << std::oct << test::ModeOf(test::kRecord) << "\n";
    return result.str();
  }

  // The state file is the old or the new one, whole, and nobody else's to read.
  static std::string Wrong() {
    const std::string record = test::ReadFile(test::kRecord);
    if (record != kOldRecord && record != kNewRecord) return "the record is " + record;
    return test::ModeOf(test::kRecord) == 0600 ? "" : "others may read the record";
  }

  // `subject` has a name, and what is not the same for all.
  void Run(test::Subject subject, const std::string& batch, const std::string& queue,
           const std::function<void()>& act, const test::Runs& runs) {
    subject.prepare = [=] { Prepare(batch, queue); };
    subject.act = act;
    subject.again = act;
    subject.ask_anew = [=] {
      act();
      for (const std::string& lines : {batch, queue}) {
        if (lines.empty()) continue;
        test::WriteFile(test::kQueue, lines);
        act();
      }
    };
    subject.result = [this] { return Result(); };
    subject.wrong = Wrong;
    subject.excuse = ExcuseOfLibrary;
    test::Stepwise(subject, OutsideRootFd(), test::Runs::FromEnvironment(runs)).Run();
  }

  test::IndexModel model_;
  test::ScriptedDaemon daemon_{
      [this](const Json::Value& request) { return model_.React(request); }};
  test::IndexModel::Indexes indexed_;
};

test::Subject Named(const std::string& name) {
  test::Subject subject;
  subject.name = name;
  return subject;
}

// So many runs take a fraction of a second. Whoever wants all of them says so in the environment.
const test::Runs kFew{6, 6};

TEST_F(LibraryStepwise, ProcessQueue) {
  const std::string queue =
      Request(1, ConfOf("New")) + "\n{\"op\":3}\n" + Request(2, ConfOf("A")) + "\n";
  Run(Named("process_queue"), "", queue, ProcessQueue, kFew);
}

// The batch comes first: A is gone from the index if it is carried out at all, and New is gone if
// the queue is carried out after it.
const std::string& LeftBatch() {
  static const std::string batch =
      Request(1, ConfOf("New")) + "\n" + Request(2, ConfOf("A")) + "\n";
  return batch;
}
const std::string& NewQueue() {
  static const std::string queue =
      Request(1, ConfOf("C")) + "\n" + Request(2, ConfOf("New")) + "\n";
  return queue;
}

TEST_F(LibraryStepwise, Recovery) {
  Run(Named("recovery"), LeftBatch(), NewQueue(), ProcessQueue, kFew);
}

TEST_F(LibraryStepwise, RecoveryAtItsFiles) {
  test::Subject subject = Named("recovery_at_its_files");
  subject.files = test::kQueue;  // and the batch, whose name begins so
  Run(subject, LeftBatch(), NewQueue(), ProcessQueue, {std::nullopt, 20});
}

TEST_F(LibraryStepwise, Reindex) { Run(Named("reindex"), "", "", Reindex, kFew); }

void SaveRecord() {
  Config config;
  config.indexed_version = config.GetCurrentVersion();
  config.Save();
}

TEST_F(LibraryStepwise, ConfigSave) {
  test::Subject subject = Named("config_save");
  subject.done_when_it_returns = true;
  Run(subject, "", "", SaveRecord, {std::nullopt, 40});
}

TEST_F(LibraryStepwise, ConfigSaveRemovesWhatNoLivingProcessWrites) {
  const std::string record = test::kRecord;
  test::WriteFile(record + ".new.kept12", "");
  test::WriteFile(record + ".new.left12", "");
  test::WriteFile(record + ".new.of-others", "");
  const int writer = open((record + ".new.kept12").c_str(), O_RDONLY | O_CLOEXEC);
  ASSERT_EQ(flock(writer, LOCK_EX), 0);
  SaveRecord();
  EXPECT_TRUE(test::Exists(record + ".new.kept12"));
  EXPECT_FALSE(test::Exists(record + ".new.left12"));
  EXPECT_TRUE(test::Exists(record + ".new.of-others"));
  close(writer);
  SaveRecord();
  EXPECT_FALSE(test::Exists(record + ".new.kept12"));
}

}  // namespace
}  // namespace velkor::appindex
