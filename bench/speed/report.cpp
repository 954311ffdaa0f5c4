#include "bench/speed/report.h"

#include <algorithm>
#include <cstdio>
#include <numeric>

namespace bench {
namespace {

constexpr double kMicro = 1e6;
constexpr double kMilli = 1e3;

// The answers to the queries of one kind.
Answers OfKind(const std::vector<Query>& queries, const Answers& answers, std::size_t kind) {
  Answers some;
  for (std::size_t i = 0; i < queries.size(); ++i) {
    if (queries[i].kind != kind) continue;
    some.seconds.push_back(answers.seconds[i]);
    some.hits.push_back(answers.hits[i]);
  }
  return some;
}

double PercentFound(const Answers& answers) {
  double found = 0;
  for (const std::size_t hits : answers.hits) found += hits > 0 ? 1 : 0;
  return found / static_cast<double>(answers.hits.size()) * 100;
}

void PrintKind(const char* kind, const Answers& daemon, const Answers& sqlite) {
  std::printf("%-12s %8.3f %8.3f %8.3f %7.0f %9.3f %8.3f %8.3f %7.0f %8.2f\n", kind,
              daemon.SecondsWithin(0.5) * kMilli, daemon.SecondsWithin(0.99) * kMilli,
              daemon.TotalSeconds(), PercentFound(daemon), sqlite.SecondsWithin(0.5) * kMilli,
              sqlite.SecondsWithin(0.99) * kMilli, sqlite.TotalSeconds(), PercentFound(sqlite),
              daemon.TotalSeconds() / sqlite.TotalSeconds());
}

}  // namespace

void PrintRatios(const std::vector<Ratio>& ratios) {
  std::printf("\n%-34s %11s %11s %-4s %7s %9s\n", "what", "this", "yard stick", "", "ratio",
              "target");
  for (const Ratio& ratio : ratios) {
    std::printf("%-34s %11.1f %11.1f %-4s %7.3f %s %6.2f  %s\n", ratio.what.c_str(), ratio.value,
                ratio.yardstick, ratio.unit, ratio.Get(),
                ratio.at_least ? ">=" : "<=", ratio.target, ratio.IsHeld() ? "held" : "NOT HELD");
  }
  for (const Ratio& ratio : ratios) {
    std::printf("\n%s:\n%s\n", ratio.what.c_str(), ratio.note.c_str());
  }
}

void PrintGrowth(const std::vector<Costs>& growth, const std::vector<double>& bare_seconds) {
  std::printf("\n%12s %10s %12s %12s %12s %12s %10s\n", "applications", "us/upsert", "bare Xapian",
              "search p50", "search p99", "commit", "bytes/doc");
  std::printf("%12s %10s %12s %12s %12s %12s %10s\n", "", "", "us", "ms", "ms", "ms", "");
  for (std::size_t i = 0; i < growth.size(); ++i) {
    const Costs& costs = growth[i];
    const double micro_per_document = kMicro / static_cast<double>(costs.written);
    std::printf("%12zu %10.1f %12.1f %12.3f %12.3f %12.2f %10.0f\n", costs.applications,
                costs.fill_seconds * micro_per_document, bare_seconds[i] * micro_per_document,
                costs.searches.SecondsWithin(0.5) * kMilli,
                costs.searches.SecondsWithin(0.99) * kMilli, costs.commit_seconds * kMilli,
                costs.bytes_per_document);
  }
  std::puts(
      "  Upserts are those of the applications added since the line before, with their commits.\n"
      "  A commit is one language's, after the documents of one application were written again.");
}

void PrintKinds(const std::vector<Query>& queries, const Answers& daemon, const Answers& sqlite) {
  std::printf("\n%-12s %34s %35s\n", "", "this daemon", "SQLite");
  std::printf("%-12s %8s %8s %8s %7s %9s %8s %8s %7s %8s\n", "query", "p50 ms", "p99 ms", "sum s",
              "% found", "p50 ms", "p99 ms", "sum s", "% found", "ratio");
  for (std::size_t kind = 0; kind < kQueryKinds.size(); ++kind) {
    PrintKind(kQueryKinds[kind], OfKind(queries, daemon, kind), OfKind(queries, sqlite, kind));
  }
  PrintKind("all", daemon, sqlite);
}

void PrintSlowest(const Texts& texts, const std::vector<Query>& queries, const Answers& daemon,
                  const Answers& sqlite, std::size_t count) {
  std::vector<std::size_t> order(queries.size());
  std::iota(order.begin(), order.end(), std::size_t{0});
  std::stable_sort(order.begin(), order.end(), [&](std::size_t a, std::size_t b) {
    return daemon.seconds[a] > daemon.seconds[b];
  });
  order.resize(std::min(count, order.size()));
  std::puts("\nthe slowest queries");
  for (const std::size_t i : order) {
    const Query& query = queries[i];
    std::printf("%8.3f ms, SQLite %8.3f ms, %s, %s: %s\n", daemon.seconds[i] * kMilli,
                sqlite.seconds[i] * kMilli, texts.Langs()[query.lang].c_str(),
                kQueryKinds[query.kind], query.text.c_str());
  }
}

}  // namespace bench
