// The progress of the library's work on one line of a terminal.
#pragma once

#include <chrono>
#include <cstddef>
#include <string>

#include "appindex/observer.h"

namespace tool {

// What the line tells.
struct Progress {
  std::size_t request = 0;  // of a batch, from 1; 0: not the work of a queue
  std::size_t requests = 0;
  std::size_t done = 0;  // documents
  std::size_t total = 0;
  std::chrono::milliseconds elapsed{0};  // since the first of them was begun
  std::string current;                   // what was worked on last
  std::string waiting;                   // why nothing is done now; empty: it is
};

// The line for a terminal of so many columns: bar, per cent, documents done and total, rate and
// time left, and what is worked on. What does not fit is left out, the least needed first. At least
// one column stays free, so that the cursor stays in the line.
std::string RenderProgress(const Progress& progress, int columns);

// Counts what the library does while it exists, as the library's observer, and shows it on standard
// error if asked to. Wipes the line at its end.
class ProgressLine : public velkor::appindex::Observer {
 public:
  explicit ProgressLine(bool visible);
  ~ProgressLine() override;

  std::size_t documents() const { return documents_; }  // written or deleted so far
  std::size_t requests() const { return requests_; }    // of the queue, begun so far

  void OnRequest(std::size_t number, std::size_t total) override;
  void OnWork(std::size_t documents) override;
  void OnDocument(const std::string& conf_path, const std::string& lang) override;
  void OnWait(Wait reason, std::chrono::milliseconds pause) override;

 private:
  void Draw();
  void DrawIfDue();

  using Clock = std::chrono::steady_clock;

  const bool visible_;
  std::size_t documents_ = 0;
  std::size_t requests_ = 0;
  Progress progress_;
  Clock::time_point begun_;
  Clock::time_point drawn_;
};

}  // namespace tool
