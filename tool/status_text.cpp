// The state of everything, for a reader.
#include <algorithm>
#include <cstring>
#include <ctime>
#include <iomanip>
#include <sstream>
#include <string>
#include <vector>

#include "appindex/error.h"
#include "tool/failure.h"
#include "tool/output.h"
#include "tool/status.h"

namespace tool {
namespace {

constexpr std::size_t kColumns = 80;
constexpr std::size_t kHeadColumns = 16;
constexpr std::size_t kIndexesPerLine = 5;
constexpr std::size_t kCell = 11;
constexpr std::size_t kStepsShown = 20;
constexpr std::size_t kStepIndent = 4;

void Begin(std::ostream& out, const std::string& head) {
  out << std::left << std::setw(static_cast<int>(kHeadColumns)) << head;
}

void Continue(std::ostream& out) { out << std::string(kHeadColumns, ' '); }

using Words = std::vector<std::string>;

Words WordsOf(const std::string& text) {
  std::istringstream stream(OneLine(text));
  Words words;
  std::string word;
  while (stream >> word) words.push_back(word);
  return words;
}

// Goes on `indent` columns behind the head, in as many lines as it takes, and ends the last. A path
// that is longer than a line stands there as it is, any other such word is cut.
void WriteWords(std::ostream& out, const Words& words, std::size_t indent = 0) {
  const std::size_t columns = kColumns - kHeadColumns - indent;
  std::size_t written = 0;
  for (std::string word : words) {
    if (word[0] != '/') word = Shortened(word, columns);
    if (written > 0 && written + 1 + word.size() > columns) {
      out << "\n" << std::string(kHeadColumns + indent, ' ');
      written = 0;
    } else if (written > 0) {
      out << " ";
      ++written;
    }
    out << word;
    written += word.size();
  }
  out << "\n";
}

void WriteProblem(std::ostream& out, const Problem& problem, std::size_t indent = 0) {
  constexpr char kMark[] = "! ";
  Continue(out);
  out << std::string(indent, ' ') << kMark;
  Words words = WordsOf(problem.line);
  if (problem.code != 0) words.push_back("(code " + std::to_string(problem.code) + ")");
  WriteWords(out, words, indent + std::strlen(kMark));
}

void WriteDaemon(std::ostream& out, const Status& status) {
  Begin(out, "Search daemon");
  out << (status.daemon_problem.empty()                      ? "answers"
          : !status.daemon_refuses                           ? "does not answer"
          : IsNotReady(status.daemon_code)                   ? "is not ready"
          : status.daemon_code == velkor::Error::kDaemonBusy ? "is busy"
                                                             : "refuses")
      << "\n";
  if (!status.daemon_problem.empty()) {
    WriteProblem(out, {status.daemon_problem, false, status.daemon_code});
  }
}

void WriteFile(std::ostream& out, const std::string& head, const RequestFile& file,
               const char* remark) {
  Begin(out, head);
  switch (file.state) {
    case RequestFile::kMissing:
      out << "none\n";
      return;
    case RequestFile::kUnreadable:
      out << "cannot be read: " << file.cause << "\n";
      return;
    case RequestFile::kReadable:
      out << Counted(file.requests.size(), "request") << " in " << Counted(file.lines, "line")
          << ", last written " << Duration(file.age) << " ago" << remark << "\n";
  }
}

// In the device's own time.
std::string TimeText(std::time_t time) {
  std::tm parts{};
  char text[32];
  localtime_r(&time, &parts);
  std::strftime(text, sizeof(text), "%Y-%m-%d %H:%M", &parts);
  return text;
}

std::string NameOf(const Step& step) {
  return step.path.empty() ? "everything" : OneLine(step.path);
}

void WriteCulprit(std::ostream& out, const char* head, const Step& step) {
  Begin(out, head);
  out << NameOfOperation(step.op) << " " << NameOf(step) << "\n";
  WriteProblem(out, step.problem);
}

void WriteWaiting(std::ostream& out, const Status& status) {
  if (const Step* step = status.FirstFailing(status.batch)) {
    WriteCulprit(out, "Held up by", *step);
    Continue(out);
    out << "all of the batch waits for it, since " << TimeText(status.batch.written) << "\n";
  } else if (status.batch.state == RequestFile::kReadable && status.daemon_problem.empty() &&
             !status.IsWorked() && !status.IsLockedOut()) {
    Begin(out, "Left because");
    out << "not known here, no request of it fails; the system log may say\n";
  }
  if (const Step* step = status.FirstFailing(status.queue)) {
    WriteCulprit(out, "Will fail", *step);
  }
  const std::string waiting = status.Waiting();
  if (waiting.empty()) return;
  Begin(out, "Waiting");
  WriteWords(out, WordsOf(waiting));
}

void WriteOrder(std::ostream& out, const Status& status) {
  std::size_t number = 0;
  for (const Step& step : status.order) {
    if (number == kStepsShown) {
      Continue(out);
      out << "... and " << status.order.size() - number << " more (--json has all)\n";
      return;
    }
    number == 0 ? Begin(out, "To be done") : Continue(out);
    out << std::right << std::setw(2) << ++number << ". " << std::left << std::setw(8)
        << NameOfOperation(step.op) << NameOf(step) << "\n";
    if (step.problem.line.empty()) continue;
    WriteProblem(out, step.problem, kStepIndent);
  }
}

void WriteLocks(std::ostream& out, const Status& status) {
  for (const Lock& lock : status.locks) {
    if (!lock.problem.line.empty()) {
      Begin(out, "No lock");
      WriteWords(out, {lock.path});
      WriteProblem(out, lock.problem);
    }
    for (const LockHolder& holder : lock.holders) {
      Begin(out, "Locked");
      const std::string pid = " (" + std::to_string(holder.pid) + ")";
      WriteWords(out, WordsOf(lock.path + " by " +
                              (holder.has_ended
                                   ? "a process that cannot be seen; the one that took it has "
                                     "ended"
                               : holder.program.empty() ? "process"
                                                        : holder.program) +
                              pid));
    }
  }
}

void WriteVersion(std::ostream& out, const Version& version) {
  Begin(out, "System version");
  if (!version.problem.empty()) {
    WriteWords(out, WordsOf("not known: " + version.problem));
    return;
  }
  out << version.current << "\n";
  Begin(out, "Indexed for");
  if (version.recorded.empty()) {
    out << "none yet; `appindex reindex` builds the index\n";
  } else {
    out << version.recorded << (version.Differs() ? "; `appindex reindex` is due" : "") << "\n";
  }
}

std::string Cell(const std::string& lang, const Index& found) {
  switch (found.state) {
    case Index::kWhole:
      return lang + " " + std::to_string(found.documents);
    case Index::kDamaged:
      return lang + " damaged";
    default:
      return lang + " none";
  }
}

void WriteIndexes(std::ostream& out, const std::map<std::string, Index>& indexes) {
  std::size_t number = 0;
  for (const auto& [lang, found] : indexes) {
    if (number % kIndexesPerLine == 0) Begin(out, number == 0 ? "Documents" : "");
    const std::string cell = Cell(lang, found);
    const bool last = ++number % kIndexesPerLine == 0 || number == indexes.size();
    out << cell << (last ? "\n" : std::string(std::max(kCell, cell.size() + 2) - cell.size(), ' '));
  }
  for (const auto& [lang, found] : indexes) {
    if (found.state != Index::kDamaged) continue;
    Begin(out, "Damaged");
    WriteWords(out, WordsOf(lang + ": " + found.damage));
  }
}

}  // namespace

std::string ToText(const Status& status) {
  std::ostringstream out;
  WriteDaemon(out, status);
  WriteFile(out, "Batch left", status.batch, "; it comes first");
  WriteFile(out, "Queue", status.queue, "");
  WriteWaiting(out, status);
  WriteOrder(out, status);
  WriteLocks(out, status);
  WriteVersion(out, status.version);
  WriteIndexes(out, status.indexes);
  if (!status.IsEven()) {
    WriteProblem(out, {"not as many in each language: a change is under way, or was broken off; "
                       "`appindex reindex` mends that"});
  }
  return out.str();
}

}  // namespace tool
