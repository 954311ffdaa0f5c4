#include "appindex/device_identity.h"
#include "appindex/utils_internal.h"
#include "tool/lint/checks.h"

namespace tool::lint {
namespace {

constexpr char kAnyOther[] = "\x01";  // stands for all devices that nobody names

using Names = std::set<std::string>;

void AddNames(Names& names, const Json::Value& filter, const char* member) {
  if (!filter.isObject()) return;
  for (const Json::Value& name : filter[member]) {
    if (name.isString()) names.insert(name.asString());
  }
}

// The values of `member` among which every outcome of the filters occurs.
Names Candidates(const std::vector<const Json::Value*>& objects, const char* member,
                 const std::optional<Names>& known) {
  if (known && !known->empty()) return *known;
  Names names = {kAnyOther};
  for (const Json::Value* object : objects) {
    AddNames(names, (*object)["enable"], member);
    AddNames(names, (*object)["disable"], member);
  }
  return names;
}

bool AllPass(const std::vector<const Json::Value*>& objects) {
  for (const Json::Value* object : objects) {
    if (!velkor::appindex::IsPassFilter((*object)["enable"], true) ||
        !velkor::appindex::IsPassFilter((*object)["disable"], false)) {
      return false;
    }
  }
  return true;
}

void CheckKnown(Report& report, const Node& filter, const char* member, const char* tag,
                const std::optional<Names>& known) {
  if (!known || !filter.Has(member)) return;
  const Node names = filter.Member(member);
  if (!names.value->isArray()) return;
  for (Json::ArrayIndex i = 0; i < names.value->size(); ++i) {
    const Node name = names.Element(i);
    if (!name.value->isString() || known->count(name.value->asString()) > 0) continue;
    report.Add(tag, name,
               "no " + std::string(member) + " is called " + Quoted(name.value->asString()));
  }
}

void CheckNames(Report& report, const Item& item, const KnownNames& known) {
  for (const char* side : {"enable", "disable"}) {
    if (!item.node.Has(side)) continue;
    const Node filter = item.node.Member(side);
    CheckKnown(report, filter, "model", "model-unknown", known.models);
    CheckKnown(report, filter, "platform", "platform-unknown", known.platforms);
  }
}

}  // namespace

bool SomeDevicePasses(const std::vector<const Item*>& items, const KnownNames& known) {
  std::vector<const Json::Value*> objects;
  for (const Item* item : items) {
    objects.push_back(item->node.value);
    if (item->is_module) objects.push_back(item->entry.value);
  }
  const Names platforms = Candidates(objects, "platform", known.platforms);
  for (const std::string& model : Candidates(objects, "model", known.models)) {
    for (const std::string& platform : platforms) {
      const velkor::appindex::AssumedDevice device(model, platform);
      if (AllPass(objects)) return true;
    }
  }
  return false;
}

void CheckFilters(Report& report, const Json::Value& root, const KnownNames& known) {
  for (const Item& item : ItemsOf(root)) {
    CheckNames(report, item, known);
    if (SomeDevicePasses({&item}, known)) continue;
    const Item entry{item.entry, item.entry, false};
    if (item.is_module && !SomeDevicePasses({&entry}, known)) continue;  // said of the entry
    report.Add("filter-never-passes",
               item.node.Member(item.node.Has("enable") ? "enable" : "disable"),
               "no device passes the filters: this is never found");
  }
}

}  // namespace tool::lint
