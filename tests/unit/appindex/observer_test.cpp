// Watching the library at work: what is told, and that nothing else changes.
#include "appindex/observer.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <chrono>
#include <memory>

#include "queue_test_fixture.h"

namespace velkor::appindex {
namespace {

using std::chrono::milliseconds;
using test::ConfOf;
using test::Enqueue;
using test::Failure;
using test::Install;
using test::Request;
using test::ScriptedDaemon;
using test::Success;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Not;

// Keeps what it is told.
class Recorder : public Observer {
 public:
  Recorder() { SetObserver(this); }
  ~Recorder() override { SetObserver(nullptr); }

  void OnRequest(std::size_t number, std::size_t total) override {
    requests.push_back(std::to_string(number) + "/" + std::to_string(total));
    errno = ENOTTY;  // as writing to a terminal may leave it
  }
  void OnWork(std::size_t total) override {
    work.push_back(total);
    errno = ENOTTY;
  }
  void OnDocument(const std::string& conf_path, const std::string& lang) override {
    documents.push_back(conf_path + " " + lang);
    errno = ENOTTY;
    if (documents.size() == throw_at) throw std::string("enough");
  }
  void OnWait(Wait reason, milliseconds pause) override {
    waits.emplace_back(reason, pause);
    errno = ENOTTY;
  }

  std::vector<std::string> requests;
  std::vector<std::size_t> work;
  std::vector<std::string> documents;
  std::vector<std::pair<Wait, milliseconds>> waits;
  std::size_t throw_at = 0;
};

class ObserverTest : public test::QueueTest {};

std::vector<std::string> InEveryLanguage(const std::string& conf_path) {
  std::vector<std::string> documents;
  for (const std::string& lang : test::LangsInOrder()) documents.push_back(conf_path + " " + lang);
  return documents;
}

// What the outside sees of one piece of work.
struct Traces {
  std::vector<std::string> commands;
  std::vector<std::string> log;
  std::vector<unsigned> sleeps;
  std::vector<unsigned> usleeps;

  bool operator==(const Traces& other) const {
    return commands == other.commands && log == other.log && sleeps == other.sleeps &&
           usleeps == other.usleeps;
  }
};

// A queue with everything that can happen to a request that does not end the work.
void FillQueue() {
  Install("Good");
  test::WriteFile(ConfOf("Broken"), "{,}");
  test::WriteFile(ConfOf("Odd"), R"({"app":"Odd","title":"Odd","keywords":[{"weight":2},7]})");
  for (const char* line : {R"({"path":"/x"})", "not json", R"({"op":3})"}) Enqueue(line);
  for (const char* name : {"Good", "Broken", "Odd", "Gone"}) Enqueue(Request(1, ConfOf(name)));
  Enqueue(Request(2, ConfOf("Good")));
  Enqueue(Request(9, ConfOf("Later")));
}

TEST_F(ObserverTest, ChangesNothingThatOthersSee) {
  const auto traces = [this] {
    FillQueue();
    test::Time() = {};
    test::Time().rands = {3, 1, 4};
    TakeLog();
    errno = EDOM;  // a stale one shows in the first failure line
    ScriptedDaemon daemon({Failure(601, "gone"), Failure(607, "starting"), Success(),
                           Failure(1400, "busy"), Success(), Failure(608, "not yet")});
    ProcessQueue();
    return Traces{daemon.Commands(), TakeLog(), test::Time().sleeps, test::Time().usleeps};
  };
  traces();  // makes the directories, and lets the library learn what it keeps
  const Traces alone = traces();
  Traces watched;
  {
    const Recorder recorder;
    watched = traces();
    EXPECT_THAT(recorder.documents, Not(IsEmpty()));
  }
  EXPECT_THAT(watched.commands, testing::ElementsAreArray(alone.commands));
  EXPECT_THAT(watched.log, testing::ElementsAreArray(alone.log));
  EXPECT_TRUE(watched == alone);
  EXPECT_THAT(alone.log, testing::Contains(testing::HasSubstr("Malformed keywords")));
  EXPECT_THAT(alone.sleeps, Not(IsEmpty()));
}

TEST_F(ObserverTest, AddAndDelTellEachDocument) {
  const std::string conf = Install("Good");
  ScriptedDaemon daemon;
  Recorder recorder;
  Add(conf, true);
  EXPECT_THAT(recorder.work, ElementsAre(21));
  EXPECT_THAT(recorder.documents, testing::ElementsAreArray(InEveryLanguage(conf)));
  recorder.documents.clear();
  Del(conf, false);
  EXPECT_THAT(recorder.work, ElementsAre(21, 21));
  EXPECT_THAT(recorder.documents, testing::ElementsAreArray(InEveryLanguage(conf)));
  EXPECT_THAT(recorder.requests, IsEmpty());
}

TEST_F(ObserverTest, WhatIsNotADescriptorIsNoWork) {
  const Recorder recorder;
  Add("/var/packages/Good/notes.txt", true);
  Del("/var/packages/Good/notes.txt", true);
  EXPECT_THAT(recorder.work, IsEmpty());
}

TEST_F(ObserverTest, ReindexTellsTheDocumentsOfAllDescriptorsAtOnce) {
  Install("One");
  test::WriteFile(ConfOf("Two"),
                  R"({"app":"Two","title":"Two","modules":[{"params":"a","title":"A"}]})");
  test::WriteFile(ConfOf("Broken"), "{,}");
  ScriptedDaemon daemon;
  const Recorder recorder;
  Reindex();
  EXPECT_THAT(recorder.work, ElementsAre(63));
  EXPECT_EQ(recorder.documents.size(), 63U);
}

TEST_F(ObserverTest, AddThatBecomesARebuildTellsItsWorkAnew) {
  Install("One");
  const std::string conf = Install("Two");
  ScriptedDaemon daemon({Failure(601, "gone")});
  const Recorder recorder;
  Add(conf, true);
  EXPECT_THAT(recorder.work, ElementsAre(21, 42));
  EXPECT_EQ(recorder.documents.size(), 42U);
}

TEST_F(ObserverTest, ProcessQueueTellsEachRequestOfABatch) {
  Enqueue(Request(1, Install("One")));
  Enqueue(Request(1, Install("Two")));
  Enqueue(Request(2, ConfOf("One")));
  ScriptedDaemon daemon;
  const Recorder recorder;
  ProcessQueue();
  EXPECT_THAT(recorder.requests, ElementsAre("1/2", "2/2"));
  EXPECT_THAT(recorder.work, ElementsAre(21, 21));
}

TEST_F(ObserverTest, WaitsAreToldWithReasonAndLength) {
  const std::string conf = Install("One");
  test::Time().rands = {2};
  ScriptedDaemon daemon({Failure(610, "not yet"), Failure(1400, "busy")});
  const Recorder recorder;
  Del(conf, false);
  EXPECT_THAT(recorder.waits,
              ElementsAre(std::pair(Observer::Wait::kNotReady, milliseconds(30000)),
                          std::pair(Observer::Wait::kBusy, milliseconds(17 * 60 * 1000))));
}

TEST_F(ObserverTest, WaitForTheSocketIsTold) {
  const std::string conf = Install("One");
  std::unique_ptr<ScriptedDaemon> daemon;
  test::Time().on_sleep = [&daemon](unsigned) { daemon = std::make_unique<ScriptedDaemon>(); };
  const Recorder recorder;
  Del(conf, false);
  test::Time().on_sleep = nullptr;
  EXPECT_THAT(recorder.waits, ElementsAre(std::pair(Observer::Wait::kSocket, milliseconds(1000))));
}

TEST_F(ObserverTest, WaitForTheLockOfTheQueuesWorkersIsTold) {
  auto lock = std::make_unique<LockFile>(test::kProcessLock, true);
  test::Time().rands = {7};
  test::Time().on_usleep = [&lock](unsigned) { lock.reset(); };
  const Recorder recorder;
  ProcessQueue();
  EXPECT_THAT(recorder.waits, ElementsAre(std::pair(Observer::Wait::kLock, milliseconds(700))));
}

TEST_F(ObserverTest, WithoutOneNobodyIsTold) {
  std::unique_ptr<Recorder> recorder = std::make_unique<Recorder>();
  SetObserver(nullptr);
  auto lock = std::make_unique<LockFile>(test::kProcessLock, true);
  test::Time().on_usleep = [&lock](unsigned) { lock.reset(); };
  Enqueue(Request(1, Install("One")));
  ScriptedDaemon daemon;
  ProcessQueue();
  EXPECT_THAT(recorder->requests, IsEmpty());
  EXPECT_THAT(recorder->work, IsEmpty());
  EXPECT_THAT(recorder->documents, IsEmpty());
  EXPECT_THAT(recorder->waits, IsEmpty());
}

TEST_F(ObserverTest, ItsExceptionEndsTheWorkAndLeavesTheBatch) {
  Enqueue(Request(1, Install("One")));
  {
    ScriptedDaemon daemon;
    Recorder recorder;
    recorder.throw_at = 5;
    EXPECT_THROW(ProcessQueue(), std::string);
    EXPECT_EQ(daemon.Requests().size(), 9U) << "five documents, the commits of four languages";
  }
  EXPECT_TRUE(test::Exists(test::kBatch));
  ExpectUnlocked(test::kProcessLock);
  ScriptedDaemon daemon;
  ProcessQueue();
  EXPECT_EQ(daemon.Commands(), test::AddCommands("One"));
}

}  // namespace
}  // namespace velkor::appindex
