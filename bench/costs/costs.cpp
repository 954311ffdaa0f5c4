// Measures one group of cases: with Google Benchmark what they take, or, under callgrind, how many
// instructions.
#include <benchmark/benchmark.h>
#include <valgrind/callgrind.h>

#include <CLI/CLI.hpp>
#include <cstdio>
#include <exception>
#include <functional>
#include <list>
#include <string>
#include <vector>

#include "bench/costs/cases.h"
#include "bench/costs/samples.h"
#include "host/device_root.h"

namespace {

using bench::Case;
using bench::Cases;

constexpr double kSecondsARound = 0.03;

// Callgrind makes everything about fifty times slower.
constexpr double kMostPartsCounted = 25000;

struct Options {
  std::string root;
  std::string group;
  long packages = 1000;
  long directories = 1000;
  bool instructions = false;
};

Cases CasesOf(const Options& options) {
  if (options.group == "exchange") return bench::ExchangeCases();
  if (options.group == "descriptor") return bench::DescriptorCases();
  if (options.group == "texts") return bench::TextCases();
  if (options.group == "queue") return bench::QueueCases();
  return bench::SearchCases(options.packages, options.directories);
}

// Prints the one benchmark that is run at a time.
class SamplePrinter : public benchmark::BenchmarkReporter {
 public:
  SamplePrinter(const Case& measured, const char* side) : measured_(measured), side_(side) {}

  bool ReportContext(const Context& /*context*/) override { return true; }

  void ReportRuns(const std::vector<Run>& runs) override {
    for (const Run& run : runs) {
      const double seconds =
          measured_.clock == Case::kElapsed ? run.real_accumulated_time : run.cpu_accumulated_time;
      const double works = static_cast<double>(run.iterations) * measured_.parts;
      bench::PrintSample(measured_.name, measured_.size, side_, seconds / works, "s");
    }
  }

 private:
  const Case& measured_;
  const char* side_;
};

std::string BenchmarkName(const Case& measured, const char* side) {
  return measured.name + "/" + std::to_string(measured.size) + "/" + side;
}

void Register(const Case& measured, const char* side, const std::function<void()>& work) {
  auto* const added =
      benchmark::RegisterBenchmark(BenchmarkName(measured, side).c_str(), [work](auto& state) {
        for ([[maybe_unused]] auto _ : state) work();
      });
  added->MinTime(kSecondsARound);
  if (measured.clock == Case::kElapsed) added->UseRealTime();
}

void RunOnce(const Case& measured, const char* side) {
  SamplePrinter printer(measured, side);
  benchmark::RunSpecifiedBenchmarks(&printer, "^" + BenchmarkName(measured, side) + "(/|$)");
}

// In turns, so that what else the machine does meets both sides alike.
void MeasureTime(const Case& measured) {
  Register(measured, bench::kSubject, measured.subject);
  Register(measured, bench::kLimit, measured.limit);
  for (int round = 0; round < measured.rounds; ++round) {
    RunOnce(measured, bench::kSubject);
    RunOnce(measured, bench::kLimit);
  }
}

// The second time: by then, caches are filled.
void CountInstructions(const Case& measured, const char* side, const std::function<void()>& work) {
  static std::list<std::string> names;  // callgrind looks at them later than it is told them
  names.push_back(BenchmarkName(measured, side));
  work();
  CALLGRIND_START_INSTRUMENTATION;
  CALLGRIND_ZERO_STATS;
  work();
  CALLGRIND_DUMP_STATS_AT(names.back().c_str());
  CALLGRIND_STOP_INSTRUMENTATION;
}

}  // namespace

int main(int argc, char** argv) {
  CLI::App app("Costs of the library, each beside its limit");
  Options options;
  app.add_option("root", options.root, "A device root for this program alone")->required();
  app.add_option("group", options.group, "Which costs")
      ->required()
      ->check(CLI::IsMember({"exchange", "descriptor", "texts", "queue", "search"}));
  app.add_option("--packages", options.packages, "search: how many packages at most");
  app.add_option("--directories", options.directories, "search: directories of each");
  app.add_flag("--instructions", options.instructions, "Run each but twice, for callgrind");
  CLI11_PARSE(app, argc, argv);

  try {
    benchmark::CPUInfo::Get();  // reads /proc, which the device root has not
    host::EnterDeviceRoot(options.root);
    for (const Case& measured : CasesOf(options)) {
      if (!options.instructions) {
        MeasureTime(measured);
      } else if (measured.parts < kMostPartsCounted) {
        CountInstructions(measured, bench::kSubject, measured.subject);
        CountInstructions(measured, bench::kLimit, measured.limit);
      }
    }
    return 0;
  } catch (const std::exception& e) {
    std::fprintf(stderr, "costs: %s\n", e.what());
    return 2;
  }
}
