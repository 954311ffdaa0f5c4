#include <algorithm>

#include "appindex/error.h"
#include "appindex/index_mgr_internal.h"
#include "appindex/utilities/file_utils.h"
#include "tool/lint/checks.h"

namespace tool::lint {
namespace {

constexpr char kNeverRead[] = "Docuvault";

// The one of several descriptors that a full rebuild takes here and now.
std::string FirstDescriptor(const Package& package) {
  std::string first = package.descriptors.front();
  try {
    velkor::appindex::FindIndexConfByAppRoot(first, package.dir, 0);
  } catch (const velkor::Error&) {
    // A directory cannot be opened here: it may be any of them.
  }
  return first;
}

void CheckDescriptors(std::vector<Finding>& findings, const Package& package) {
  const std::string dir = DisplayPath(package.dir);
  if (package.checked.empty() && package.deep_descriptors.empty()) {
    findings.push_back(FileFinding("descriptor-missing", package.dir,
                                   "there is no index.conf in the package or up to five levels "
                                   "below"));
  }
  for (const std::string& deep : package.deep_descriptors) {
    findings.push_back(FileFinding(
        "descriptor-beyond-reach", deep,
        "more than five directories below " + dir + ": a full rebuild does not find it"));
  }
  if (package.descriptors.size() < 2) return;
  const std::string first = FirstDescriptor(package);
  for (const std::string& descriptor : package.descriptors) {
    if (descriptor == first) continue;
    findings.push_back(FileFinding("descriptor-second", descriptor,
                                   "the package has another descriptor, " + DisplayPath(first) +
                                       ": a full rebuild reads the one that it meets first"));
  }
}

std::string NameOf(const Package& package) {
  return velkor::Basename(package.dir.substr(0, package.dir.size() - 1));
}

// The first item whose references are looked up in the package's texts.
const Item* FirstWithReferences(const std::vector<Item>& items) {
  for (const Item& item : items) {
    if ((*item.entry.value)["stringset"].isString()) continue;
    for (const TextUse& use : TextsOf(item)) {
      if (Reference::Is(use.text)) return &item;
    }
  }
  return nullptr;
}

void ReportNoTexts(Report& report, const Package& package, const Node& entry) {
  const std::string dir = DisplayPath(package.dir);
  if (package.is_built_in) {
    report.Add("texts-not-found", entry, "the web interface's texts are not there");
  } else if (!package.all_texts.empty()) {
    report.Add("texts-not-found", entry,
               "a directory below " + dir + " cannot be opened, which ends the search for texts");
  } else if (!package.deep_texts.empty()) {
    report.Add("texts-beyond-reach", entry,
               DisplayPath(package.deep_texts.front()) + " is more than six levels below " + dir +
                   ": the texts of the web interface serve instead");
  } else {
    report.Add("texts-not-found", entry,
               "there is no directory \"texts\" in " + dir +
                   " or below: the texts of the web interface serve instead");
  }
}

void CheckPackageTexts(Report& report, const Package& package, const Node& entry) {
  if (package.texts.empty()) {
    ReportNoTexts(report, package, entry);
    return;
  }
  if (package.all_texts.size() < 2) return;
  std::vector<std::string> dirs;
  for (const std::string& dir : package.all_texts) dirs.push_back(DisplayPath(dir));
  report.Add("texts-ambiguous", entry,
             "the package has " + std::to_string(dirs.size()) + " directories of texts, " +
                 Listed(dirs) + ": the first that the file system lists serves");
}

}  // namespace

void CheckPackage(std::vector<Finding>& findings, const Package& package) {
  if (NameOf(package) == kNeverRead) {
    findings.push_back(FileFinding("package-docuvault", package.dir,
                                   "a full rebuild leaves out a package of this name"));
  }
  CheckDescriptors(findings, package);
  for (const std::string& checked : package.checked) {
    if (velkor::Basename(checked) != velkor::appindex::kIndexConf) {
      findings.push_back(
          FileFinding("descriptor-name", checked, "only files named exactly index.conf are read"));
    }
    if (package.is_guessed) {
      findings.push_back(FileFinding("package-unknown", checked,
                                     "taken for a part of " + DisplayPath(package.dir) +
                                         "; --package DIR says where the package begins"));
    }
  }
}

void CheckTextsRoot(Report& report, const Package& package, const ParsedDescriptor& descriptor) {
  const std::vector<Item> items = ItemsOf(descriptor.root);
  if (const Item* item = FirstWithReferences(items)) {
    CheckPackageTexts(report, package, item->entry);
  }
  std::set<std::string> missing;
  for (const Item& item : items) {
    const Json::Value& stringset = (*item.entry.value)["stringset"];
    if (!stringset.isString() || !TextsRootOf(package, descriptor, item).empty()) continue;
    if (!missing.insert(stringset.asString()).second) continue;
    report.Add("texts-not-found", item.entry.Member("stringset"),
               "there is no directory " + Quoted(stringset.asString()) +
                   " beside the descriptor: no reference resolves");
  }
}

}  // namespace tool::lint
