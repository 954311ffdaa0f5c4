// Whether the applications of a device are found by what people type: in each language, for each
// kind of query, the share of queries that bring the wanted item to the top. It asks the daemon
// that runs in the device root and knows nothing of how that searches.
#include <appindex/device_identity.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <exception>
#include <iostream>
#include <map>
#include <stdexcept>
#include <string>
#include <vector>

#include "bench/quality/items.h"
#include "bench/quality/judging.h"
#include "bench/quality/kinds.h"
#include "bench/quality/table.h"
#include "host/device_root.h"

namespace {

using bench::quality::kKindCount;
using bench::quality::kKinds;
using bench::quality::Row;

constexpr int kUnderLimit = 1;
constexpr int kFailed = 2;

struct Arguments {
  std::string root;
  std::string lang;  // empty: every language
  std::string kind;  // empty: every kind
  std::size_t misses = 0;
};

std::size_t KindNamed(const std::string& name) {
  if (name.empty()) return kKindCount;
  const auto* const found = std::find_if(kKinds.begin(), kKinds.end(),
                                         [&](const auto& kind) { return name == kind.name; });
  if (found == kKinds.end()) throw std::runtime_error("no such kind of query: " + name);
  return static_cast<std::size_t>(found - kKinds.begin());
}

int Measure(const Arguments& arguments) {
  const std::size_t only = KindNamed(arguments.kind);
  const std::vector<Json::Value> records = bench::quality::FindRecords();
  velkor::appindex::StringPool pool;
  std::map<std::string, Row> rows;
  std::size_t asked = 0;
  for (const std::string& lang : velkor::appindex::GetSupportedLangs()) {
    if (!arguments.lang.empty() && arguments.lang != lang) continue;
    const auto items = bench::quality::ItemsOf(pool, lang, records);
    bench::quality::FillIndex(lang, items);
    const auto questions = bench::quality::MakeQuestions(lang, items, only);
    const auto verdicts = bench::quality::Ask(lang, items, questions);
    bench::quality::PrintMisses(lang, items, questions, verdicts, arguments.misses);
    rows[lang] = bench::quality::Tally(questions, verdicts);
    asked += questions.size();
  }
  if (asked == 0) throw std::runtime_error("there is nothing to ask for");
  std::printf("%zu items, %zu queries; per cent found, of how many queries; ! under the limit\n",
              records.size(), asked);
  return bench::quality::PrintTable(rows) ? 0 : kUnderLimit;
}

}  // namespace

int main(int argc, char** argv) {
  CLI::App app("How well the applications of a device are found", "search_quality");
  Arguments arguments;
  app.add_option("root", arguments.root, "A device root whose search daemon runs")->required();
  app.add_option("--misses", arguments.misses, "Print so many misses per language and kind");
  app.add_option("--lang", arguments.lang, "Only this language");
  app.add_option("--kind", arguments.kind, "Only this kind of query, by its column's name");
  CLI11_PARSE(app, argc, argv);
  try {
    host::EnterDeviceRoot(arguments.root);
    return Measure(arguments);
  } catch (const std::exception& error) {
    std::cerr << "search_quality: " << error.what() << "\n";
    return kFailed;
  }
}
