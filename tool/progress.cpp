#include "tool/progress.h"

#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <ctime>
#include <filesystem>

#include "appindex/index_mgr_internal.h"
#include "tool/interrupt.h"
#include "tool/output.h"

namespace tool {
namespace {

using std::chrono::milliseconds;

constexpr milliseconds kRedraw(100);
constexpr std::size_t kNarrowestLabel = 8;
constexpr char kGap[] = "  ";
constexpr char kStartOfLine[] = "\r";
constexpr char kEraseToEnd[] = "\033[K";
constexpr milliseconds kLongPause(5000);

std::string PerCent(const Progress& progress) {
  char text[8];
  std::snprintf(
      text, sizeof(text), "%3u%%",
      static_cast<unsigned>(progress.done * 100 / std::max<std::size_t>(progress.total, 1)));
  return text;
}

// As wide at the beginning as at the end.
std::string Counts(const Progress& progress) {
  const std::string total = std::to_string(progress.total);
  const std::string done = std::to_string(progress.done);
  return std::string(total.size() - std::min(total.size(), done.size()), ' ') + done + "/" + total;
}

// Documents a second, rounded; 0 before there is anything to tell it from.
long long Rate(const Progress& progress) {
  if (progress.elapsed.count() == 0) return 0;
  return static_cast<long long>(progress.done) * 1000 / progress.elapsed.count();
}

std::string RateText(const Progress& progress) { return std::to_string(Rate(progress)) + "/s"; }

std::string TimeLeft(const Progress& progress) {
  const auto left = static_cast<long long>(progress.total - progress.done);
  const auto done = static_cast<long long>(progress.done);
  return Duration((progress.elapsed.count() * left / done + 999) / 1000) + " left";
}

// As wide as suits a line of so many columns, whatever stands beside it; none where that is narrow.
std::string Bar(const Progress& progress, std::size_t line) {
  const std::size_t columns = line >= 99 ? 32 : line >= 69 ? 20 : line >= 49 ? 10 : 0;
  if (columns == 0) return "";
  const std::size_t full = columns * progress.done / std::max<std::size_t>(progress.total, 1);
  return "[" + std::string(full, '#') + std::string(columns - full, '-') + "] ";
}

// Appends `part` if it fits into `columns`.
void AppendIfFits(std::string& text, const std::string& part, std::size_t columns) {
  if (text.size() + part.size() + sizeof(kGap) - 1 <= columns) text += kGap + part;
}

void AppendNumbers(std::string& text, const Progress& progress, std::size_t columns) {
  text += PerCent(progress);
  AppendIfFits(text, Counts(progress), columns);
  if (Rate(progress) == 0) return;
  const std::string left = TimeLeft(progress);
  // Before the time left on the line, but only where there is room for both.
  AppendIfFits(text, RateText(progress),
               columns - std::min(columns, left.size() + sizeof(kGap) - 1));
  AppendIfFits(text, left, columns);
}

// What is worked on, as far as there is room.
void AppendLabel(std::string& text, const Progress& progress, std::size_t columns) {
  std::string label = progress.current;
  if (progress.requests > 1) {
    label = std::to_string(progress.request) + " of " + std::to_string(progress.requests) + ": " +
            label;
  }
  const std::size_t begin = text.size() + sizeof(kGap) - 1;
  if (label.empty() || columns < begin + kNarrowestLabel) return;
  text += kGap + Shortened(label, columns - begin);
}

std::string Why(velkor::appindex::Observer::Wait reason) {
  using Wait = velkor::appindex::Observer::Wait;
  switch (reason) {
    case Wait::kLock:
      return "waiting for another process that works the queue or writes to it";
    case Wait::kSocket:
      return "waiting for the search daemon to start";
    case Wait::kNotReady:
      return "waiting for the search daemon's database";
    default:
      return "waiting, the search daemon is busy";
  }
}

// The name of the application's directory, as it is known to people.
std::string ApplicationOf(const std::string& conf_path) {
  for (const std::string& root : velkor::appindex::kAppRoots) {
    if (conf_path.compare(0, root.size(), root) == 0) {
      return conf_path.substr(root.size(), conf_path.find('/', root.size()) - root.size());
    }
  }
  return conf_path;
}

// "14:05:30", the time of day when `pause` will be over.
std::string TimeOfDayAfter(milliseconds pause) {
  const std::time_t then = std::chrono::system_clock::to_time_t(
      std::chrono::system_clock::now() + std::chrono::duration_cast<std::chrono::seconds>(pause));
  std::tm local{};
  char text[16];
  localtime_r(&then, &local);
  std::strftime(text, sizeof(text), "%H:%M:%S", &local);
  return text;
}

// One write, so that a signal finds the line whole.
void WriteToTerminal(const std::string& text) {
  if (write(STDERR_FILENO, text.data(), text.size()) < 0) return;  // nobody is there to be told
}

}  // namespace

std::string RenderProgress(const Progress& progress, int columns) {
  const std::size_t width = columns > 1 ? static_cast<std::size_t>(columns) - 1 : 0;
  if (!progress.waiting.empty()) {
    const std::string text = progress.total == 0 ? "" : PerCent(progress) + kGap;
    return Shortened(text + progress.waiting, width);
  }
  std::string text = Bar(progress, width);
  AppendNumbers(text, progress, width);
  AppendLabel(text, progress, width);
  return Shortened(text, width);
}

ProgressLine::ProgressLine(bool visible) : visible_(visible) {
  velkor::appindex::SetObserver(this);
}

ProgressLine::~ProgressLine() {
  velkor::appindex::SetObserver(nullptr);
  if (drawn_ == Clock::time_point()) return;
  WriteToTerminal(std::string(kStartOfLine) + kEraseToEnd);
  SetLineOpen(false);
}

void ProgressLine::OnRequest(std::size_t number, std::size_t total) {
  ++requests_;
  progress_ = {};
  progress_.request = number;
  progress_.requests = total;
}

void ProgressLine::OnWork(std::size_t documents) {
  progress_.done = 0;
  progress_.total = documents;
  progress_.current.clear();
  progress_.waiting.clear();
  begun_ = Clock::now();
  Draw();
}

void ProgressLine::OnDocument(const std::string& conf_path, const std::string& lang) {
  ++documents_;
  ++progress_.done;
  // A package that has grown since it was counted, and what follows a rebuild within a rebuild.
  progress_.total = std::max(progress_.total, progress_.done);
  progress_.waiting.clear();
  if (!visible_) return;
  progress_.current = ApplicationOf(conf_path) + " " + lang;
  DrawIfDue();
}

void ProgressLine::OnWait(Wait reason, milliseconds pause) {
  if (!visible_) return;
  progress_.waiting = Why(reason);
  if (pause >= kLongPause) progress_.waiting += "; next try at " + TimeOfDayAfter(pause);
  Draw();
}

void ProgressLine::DrawIfDue() {
  if (progress_.done == progress_.total || Clock::now() - drawn_ >= kRedraw) Draw();
}

// The terminal's width is asked for each time. A handler of SIGWINCH would know it no earlier, and
// would cut short the library's pauses.
void ProgressLine::Draw() {
  if (!visible_) return;
  drawn_ = Clock::now();
  progress_.elapsed = std::chrono::duration_cast<milliseconds>(drawn_ - begun_);
  SetLineOpen(true);
  WriteToTerminal(kStartOfLine + RenderProgress(progress_, TerminalWidth(STDERR_FILENO)) +
                  kEraseToEnd);
}

}  // namespace tool
