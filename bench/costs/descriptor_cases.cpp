#include "appindex/index_mgr_internal.h"
#include "bench/costs/bare_json.h"
#include "bench/costs/cases.h"
#include "bench/costs/content.h"

namespace bench {

Cases DescriptorCases() {
  const auto json = std::make_shared<BareJson>();
  Cases cases;
  for (const long modules : {1, 10, 100, 1000}) {
    const std::string path = "/var/packages/Reading" + std::to_string(modules) + "/index.conf";
    const std::string text = DescriptorText("Reading", modules);
    WriteContent(path, text);
    cases.push_back({"descriptor", modules, 1 + static_cast<double>(modules),
                     [path, modules] {
                       velkor::appindex::Descriptor descriptor(path);
                       const auto records = descriptor.FindIndexables().size();
                       if (static_cast<long>(records) != modules + 1) std::abort();
                     },
                     [json, text] { json->Parse(text); }});
  }
  return cases;
}

}  // namespace bench
