// The search daemon, killed before each of its system calls that leave something behind: on the
// disk, or with a client. Then the same while calls that concern its files fail, once and for good.
// What was answered as committed is there afterwards, nothing is damaged, and the same requests
// lead to the same files again.
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <csignal>
#include <filesystem>
#include <map>
#include <optional>
#include <set>
#include <thread>

#include "tests/crash/faults.h"
#include "tests/crash/runs.h"
#include "tests/crash/stepper.h"
#include "tests/support/searchd_test.h"

namespace test {
namespace {

namespace fs = std::filesystem;

constexpr char kWord[] = "xylophone";  // finds every document
constexpr int kNoReply = -1;

// "NAME=..." of each index: the ids of what searches find in it, or the code of their failure.
using State = std::map<std::string, std::string>;

Json::Value Titled(const std::string& id) { return Document(id, kWord); }

// The work: an index is made, filled, changed and deleted, and another one is made anew.
std::vector<Json::Value> Work() {
  const std::string enu = "appindex_enu";
  const std::string old = "appindex_old";
  return {CreateRequest(enu, std::string(kIndexes) + "enu"),
          UpsertRequest(enu, Titled("a")),
          UpsertRequest(enu, Titled("b")),
          IdRequest("commit", enu),
          RemovalRequest(enu, "a"),
          IdRequest("commit", enu),
          IdRequest("index_delete", old),
          CreateRequest(old, std::string(kIndexes) + "old"),
          UpsertRequest(old, Titled("c")),
          IdRequest("commit", old),
          IdRequest("index_delete", enu),
          IdRequest("commit", old)};
}

constexpr char kMissing[] = "601";

// What may be found in the two indexes when so many requests were answered and the next one was
// perhaps begun: creations and deletions are certain only with a commit, a change is with its own.
struct Allowed {
  std::set<std::string> enu;
  std::set<std::string> old;
};

const std::vector<Allowed>& AllowedAfter() {
  static const std::vector<Allowed> allowed = {
      {{kMissing, ""}, {"o"}},
      {{kMissing, ""}, {"o"}},
      {{kMissing, ""}, {"o"}},
      {{kMissing, "", "a b"}, {"o"}},
      {{"a b"}, {"o"}},
      {{"a b", "b"}, {"o"}},
      {{"b"}, {"o", kMissing}},
      {{"b"}, {"o", kMissing, ""}},
      {{"b"}, {"o", kMissing, ""}},
      {{"b"}, {"o", kMissing, "", "c"}},
      {{"b", kMissing}, {"c"}},
      {{"b", kMissing}, {"c"}},
      {{kMissing}, {"c"}},
  };
  return allowed;
}

bool Makes(const SystemCall& call) {
  return call.number == SYS_openat && (call.arguments[2] & (O_CREAT | O_TRUNC)) != 0;
}

// Whether a process that dies before the call leaves something else behind than one that dies after
// it: files, or what a client has been told. Of the files those of the root count.
bool Lasts(const SystemCall& call) {
  switch (call.number) {
    case SYS_write:
    case SYS_pwrite64:
    case SYS_fsync:
    case SYS_fdatasync:
    case SYS_ftruncate:
    case SYS_unlinkat:
    case SYS_mkdirat:
    case SYS_fchmod:
    case SYS_bind:
    case SYS_sendto:
    case SYS_sendmsg:
#if defined(__x86_64__)
    case SYS_rename:
    case SYS_unlink:
    case SYS_mkdir:
    case SYS_chmod:
#endif
      return true;
    default:
      return Makes(call);
  }
}

bool NeedsNoFile(const SystemCall& call) {
  return call.number == SYS_bind || call.number == SYS_sendto || call.number == SYS_sendmsg;
}

// The daemon does what can wait when no request has come for two milliseconds. Here it never is
// idle, so that every run makes the same calls.
std::optional<Step> WithoutIdleness(const SystemCall& call) {
  constexpr std::uint64_t kIdle = 10;  // milliseconds; all other waits are longer
#if defined(__x86_64__)
  if (call.number != SYS_epoll_wait || call.arguments[3] == 0 || call.arguments[3] > kIdle) {
    return std::nullopt;
  }
#endif
  Step step;
  step.kind = Step::kReplaceArgument;
  step.argument = 3;
  step.value = ~std::uint64_t{0};
  return step;
}

class DaemonStepwise : public SearchdTest {
 protected:
  struct Attempt {
    End end;
    bool ready = false;
    std::vector<int> codes;               // of the replies, up to the first that did not come
    std::vector<std::string> open_files;  // of the root, when all requests are answered
  };

  void SetUp() override {
    SearchdTest::SetUp();
    const std::string refusal = Stepper::Refusal();
    if (!refusal.empty()) GTEST_SKIP() << refusal;
    Start();
    Make("appindex_kept", "kept", "k");
    Make("appindex_old", "old", "o");
    ASSERT_EQ(daemon_->Stop(SIGTERM).status, 0);
    before_ = root_.string() + ".before";
    fs::copy(root_, before_, fs::copy_options::recursive);
  }

  void TearDown() override {
    SearchdTest::TearDown();
    fs::remove_all(before_);
    fs::remove(Ready());
    fs::remove(Errors());
    close(outside_);
  }

  void Make(const std::string& id, const std::string& directory,
            const std::string& document) const {
    EXPECT_EQ(CodeOf(Ask(CreateRequest(id, kIndexes + directory))), 0);
    EXPECT_EQ(CodeOf(Ask(UpsertRequest(id, Titled(document)))), 0);
    EXPECT_EQ(CodeOf(Ask(IdRequest("commit", id))), 0);
  }

  std::string Ready() const { return root_.string() + ".ready"; }
  std::string Errors() const { return root_.string() + ".errors"; }

  // Runs the work in a traced daemon, from the same beginning each time, and `then` more.
  Attempt Run(const Stepper::Decide& decide, const std::vector<Json::Value>& then = {}) {
    daemon_.reset();
    fs::remove_all(root_);
    fs::copy(before_, root_, fs::copy_options::recursive);
    fs::remove(Ready());
    EXPECT_EQ(mkfifo(Ready().c_str(), 0600), 0);

    Attempt attempt;
    std::atomic<bool> ended = false;
    std::thread tracer([&] {
      attempt.end = stepper_.Run([this] { Become(); }, decide);
      ended = true;
    });
    pid_t daemon = 0;
    {
      // The process writes its id, and the daemon that it is ready; the end comes with its death.
      const Fd ready(open(Ready().c_str(), O_RDONLY | O_CLOEXEC));
      const std::string text = ReadToEnd(ready.Get());
      daemon = std::stoi(text);
      attempt.ready = text.find("ready") != std::string::npos;
    }
    if (attempt.ready) {
      attempt.codes = CodesOf(Work());
      CodesOf(then);
      attempt.open_files = OpenFiles(daemon);
      if (!ended) kill(daemon, SIGTERM);
    }
    tracer.join();
    return attempt;
  }

  // In the process that is traced.
  void Become() const {
    const int ready = open(Ready().c_str(), O_WRONLY);
    const int errors = open(Errors().c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    dup2(errors, STDERR_FILENO);
    dprintf(ready, "%d\n", getpid());
    const std::string descriptor = std::to_string(ready);
    Stepper::Mark();
    execl(TOVOELASTICD_PATH, "tovoelasticd", "--foreground", "--root", root_.c_str(), "--ready-fd",
          descriptor.c_str(), nullptr);
    _exit(127);
  }

  std::vector<int> CodesOf(const std::vector<Json::Value>& requests) const {
    std::vector<int> codes;
    for (const Json::Value& request : requests) {
      const std::string reply = AskText(ToText(request));
      codes.push_back(reply.empty() ? kNoReply : CodeOf(FromText(reply)));
      if (codes.back() == kNoReply) break;
    }
    return codes;
  }

  // The files of the root that the daemon has open.
  std::vector<std::string> OpenFiles(pid_t daemon) const {
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

  // What searches find, once the daemon runs undisturbed.
  State Found() const {
    State state;
    for (const char* language : {"enu", "old", "kept"}) state[language] = Find(language, kWord);
    return state;
  }

  // The work from the beginning, by a daemon that nothing disturbs, and the files that it leaves.
  std::vector<std::string> DoAgain() {
    for (const char* id : {"appindex_enu", "appindex_old"}) {
      const int code = CodeOf(Ask(IdRequest("index_delete", id)));
      EXPECT_TRUE(code == 0 || code == 601) << id << ": " << code;
    }
    Make("appindex_old", "old", "o");
    for (const int code : CodesOf(Work())) EXPECT_EQ(code, 0);
    EXPECT_EQ(Found(), (State{{"enu", kMissing}, {"old", "c"}, {"kept", "k"}}));
    EXPECT_EQ(daemon_->Stop(SIGTERM).status, 0);
    std::vector<std::string> names;
    for (const auto& entry : fs::recursive_directory_iterator(root_)) names.push_back(entry.path());
    std::sort(names.begin(), names.end());
    return names;
  }

  // Whether a call is one of those that are counted: those that `counts` holds for, in the root.
  bool IsCounted(const SystemCall& call, bool (*counts)(const SystemCall&)) const {
    if (!counts(call)) return false;
    if (NeedsNoFile(call)) return true;
    // The daemon names its files as it sees them, the kernel names what is open from outside.
    const std::string path = stepper_.PathOf(call);
    return IsBelow(root_.string() + "/", path) || IsBelow("/var/", path);
  }

  static bool IsBelow(const std::string& directory, const std::string& path) {
    return path.compare(0, directory.size(), directory) == 0;
  }

  fs::path before_;
  int outside_ = open("/", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  Stepper stepper_{outside_};
};

// Each takes a fraction of a second.
const Runs kFew{2, 2};

TEST_F(DaemonStepwise, LosesNothingWhenKilled) {
  const Runs runs = Runs::FromEnvironment(kFew);
  Tally tally;
  tally.subject = "daemon";
  const auto decide = [this](std::size_t& count, std::optional<std::size_t> last) {
    return [this, &count, last](const SystemCall& call) {
      if (const std::optional<Step> step = WithoutIdleness(call)) return *step;
      Step step;
      if (IsCounted(call, Lasts) && count++ == last) step.kind = Step::kKill;
      return step;
    };
  };
  const Attempt undisturbed = Run(decide(tally.points, std::nullopt));
  ASSERT_EQ(undisturbed.codes, std::vector<int>(Work().size(), 0));
  ASSERT_EQ(undisturbed.end.status, 0);
  Start();
  const std::vector<std::string> files = DoAgain();

  for (const std::size_t point : runs.Sample(tally.points, runs.kills)) {
    SCOPED_TRACE("killed before call " + std::to_string(point));
    std::size_t count = 0;
    const Attempt attempt = Run(decide(count, point));
    ++(attempt.end.killed ? tally.killed : tally.survived);
    Start();
    ASSERT_TRUE(daemon_->IsReady());
    std::size_t answered = 0;
    while (answered < attempt.codes.size() && attempt.codes[answered] == 0) ++answered;
    const State state = Found();
    const Allowed& allowed = AllowedAfter()[answered];
    EXPECT_EQ(allowed.enu.count(state.at("enu")), 1U) << answered << ": " << state.at("enu");
    EXPECT_EQ(allowed.old.count(state.at("old")), 1U) << answered << ": " << state.at("old");
    EXPECT_EQ(state.at("kept"), "k");
    EXPECT_EQ(DoAgain(), files);
    if (HasFailure()) return;
  }
  tally.Print();
}

// Calls that concern files: those that leave something behind, and those that look at it.
bool ConcernsFiles(const SystemCall& call) {
  switch (call.number) {
    case SYS_openat:
    case SYS_read:
    case SYS_pread64:
    case SYS_close:
    case SYS_newfstatat:
    case SYS_getdents64:
    case SYS_flock:
    case SYS_fcntl:
      return true;
    default:
      return Lasts(call) && !NeedsNoFile(call);
  }
}

// With these the daemon holds no index open any more.
std::vector<Json::Value> Deletions() {
  return {IdRequest("index_delete", "appindex_enu"), IdRequest("index_delete", "appindex_old"),
          IdRequest("commit", "appindex_kept")};
}

TEST_F(DaemonStepwise, LosesNothingWhenCallsFail) {
  const Runs runs = Runs::FromEnvironment(kFew);
  Tally tally;
  tally.subject = "daemon_faults";
  struct Injection {
    std::size_t point;
    long number;
    Fault fault;
  };
  std::vector<Injection> injections;
  std::size_t points = 0;
  const Attempt undisturbed = Run(
      [&](const SystemCall& call) {
        if (const std::optional<Step> step = WithoutIdleness(call)) return *step;
        if (!IsCounted(call, ConcernsFiles)) return Step{};
        for (const Fault& fault : FaultsOf(call))
          injections.push_back({points, call.number, fault});
        ++points;
        return Step{};
      },
      Deletions());
  ASSERT_EQ(undisturbed.codes, std::vector<int>(Work().size(), 0));
  Start();
  const std::vector<std::string> files = DoAgain();
  tally.possible = injections.size();

  for (const std::size_t i : runs.Sample(injections.size(), runs.faults)) {
    const Injection& injection = injections[i];
    SCOPED_TRACE("call " + std::to_string(injection.point) + ": " +
                 injection.fault.Text(injection.number));
    std::size_t next = 0;
    const Attempt attempt = Run(
        [&](const SystemCall& call) {
          if (const std::optional<Step> step = WithoutIdleness(call)) return *step;
          if (!IsCounted(call, ConcernsFiles)) return Step{};
          const std::size_t at = next++;
          const bool hit =
              at == injection.point || (injection.fault.for_good && at > injection.point);
          if (!hit || call.number != injection.number) return Step{};
          Step step = injection.fault.Inject(call);
          step.last = false;  // the daemon must not become idle
          return step;
        },
        Deletions());
    ++tally.injected;
    // A daemon that cannot begin says so and ends; one that has begun answers every request.
    EXPECT_TRUE(WIFEXITED(attempt.end.status)) << attempt.end.status;
    if (attempt.ready) {
      EXPECT_EQ(std::count(attempt.codes.begin(), attempt.codes.end(), kNoReply), 0);
      EXPECT_EQ(attempt.open_files,
                std::vector<std::string>{Outside("/var/lib/tovoelasticd/lock")});
    } else {
      EXPECT_NE(WEXITSTATUS(attempt.end.status), 0);
    }
    Start();
    ASSERT_TRUE(daemon_->IsReady());
    const State state = Found();
    EXPECT_EQ(state.at("kept"), "k");
    for (const auto& [name, found] : state) EXPECT_NE(found, "605") << name << " is damaged";
    EXPECT_EQ(DoAgain(), files);
    if (HasFailure()) return;
  }
  tally.Print();
}

}  // namespace
}  // namespace test
