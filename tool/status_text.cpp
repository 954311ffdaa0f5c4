// The state of everything, for a reader.
#include <algorithm>
#include <iomanip>
#include <sstream>

#include "appindex/elastic_control_internal.h"
#include "tool/output.h"
#include "tool/status.h"

namespace tool {
namespace {

constexpr int kHeadColumns = 16;
constexpr std::size_t kIndexesPerLine = 5;
constexpr std::size_t kCell = 11;
constexpr std::size_t kStepsShown = 20;

void Begin(std::ostream& out, const std::string& head) {
  out << std::left << std::setw(kHeadColumns) << head;
}

void Continue(std::ostream& out) { out << std::string(kHeadColumns, ' '); }

void WriteDaemon(std::ostream& out, const Status& status) {
  Begin(out, "Search daemon");
  out << (status.daemon_problem.empty() ? "answers" : "does not answer") << "\n";
  if (!status.daemon_problem.empty()) {
    Continue(out);
    out << "start tovoelasticd; its socket is " << velkor::appindex::elastic::kElasticdSockPath
        << "\n";
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
        << NameOfOperation(step.op) << (step.path.empty() ? "everything" : step.path) << "\n";
    if (step.problem.empty()) continue;
    Continue(out);
    out << "    ! " << step.problem << "\n";
  }
}

void WriteLocks(std::ostream& out, const Status& status) {
  for (const Lock& lock : status.locks) {
    for (const LockHolder& holder : lock.holders) {
      Begin(out, "Locked");
      out << lock.path << " by " << (holder.program.empty() ? "process" : holder.program) << " ("
          << holder.pid << ")\n";
    }
  }
}

void WriteVersion(std::ostream& out, const Version& version) {
  Begin(out, "System version");
  if (!version.problem.empty()) {
    out << "not known: " << version.problem << "\n";
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
    out << lang << ": " << found.damage << "\n";
  }
}

}  // namespace

std::string ToText(const Status& status) {
  std::ostringstream out;
  WriteDaemon(out, status);
  WriteFile(out, "Batch left", status.batch, "; it comes first");
  WriteFile(out, "Queue", status.queue, "");
  WriteOrder(out, status);
  WriteLocks(out, status);
  WriteVersion(out, status.version);
  WriteIndexes(out, status.indexes);
  if (!status.IsEven()) {
    Continue(out);
    out << "! not as many in each language: `appindex reindex` mends that\n";
  }
  return out.str();
}

}  // namespace tool
