#include "tool/trial.h"

#include <exception>

#include "appindex/device_identity.h"
#include "appindex/elastic_control_internal.h"
#include "appindex/index_mgr_internal.h"
#include "appindex/index_queue_internal.h"
#include "appindex/string_pool.h"
#include "appindex/utilities/file_utils.h"
#include "common/check.h"
#include "tool/descriptor_path.h"
#include "tool/failure.h"

namespace tool {
namespace {

namespace index = velkor::appindex;

void TryAdd(const std::string& conf_path) {
  index::StringPool pool;
  index::Descriptor descriptor(conf_path);
  for (const std::string& lang : index::GetSupportedLangs()) {
    for (const Json::Value& record : descriptor.FindIndexables()) {
      index::elastic::UpsertRequest(lang, index::MakeDocument(pool, lang, record));
    }
  }
}

void TryDel(const std::string& conf_path) {
  for (const Json::Value& record : index::FindIndexables(conf_path)) record["id"].asString();
}

}  // namespace

std::string ProblemOf(int op, const std::string& conf_path) {
  if (op != index::kAdd && op != index::kDel) return "";
  const velkor::MutedLog muted;
  try {
    if (velkor::Basename(conf_path) != index::kIndexConf) return "does nothing: not an index.conf";
    std::string unreadable = WhyUnreadable(conf_path);
    if (!unreadable.empty()) return unreadable;
    op == index::kAdd ? TryAdd(conf_path) : TryDel(conf_path);
    return "";
  } catch (const std::exception& exception) {
    return Explain(exception).line;
  }
}

std::string FirstProblem() {
  const velkor::MutedLog muted;
  try {
    for (const std::string& conf_path : index::FindIndexConf()) {
      const std::string problem = ProblemOf(index::kAdd, conf_path);
      if (!problem.empty()) return conf_path + ": " + problem;
    }
  } catch (const std::exception&) {
    // A directory cannot be read, which the failure that is looked into says already.
  }
  return "";
}

}  // namespace tool
