// Whether the search daemon is fast on a device with many applications: writing measured against
// bare Xapian, searching against SQLite's full-text search, both with the same texts; searching
// while somebody writes; memory. And how each cost grows with the number of applications.
#include <appindex/device_identity.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <cstdio>
#include <filesystem>
#include <numeric>
#include <string>
#include <vector>

#include "bench/speed/bare_xapian.h"
#include "bench/speed/daemon.h"
#include "bench/speed/daemon_run.h"
#include "bench/speed/load.h"
#include "bench/speed/process.h"
#include "bench/speed/queries.h"
#include "bench/speed/report.h"
#include "bench/speed/sqlite_search.h"
#include "bench/speed/texts.h"
#include "host/device_root.h"

namespace {

constexpr char kXapianDir[] = "/var/bench/xapian";
constexpr char kSqliteFile[] = "/var/bench/search.sqlite";

struct Options {
  std::string root;
  std::size_t applications = 500;
  std::size_t languages = 21;
  std::size_t slow = 0;
};

struct Measured {
  std::vector<bench::Query> queries;
  bench::BareXapian bare;
  bench::Memory idle;
  bench::Memory end;
  std::vector<bench::Costs> growth;
  bench::BusySearches busy;
  double empty_search_seconds = 0;
  bench::Answers sqlite;
};

void Say(const char* what) { std::fprintf(stderr, "%s\n", what); }

Measured Measure(const bench::ProcessList& processes, const bench::Texts& texts,
                 std::size_t applications) {
  const std::vector<std::size_t> sizes = bench::Sizes(applications);
  Measured measured;
  Say("bare Xapian");
  measured.bare = bench::WriteWithBareXapian(processes, texts, sizes, kXapianDir);
  std::filesystem::remove_all(kXapianDir);

  const pid_t daemon = bench::DaemonProcess();
  measured.idle = processes.MemoryOf(daemon);
  bench::CreateIndexes(texts);
  std::size_t written = 0;
  for (const std::size_t size : sizes) {
    Say(("the daemon with " + std::to_string(size) + " applications").c_str());
    measured.queries = bench::MakeQueries(texts, size);
    measured.growth.push_back(bench::Grow(texts, written, size, measured.queries));
    written = size;
  }
  measured.empty_search_seconds = bench::SecondsOfEmptySearch(texts);
  Say("searches while somebody writes");
  measured.busy = bench::SearchBusyDaemon(texts, applications, measured.queries);
  measured.end = processes.MemoryOf(daemon);

  Say("SQLite");
  measured.sqlite = bench::SearchWithSqlite(texts, applications, measured.queries, kSqliteFile);
  std::filesystem::remove(kSqliteFile);
  return measured;
}

template <typename... Numbers>
std::string Text(const char* format, Numbers... numbers) {
  char text[512];
  std::snprintf(text, sizeof(text), format, numbers...);
  return text;
}

bench::Ratio WritingRatio(const Measured& measured) {
  double documents = 0;
  double seconds = 0;
  for (const bench::Costs& costs : measured.growth) {
    documents += static_cast<double>(costs.written);
    seconds += costs.fill_seconds;
  }
  const std::vector<double>& bare = measured.bare.seconds;
  const double bare_seconds = std::accumulate(bare.begin(), bare.end(), 0.0);
  return {"upserts per second",
          documents / seconds,
          documents / bare_seconds,
          "1/s",
          0.5,
          true,
          Text("%.0f documents over the socket in %.1f s, with commits and making the terms;\n"
               "bare Xapian: replace_document and commit of documents made before, %.1f s",
               documents, seconds, bare_seconds)};
}

bench::Ratio BusyRatio(const Measured& measured) {
  const bench::Answers& idle = measured.growth.back().searches;
  return {"search p99 while writing / p50 idle",
          measured.busy.searches.SecondsWithin(0.99) * 1e3,
          idle.SecondsWithin(0.5) * 1e3,
          "ms",
          10,
          false,
          Text("another client had %.0f changes and commits carried out per second;\n"
               "p50 while it wrote: %.3f ms; p99 idle: %.3f ms",
               measured.busy.writes_per_second, measured.busy.searches.SecondsWithin(0.5) * 1e3,
               idle.SecondsWithin(0.99) * 1e3)};
}

bench::Ratio SearchRatio(const Measured& measured) {
  const bench::Answers& idle = measured.growth.back().searches;
  const double exchanges = measured.empty_search_seconds * static_cast<double>(idle.seconds.size());
  return {"search time / SQLite's",
          idle.TotalSeconds() * 1e3,
          measured.sqlite.TotalSeconds() * 1e3,
          "ms",
          1,
          false,
          Text("%.0f queries, here with socket and JSON, there within the process. An exchange\n"
               "that searches for nothing takes %.0f us: less as many of them %.1f ms, ratio %.3f",
               static_cast<double>(idle.seconds.size()), measured.empty_search_seconds * 1e6,
               (idle.TotalSeconds() - exchanges) * 1e3,
               (idle.TotalSeconds() - exchanges) / measured.sqlite.TotalSeconds())};
}

bench::Ratio MemoryRatio(const Measured& measured) {
  return {
      "memory / (idle + Xapian's)",
      measured.end.own,
      measured.idle.own + measured.bare.megabytes,
      "MB",
      1.5,
      false,
      Text("what the daemon's process holds apart from pages of files (RssAnon) at the end;\n"
           "idle before its first index: %.1f MB; a process that does the same writes with bare\n"
           "Xapian and has the databases open for reading has grown by %.1f MB, at most %.1f",
           measured.idle.own, measured.bare.megabytes, measured.bare.peak_megabytes) +
          Text("\nwith the pages of files (VmRSS): %.1f MB at the end, %.1f at most, %.1f idle",
               measured.end.Resident(), measured.end.peak, measured.idle.Resident())};
}

int Judge(const bench::Texts& texts, const Measured& measured, std::size_t slow) {
  bench::PrintGrowth(measured.growth, measured.bare.seconds);
  const bench::Answers& searches = measured.growth.back().searches;
  bench::PrintKinds(measured.queries, searches, measured.sqlite);
  if (slow > 0) bench::PrintSlowest(texts, measured.queries, searches, measured.sqlite, slow);
  const std::vector<bench::Ratio> ratios = {WritingRatio(measured), BusyRatio(measured),
                                            SearchRatio(measured), MemoryRatio(measured)};
  bench::PrintRatios(ratios);
  return std::all_of(ratios.begin(), ratios.end(),
                     [](const bench::Ratio& ratio) { return ratio.IsHeld(); })
             ? 0
             : 1;
}

}  // namespace

int main(int argc, char** argv) {
  CLI::App app("Speed and memory of the search daemon with many applications");
  Options options;
  app.add_option("root", options.root, "A device root whose search daemon runs, without indexes")
      ->required();
  app.add_option("--apps", options.applications, "How many applications")
      ->check(CLI::Range(1, 5000))
      ->capture_default_str();
  app.add_option("--languages", options.languages, "In how many languages")
      ->check(CLI::Range(1, 21))
      ->capture_default_str();
  app.add_option("--slow", options.slow, "How many of the slowest queries to print");
  CLI11_PARSE(app, argc, argv);

  try {
    const bench::ProcessList processes;
    host::EnterDeviceRoot(options.root);
    const auto& all = velkor::appindex::GetSupportedLangs();
    const auto end = std::next(all.begin(), static_cast<std::ptrdiff_t>(options.languages));
    const bench::Texts texts({all.begin(), end});
    return Judge(texts, Measure(processes, texts, options.applications), options.slow);
  } catch (const std::exception& e) {
    std::fprintf(stderr, "search_speed: %s\n", e.what());
    return 2;
  }
}
