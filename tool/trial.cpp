#include "tool/trial.h"

#include <exception>

#include "appindex/config.h"
#include "appindex/device_identity.h"
#include "appindex/index_mgr_internal.h"
#include "appindex/index_queue_internal.h"
#include "appindex/utilities/file_utils.h"
#include "common/check.h"
#include "tool/descriptor_path.h"
#include "tool/failure.h"
#include "tool/refusal.h"

namespace tool {
namespace {

namespace index = velkor::appindex;

void TryDel(const std::string& conf_path) {
  for (const Json::Value& record : index::FindIndexables(conf_path)) record["id"].asString();
}

Problem FailureOf(const std::exception& exception, const std::string& path = "") {
  const Report report = Explain(exception);
  return {(path.empty() ? "" : path + ": ") + report.line, true, report.code};
}

}  // namespace

void Trial::TryAdd(const std::string& conf_path) {
  index::Descriptor descriptor(conf_path);
  for (const std::string& lang : index::GetSupportedLangs()) {
    for (const Json::Value& record : descriptor.FindIndexables()) {
      RequireTaken(lang, index::MakeDocument(pool_, lang, record));
    }
  }
}

// What cannot be read or is not JSON is passed over by a rebuild, as if it were not there.
Problem Trial::ProblemOfRebuild() {
  try {
    for (const std::string& conf_path : index::FindIndexConf()) {
      try {
        TryAdd(conf_path);
      } catch (const std::exception& exception) {
        return FailureOf(exception, conf_path);
      }
    }
    index::Config().GetCurrentVersion();
    return {};
  } catch (const std::exception& exception) {
    return FailureOf(exception);
  }
}

Problem Trial::ProblemOf(int op, const std::string& conf_path) {
  const velkor::MutedLog muted;
  if (op == index::kReindex) return ProblemOfRebuild();
  if (op != index::kAdd && op != index::kDel) return {};
  if (velkor::Basename(conf_path) != index::kIndexConf) {
    return {"does nothing: not an index.conf"};
  }
  const std::string unreadable = WhyUnreadable(conf_path);
  if (!unreadable.empty()) return {unreadable};
  try {
    op == index::kAdd ? TryAdd(conf_path) : TryDel(conf_path);
    return {};
  } catch (const std::exception& exception) {
    return FailureOf(exception);
  }
}

}  // namespace tool
