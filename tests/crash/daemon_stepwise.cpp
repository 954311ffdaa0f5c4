#include "tests/crash/daemon_stepwise.h"

#include <linux/futex.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <thread>

#include "tests/crash/faults.h"

namespace test {
namespace {

namespace fs = std::filesystem;

constexpr char kEnu[] = "appindex_enu";
constexpr char kOld[] = "appindex_old";
constexpr char kKept[] = "appindex_kept";
constexpr char kWord[] = "xylophone";  // finds every document
constexpr std::chrono::minutes kForEver(1);
constexpr pid_t kNobody = -1;

Json::Value Titled(const std::string& id) { return Document(id, kWord); }

bool IsBelow(const std::string& directory, const std::string& path) {
  return path.compare(0, directory.size(), directory) == 0;
}

// Whether the daemon can do something when it is idle after this request. A commit does it all.
bool LeavesWork(const Json::Value& request) { return request["command"] != "commit"; }

// Changes of documents are answered by the thread that waits; of others it is told by another one.
bool WakesWhenAnswered(const Json::Value& request) {
  return IsBelow("index_", request["command"].asString());
}

bool Sends(const SystemCall& call) {
  return call.number == SYS_sendto || call.number == SYS_sendmsg;
}

bool ConcernsClients(const SystemCall& call) { return call.number == SYS_bind || Sends(call); }

// Whether a thread waits for a request, or for something to do; but not for another's lock.
bool Waits(const SystemCall& call) {
#if defined(__x86_64__)
  if (call.number == SYS_epoll_wait) return true;
#endif
  return call.number == SYS_futex && (call.arguments[1] & FUTEX_CMD_MASK) == FUTEX_WAIT_BITSET;
}

DaemonModel ModelOfBeginning() {
  return DaemonModel({{kEnu, std::nullopt},
                      {kOld, DaemonModel::Documents{"o"}},
                      {kKept, DaemonModel::Documents{"k"}}});
}

}  // namespace

std::vector<Json::Value> DaemonStepwise::Work() {
  return {CreateRequest(kEnu, std::string(kIndexes) + "enu"),
          UpsertRequest(kEnu, Titled("a")),
          UpsertRequest(kEnu, Titled("b")),
          IdRequest("commit", kEnu),
          RemovalRequest(kEnu, "a"),
          IdRequest("commit", kEnu),
          IdRequest("index_delete", kOld),
          CreateRequest(kOld, std::string(kIndexes) + "old"),
          UpsertRequest(kOld, Titled("c")),
          IdRequest("commit", kOld),
          IdRequest("index_delete", kEnu),
          IdRequest("commit", kOld)};
}

std::vector<Json::Value> DaemonStepwise::Deletions() {
  return {IdRequest("index_delete", kEnu), IdRequest("index_delete", kOld),
          IdRequest("commit", kKept)};
}

void DaemonStepwise::SetUp() {
  SearchdTest::SetUp();
  const std::string refusal = Stepper::Refusal();
  if (!refusal.empty()) GTEST_SKIP() << refusal;
  Start();
  Make(kKept, "kept", "k");
  Make(kOld, "old", "o");
  ASSERT_EQ(daemon_->Stop(SIGTERM).status, 0);
  fs::copy(root_, Beside(".before"), fs::copy_options::recursive);
}

void DaemonStepwise::TearDown() {
  SearchdTest::TearDown();
  for (const char* what : {".before", ".kept", ".ready", ".errors"}) fs::remove_all(Beside(what));
  close(outside_);
}

void DaemonStepwise::Make(const std::string& id, const std::string& directory,
                          const std::string& document) const {
  EXPECT_EQ(CodeOfReplyTo(CreateRequest(id, kIndexes + directory)), 0);
  EXPECT_EQ(CodeOfReplyTo(UpsertRequest(id, Titled(document))), 0);
  EXPECT_EQ(CodeOfReplyTo(IdRequest("commit", id)), 0);
}

DaemonStepwise::Attempt DaemonStepwise::Run(const Stepper::Decide& decide, const Course& course) {
  daemon_.reset();
  fs::remove_all(root_);
  fs::copy(Beside(".before"), root_, fs::copy_options::recursive);
  fs::remove(Ready());
  EXPECT_EQ(mkfifo(Ready().c_str(), 0600), 0);

  Attempt attempt;
  asked_ = -1;
  may_be_idle_ = false;
  wakes_ = 0;
  replier_ = kNobody;
  ended_ = false;
  std::thread tracer([&] {
    attempt.end = stepper_.Run([this] { Become(); },
                               [&](const SystemCall& call) {
                                 NoteReplies(call);
                                 const std::optional<Step> step = StepOfIdleness(call);
                                 return step ? *step : decide(call);
                               });
    const std::lock_guard lock(mutex_);
    ended_ = true;
    changed_.notify_all();
  });
  pid_t daemon = 0;
  {
    // The process writes its id, and the daemon that it is ready; the end comes with its death.
    const Fd ready(open(Ready().c_str(), O_RDONLY | O_CLOEXEC));
    const std::string text = ReadToEnd(ready.Get());
    daemon = std::stoi(text);
    attempt.ready = text.find("ready") != std::string::npos;
  }
  if (attempt.ready) Ask(Work(), course, attempt);
  if (course.deletes) KeepFiles();
  if (attempt.ready) {
    for (const Json::Value& request : course.deletes ? Deletions() : std::vector<Json::Value>()) {
      ++asked_;
      attempt.codes_of_deletions.push_back(CodeOfReplyTo(request));
    }
    attempt.open_files = OpenFiles(daemon);
    const std::lock_guard lock(mutex_);
    if (!ended_) kill(daemon, SIGTERM);
  }
  tracer.join();
  return attempt;
}

// In the process that is traced.
void DaemonStepwise::Become() const {
  const int ready = open(Ready().c_str(), O_WRONLY);
  const int errors = open(Beside(".errors").c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
  dup2(errors, STDERR_FILENO);
  dprintf(ready, "%d\n", getpid());
  const std::string descriptor = std::to_string(ready);
  Stepper::Mark();
  execl(TOVOELASTICD_PATH, "tovoelasticd", "--foreground", "--root", root_.c_str(), "--ready-fd",
        descriptor.c_str(), nullptr);
  _exit(127);
}

void DaemonStepwise::Ask(const std::vector<Json::Value>& requests, const Course& course,
                         Attempt& attempt) {
  for (const Json::Value& request : requests) {
    ++asked_;
    std::size_t wakes = 0;
    {
      const std::lock_guard lock(mutex_);
      wakes = wakes_;
    }
    attempt.codes.push_back(CodeOfReplyTo(request));
    if (attempt.codes.back() == DaemonModel::kNoReply) return;
    AwaitRest();
    if (!course.idles || !LeavesWork(request)) continue;
    if (WakesWhenAnswered(request) && !AwaitWakes(++wakes)) return;
    if (!LetIdle(++wakes)) return;
    ++attempt.pauses;
  }
}

int DaemonStepwise::CodeOfReplyTo(const Json::Value& request) const {
  const std::string reply = AskText(ToText(request));
  return reply.empty() ? DaemonModel::kNoReply : CodeOf(FromText(reply));
}

std::optional<std::size_t> DaemonStepwise::Asked() const {
  const int asked = asked_;
  return asked < 0 ? std::nullopt : std::optional(static_cast<std::size_t>(asked));
}

// A thread that has answered looks whether there is something to do while idle, and may find what
// the next request has left if that comes before.
void DaemonStepwise::NoteReplies(const SystemCall& call) {
  const std::lock_guard lock(mutex_);
  if (Sends(call)) replier_ = call.thread;
  if (call.thread != replier_ || !Waits(call)) return;
  replier_ = kNobody;
  changed_.notify_all();
}

void DaemonStepwise::AwaitRest() {
  std::unique_lock lock(mutex_);
  EXPECT_TRUE(changed_.wait_for(lock, kForEver, [&] { return ended_ || replier_ == kNobody; }))
      << "the thread that has answered does not wait";
}

// The daemon does what can wait when no request has come for two milliseconds. Here that time is
// over at once when the test says so, and never else, so that every run makes the same calls.
std::optional<Step> DaemonStepwise::StepOfIdleness(const SystemCall& call) {
  if (call.number == SYS_write && stepper_.PathOf(call) == "anon_inode:[eventfd]") {
    const std::lock_guard lock(mutex_);
    ++wakes_;
    changed_.notify_all();
  }
  constexpr std::uint64_t kIdle = 10;  // milliseconds; all other waits are longer
#if defined(__x86_64__)
  if (call.number != SYS_epoll_wait || call.arguments[3] == 0 || call.arguments[3] > kIdle) {
    return std::nullopt;
  }
#endif
  Step step;
  if (may_be_idle_.exchange(false)) {
    step.kind = Step::kFail;  // with no error: nothing has come
  } else {
    step.kind = Step::kReplaceArgument;
    step.argument = 3;
    step.value = ~std::uint64_t{0};
  }
  return step;
}

// Lets the daemon be idle once and waits until it is not any more. It says so by waking the thread
// that waits, which is then `wakes` times that it was woken. False when the daemon has ended.
bool DaemonStepwise::LetIdle(std::size_t wakes) {
  may_be_idle_ = true;
  const Fd asks_nothing = Connect(Socket());  // but ends the wait that would have no end
  return AwaitWakes(wakes);
}

bool DaemonStepwise::AwaitWakes(std::size_t count) {
  std::unique_lock lock(mutex_);
  EXPECT_TRUE(changed_.wait_for(lock, kForEver, [&] { return ended_ || wakes_ >= count; }))
      << "the daemon does not see that there is something to do";
  return wakes_ >= count;
}

void DaemonStepwise::KeepFiles() const {
  const fs::path kept = Beside(".kept");
  fs::remove_all(kept);
  for (const char* directory : {"etc", "var/lib", "var/packages"}) {
    fs::create_directories(kept / directory);
    fs::copy(root_ / directory, kept / directory, fs::copy_options::recursive);
  }
}

void DaemonStepwise::TakeKeptFiles() {
  daemon_.reset();
  fs::remove_all(root_);
  fs::rename(Beside(".kept"), root_);
}

DaemonModel DaemonStepwise::ModelOf(const Attempt& attempt, const Course& course) {
  DaemonModel model = ModelOfBeginning();
  const std::vector<Json::Value> work = Work();
  std::size_t pauses = 0;
  for (std::size_t i = 0; i < attempt.codes.size(); ++i) {
    model.Answered(work[i], attempt.codes[i]);
    if (course.idles && LeavesWork(work[i])) model.WasIdle(pauses++ < attempt.pauses);
  }
  return model;
}

DaemonModel DaemonStepwise::ModelOfEnd(const Attempt& attempt, const Course& course) {
  DaemonModel model = ModelOf(attempt, course);
  const std::vector<Json::Value> deletions = Deletions();
  for (std::size_t i = 0; i < attempt.codes_of_deletions.size(); ++i) {
    model.Answered(deletions[i], attempt.codes_of_deletions[i]);
  }
  model.WasIdle(false);
  return model;
}

void DaemonStepwise::ExpectFound(const DaemonModel& model) {
  Start();
  ASSERT_TRUE(daemon_->IsReady());
  for (const auto& [language, found] : Found()) {
    const std::string id = "appindex_" + language;
    EXPECT_TRUE(model.Allows(id, found))
        << id << ": found \"" << found << "\", may be " << model.Text(id);
  }
}

// The files of the root that the daemon has open.
std::vector<std::string> DaemonStepwise::OpenFiles(pid_t daemon) const {
  std::vector<std::string> files;
  std::error_code gone;
  const fs::path directory = "/proc/" + std::to_string(daemon) + "/fd";
  for (const auto& entry : fs::directory_iterator(directory, gone)) {
    const std::string file = fs::read_symlink(entry.path(), gone).string();
    // Xapian does not close the file of a new state that it could not sync.
    const bool xapians = fs::path(file).filename() == "v.tmp (deleted)";
    if (IsBelow(root_.string() + "/", file) && !xapians) files.push_back(file);
  }
  std::sort(files.begin(), files.end());
  return files;
}

DaemonStepwise::State DaemonStepwise::Found() const {
  State state;
  for (const char* language : {"enu", "old", "kept"}) state[language] = Find(language, kWord);
  return state;
}

std::vector<std::string> DaemonStepwise::DoAgain() {
  for (const char* id : {kEnu, kOld}) {
    const int code = CodeOfReplyTo(IdRequest("index_delete", id));
    EXPECT_TRUE(code == 0 || code == 601) << id << ": " << code;
  }
  Make(kOld, "old", "o");
  for (const Json::Value& request : Work()) EXPECT_EQ(CodeOfReplyTo(request), 0);
  EXPECT_EQ(Found(), (State{{"enu", DaemonModel::kMissing}, {"old", "c"}, {"kept", "k"}}));
  EXPECT_EQ(daemon_->Stop(SIGTERM).status, 0);
  std::vector<std::string> names;
  for (const auto& entry : fs::recursive_directory_iterator(root_)) names.push_back(entry.path());
  std::sort(names.begin(), names.end());
  return names;
}

bool DaemonStepwise::IsCounted(const SystemCall& call, bool (*counts)(const SystemCall&)) const {
  if (!counts(call)) return false;
  if (ConcernsClients(call)) return true;
  const std::string path = stepper_.PathOf(call);
  // The daemon names its files as it sees them, the kernel names what is open from outside.
  return IsBelow(root_.string() + "/", path) || IsBelow("/var/", path);
}

}  // namespace test
