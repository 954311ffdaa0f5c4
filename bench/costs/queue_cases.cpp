#include <cstdlib>

#include "appindex/index_queue_internal.h"
#include "bench/costs/bare_json.h"
#include "bench/costs/cases.h"
#include "bench/costs/content.h"
#include "bench/costs/queue_content.h"

namespace bench {

Cases QueueCases() {
  const auto json = std::make_shared<BareJson>();
  Cases cases;
  for (const long lines : {1, 10, 100, 1000, 10000, 100000}) {
    const std::string path = "/tmp/queue" + std::to_string(lines);
    const std::vector<std::string> all = QueueLines(lines);
    WriteContent(path, Joined(all));
    Case fold{"queue", lines, static_cast<double>(lines),
              [path] {
                if (velkor::appindex::ReadBatch(path).empty()) std::abort();
              },
              [json, all] {
                for (const std::string& line : all) json->Parse(line);
              }};
    fold.rounds = 9;
    cases.push_back(fold);
  }
  return cases;
}

}  // namespace bench
