#include "tool/lint/checks.h"

namespace tool::lint {

void IdRegistry::Check(Report& report, const std::string& file, const Json::Value& root) {
  for (const Item& item : ItemsOf(root)) {
    const std::string id = IdOf(item);
    if (id.empty()) continue;
    std::vector<Use>& uses = uses_[id];
    for (const Use& use : uses) {
      if (!SomeDevicePasses({&item, &use.item}, known_)) continue;
      report.Add("duplicate-id", item.node.Member(item.is_module ? "params" : "app"),
                 "the id " + Quoted(id) + " is used before, at " +
                     (use.file == file ? Quoted(use.item.node.pointer) : DisplayPath(use.file)) +
                     ": one of the two replaces the other");
      break;
    }
    uses.push_back({file, item});
  }
}

}  // namespace tool::lint
