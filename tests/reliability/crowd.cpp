#include "tests/reliability/crowd.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <ctime>
#include <new>
#include <stdexcept>

#include "appindex/error.h"
#include "appindex/index_mgr.h"
#include "appindex/utilities/json_helpers.h"
#include "tests/support/indexing.h"
#include "tool/queue_writer.h"

namespace test {
namespace {

using Clock = std::chrono::steady_clock;

constexpr off_t kMuchWaits = 2048;  // bytes in the queue beyond which writers hold back
constexpr int kDoorbellBytes = 4096;
constexpr int kOneOfThreeIsRemoved = 3;
constexpr int kReportsPerKill = 4;

int g_reports = -1;  // where this process reports what it does; -1: nowhere

std::string NameOf(int writer, int generation, int number) {
  return "W" + std::to_string(writer) + "_" + std::to_string(generation) + "_" +
         std::to_string(number);
}

void Send(const Report& report) {
  // Smaller than what a pipe takes as a whole.
  if (write(g_reports, &report, sizeof(report)) != sizeof(report)) _exit(2);
}

bool IsWholeRequest(const std::string& line) {
  Json::Value request;
  return velkor::fromString(request, line) && velkor::toString(request) == line &&
         request["path"].isString() && request["op"].isInt();
}

// How many lines the queue has, and how many of them are not what a writer has written.
Report ReportOfQueue() {
  Report report{Report::kTakesBatch, 0, 0, 0, 0};
  const std::string text = ReadFile(kQueue);
  for (std::size_t begin = 0; begin < text.size();) {
    const std::size_t end = text.find('\n', begin);
    const bool whole = end != std::string::npos && IsWholeRequest(text.substr(begin, end - begin));
    ++report.writer;
    if (!whole) ++report.number;
    begin = end == std::string::npos ? text.size() : end + 1;
  }
  return report;
}

void Ring(int doorbell) {
  const char byte = 0;
  // One that is full has been heard already.
  if (write(doorbell, &byte, 1) != 1 && errno != EAGAIN) _exit(2);
}

void WaitUntilLittleWaits(int doorbell) {
  constexpr timespec kNap{0, 1000000};
  struct stat queue {};
  while (stat(kQueue, &queue) == 0 && queue.st_size > kMuchWaits) {
    Ring(doorbell);  // whoever has heard it before may have been killed
    nanosleep(&kNap, nullptr);
  }
}

void Ask(Report report, int doorbell) {
  report.kind = Report::kAsks;
  Send(report);
  const std::string conf = ConfOf(NameOf(report.writer, report.generation, report.number));
  tool::AppendToQueue({tool::QueueRequest(report.op, conf)});
  report.kind = Report::kAsked;
  Send(report);
  Ring(doorbell);
}

void WriteRequests(int writer, int generation, int requests, const std::atomic<bool>& stop,
                   int doorbell) {
  for (int number = 0; number < requests && !stop; ++number) {
    WaitUntilLittleWaits(doorbell);
    Install(NameOf(writer, generation, number));
    Ask({Report::kAsks, 1, writer, generation, number}, doorbell);
    if (number % kOneOfThreeIsRemoved == 2) {
      Ask({Report::kAsks, 2, writer, generation, number}, doorbell);
    }
  }
  Send({Report::kEnds, 0, writer, generation, 0});
}

// False when another processor, or a writer, held a lock for too long.
bool TryToProcess() {
  try {
    velkor::appindex::ProcessQueue();
    return true;
  } catch (const velkor::Error& error) {
    if (error.code != velkor::Error::kLockFileError) throw;
    return false;
  }
}

// Works the queue whenever it is told to, until nobody can tell any more.
void ProcessRequests(int doorbell) {
  char told[kDoorbellBytes];
  while (read(doorbell, told, sizeof(told)) > 0) {
    while (!TryToProcess()) {
    }
  }
}

template <typename Work>
[[noreturn]] void EndAfter(const Work& work) {
  try {
    work();
  } catch (...) {
    _exit(1);
  }
  _exit(0);
}

void MakePipe(int (&ends)[2]) {
  if (pipe2(ends, O_CLOEXEC) != 0) throw std::runtime_error("no pipe");
}

}  // namespace

Crowd::Crowd(const Limits& limits, unsigned seed)
    : limits_(limits),
      random_(seed),
      members_(static_cast<std::size_t>(limits.writers + limits.processors)),
      writers_left_(limits.writers) {
  MakePipe(reports_);
  MakePipe(doorbell_);
  fcntl(doorbell_[1], F_SETFL, O_NONBLOCK);
  fcntl(doorbell_[1], F_SETPIPE_SZ, kDoorbellBytes);
  void* const shared =
      mmap(nullptr, sizeof(*stop_), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
  if (shared == MAP_FAILED) throw std::runtime_error("no memory to share");
  stop_ = new (shared) std::atomic<bool>(false);
}

Crowd::~Crowd() {
  close(reports_[0]);
  munmap(stop_, sizeof(*stop_));
}

void Crowd::Spawn(std::size_t member) {
  Member& new_one = members_[member];
  ++new_one.generation;
  new_one.ended = false;
  new_one.pid = fork();
  if (new_one.pid != 0) return;
  g_reports = reports_[1];
  if (IsWriter(member)) {
    EndAfter([&] {
      WriteRequests(static_cast<int>(member), new_one.generation, limits_.requests, *stop_,
                    doorbell_[1]);
    });
  }
  close(doorbell_[1]);
  EndAfter([&] { ProcessRequests(doorbell_[0]); });
}

void Crowd::NoteRequest(const Report& report) {
  Asked& asked = applications_[NameOf(report.writer, report.generation, report.number)];
  const bool written = report.kind == Report::kAsked;
  if (written) ++figures_.requests;
  if (report.op == 1) {
    asked.added = asked.added || written;
  } else {
    asked.removal_begun = true;
    asked.removed = asked.removed || written;
  }
}

void Crowd::Note(const Report& report) {
  switch (report.kind) {
    case Report::kAsks:
    case Report::kAsked:
      return NoteRequest(report);
    case Report::kTakesBatch:
      ++figures_.batches;
      figures_.lines += report.writer;
      figures_.torn_lines += report.number;
      return;
    case Report::kEnds:
      const auto member = static_cast<std::size_t>(report.writer);
      // Else it was killed behind this report, and another one has begun.
      if (members_[member].generation == report.generation) {
        WaitFor(member, 0);
        --writers_left_;
      }
  }
}

void Crowd::WaitFor(std::size_t member, int signal) {
  int status = 0;
  waitpid(members_[member].pid, &status, 0);
  members_[member].ended = true;
  const bool killed = WIFSIGNALED(status) && WTERMSIG(status) == signal;
  if (killed) ++(IsWriter(member) ? figures_.killed_writers : figures_.killed_processors);
  if (!killed && !(WIFEXITED(status) && WEXITSTATUS(status) == 0)) ++figures_.failures;
}

// As often a processor, of which there are few, as a writer.
void Crowd::KillOne() {
  const bool writer = random_() % 2 == 0;
  const auto chosen =
      static_cast<std::size_t>(writer ? random_() % static_cast<unsigned>(limits_.writers)
                                      : static_cast<unsigned>(limits_.writers) +
                                            random_() % static_cast<unsigned>(limits_.processors));
  if (members_[chosen].ended) return;
  kill(members_[chosen].pid, SIGKILL);
  WaitFor(chosen, SIGKILL);  // a writer may have come to its end before
  Spawn(chosen);
}

void Crowd::Run() {
  const Clock::time_point end = Clock::now() + std::chrono::duration_cast<Clock::duration>(
                                                   std::chrono::duration<double>(limits_.seconds));
  for (std::size_t member = 0; member < members_.size(); ++member) Spawn(member);
  Report report{};
  while (writers_left_ > 0 && read(reports_[0], &report, sizeof(report)) == sizeof(report)) {
    Note(report);
    const int kills = figures_.killed_writers + figures_.killed_processors;
    if (!*stop_ && kills < limits_.kills && random_() % kReportsPerKill == 0) KillOne();
    if (Clock::now() > end) *stop_ = true;
  }
  close(doorbell_[0]);
  close(doorbell_[1]);
  close(reports_[1]);
  while (read(reports_[0], &report, sizeof(report)) == sizeof(report)) Note(report);
  for (std::size_t member = 0; member < members_.size(); ++member) {
    if (!members_[member].ended) WaitFor(member, 0);
  }
}

}  // namespace test

#define VISIBLE __attribute__((visibility("default")))

extern "C" {

// Moves the queue aside, and looks at what is in it: now it is whole, and nobody writes to it.
VISIBLE int rename(const char* from, const char* to) noexcept {
  const bool takes_batch = test::g_reports >= 0 && std::string(to) == test::kBatch;
  test::Report report{};
  if (takes_batch) report = test::ReportOfQueue();
  const int result = static_cast<int>(syscall(SYS_rename, from, to));
  if (takes_batch && result == 0) test::Send(report);
  return result;
}

// Time goes a thousand times as fast: processes wait for each other as they do elsewhere.
VISIBLE int usleep(useconds_t microseconds) {
  const timespec nanoseconds{0, static_cast<long>(microseconds)};
  return nanosleep(&nanoseconds, nullptr);
}

}  // extern "C"
