#include "bench/quality/table.h"

#include <algorithm>
#include <cmath>
#include <cstdio>

namespace bench::quality {
namespace {

constexpr double kPercent = 100;

double PercentOf(const Cell& cell) {
  return kPercent * static_cast<double>(cell.found) / static_cast<double>(cell.asked);
}

bool Keeps(const Cell& cell, const Kind& kind) {
  return cell.found * 100 >= cell.asked * static_cast<std::size_t>(kind.limit);
}

// Cut and not rounded: what stands under a limit is never printed as the limit.
std::string PercentText(double percent) {
  char text[16];
  if (percent == kPercent) return " 100";
  std::snprintf(text, sizeof(text), "%4.1f", std::floor(percent * 10) / 10);
  return text;
}

bool PrintRow(const std::string& lang, const Row& row) {
  bool keeps = true;
  std::printf("%-4s", lang.c_str());
  for (std::size_t kind = 0; kind < kKindCount; ++kind) {
    const Cell& cell = row[kind];
    if (cell.asked == 0) {
      std::printf(" %4s     ", "-");
      continue;
    }
    const bool cell_keeps = Keeps(cell, kKinds[kind]);
    std::printf(" %s%c%-4zu", PercentText(PercentOf(cell)).c_str(), cell_keeps ? ' ' : '!',
                cell.asked);
    keeps = keeps && cell_keeps;
  }
  std::printf("\n");
  return keeps;
}

void PrintLeast(const std::map<std::string, Row>& rows) {
  std::printf("least");
  for (std::size_t kind = 0; kind < kKindCount; ++kind) {
    double least = kPercent + 1;
    for (const auto& [lang, row] : rows) {
      if (row[kind].asked != 0) least = std::min(least, PercentOf(row[kind]));
    }
    const std::string text = least > kPercent ? "   -" : PercentText(least);
    std::printf("%s%-6s", text.c_str(), "");
  }
  std::printf("\nlimit");
  for (const Kind& kind : kKinds) std::printf("%4d%-6s", kind.limit, "");
  std::printf("\n");
}

void PrintMiss(const std::string& lang, const Item& item, const Question& question,
               const Verdict& verdict) {
  std::printf("%s %s: \"%s\" for \"%s\" (%s): ", lang.c_str(), kKinds[question.kind].name,
              question.query.c_str(), item.title.c_str(), item.id.c_str());
  if (verdict.rank == 0) {
    std::printf("no hit, allowed rank %zu\n", question.allowed);
  } else {
    std::printf("rank %zu, allowed %zu\n", verdict.rank, question.allowed);
  }
  for (const Hit& hit : verdict.first_hits) {
    std::printf("    %7.3f  %s (%s)\n", hit.score, hit.title.c_str(), hit.id.c_str());
  }
}

}  // namespace

Row Tally(const std::vector<Question>& questions, const std::vector<Verdict>& verdicts) {
  Row row{};
  for (std::size_t i = 0; i < questions.size(); ++i) {
    Cell& cell = row[questions[i].kind];
    ++cell.asked;
    if (verdicts[i].found) ++cell.found;
  }
  return row;
}

bool PrintTable(const std::map<std::string, Row>& rows) {
  std::printf("%-4s", "");
  for (const Kind& kind : kKinds) std::printf(" %-9s", kind.name);
  std::printf("\n");
  bool keeps = true;
  for (const auto& [lang, row] : rows) keeps = PrintRow(lang, row) && keeps;
  PrintLeast(rows);
  return keeps;
}

void PrintMisses(const std::string& lang, const std::vector<Item>& items,
                 const std::vector<Question>& questions, const std::vector<Verdict>& verdicts,
                 std::size_t most) {
  std::array<std::size_t, kKindCount> printed{};
  for (std::size_t i = 0; i < questions.size(); ++i) {
    if (verdicts[i].found || printed[questions[i].kind]++ >= most) continue;
    PrintMiss(lang, items[questions[i].item], questions[i], verdicts[i]);
  }
}

}  // namespace bench::quality
