#include "tool/lint/lint.h"

#include <algorithm>
#include <cerrno>
#include <list>
#include <set>
#include <tuple>

#include "appindex/utilities/json_helpers.h"
#include "common/file_io.h"
#include "tool/failure.h"

namespace tool::lint {
namespace {

constexpr char kKnownShape[] = R"(let it be {"models": [...], "platforms": [...]})";

class Linter {
 public:
  explicit Linter(const Options& options) : options_(options), ids_(options.known) {}

  void Check(const Package& package) {
    CheckPackage(outcome_.findings, package);
    for (const std::string& file : package.checked) CheckDescriptor(package, file);
  }

  Outcome Finish() {
    std::stable_sort(outcome_.findings.begin(), outcome_.findings.end(),
                     [](const Finding& a, const Finding& b) {
                       return std::tie(a.file, a.position.line, a.position.column) <
                              std::tie(b.file, b.position.line, b.position.column);
                     });
    return std::move(outcome_);
  }

 private:
  void CheckDescriptor(const Package& package, const std::string& file) {
    if (!seen_.insert(file).second) return;
    std::string text;
    outcome_.checked.push_back(file);
    if (!velkor::ReadRegularFile(file, velkor::kMaxJsonFileBytes, text)) {
      outcome_.findings.push_back(
          FileFinding("descriptor-unreadable", file, "cannot be read: " + WhyNotRead(errno)));
      return;
    }
    descriptors_.push_back({file, SourceText(std::move(text)), Json::Value()});
    ParsedDescriptor& descriptor = descriptors_.back();
    if (const std::optional<SyntaxError> error = ParseJson(descriptor.source, descriptor.root)) {
      Finding finding = FileFinding("json-syntax", file, error->message);
      finding.position = descriptor.source.At(error->offset);
      outcome_.findings.push_back(std::move(finding));
      return;
    }
    CheckContent(package, descriptor);
  }

  void CheckContent(const Package& package, const ParsedDescriptor& descriptor) {
    Report report(descriptor, outcome_.findings);
    if (const std::optional<std::size_t> at = FindWrongUtf8(descriptor.source.Text())) {
      Finding finding = FileFinding("not-utf8", descriptor.file, "this byte is not UTF-8");
      finding.position = descriptor.source.At(*at);
      outcome_.findings.push_back(std::move(finding));
    }
    CheckShape(report, descriptor.root);
    CheckDescriptions(report, descriptor.root);
    CheckFilters(report, descriptor.root, options_.known);
    ids_.Check(report, descriptor.file, descriptor.root);
    CheckTextsRoot(report, package, descriptor);
    for (TextTable& table : CheckTexts(report, package, descriptor, texts_)) {
      outcome_.tables.push_back(std::move(table));
    }
    CheckKeywords(report, package, descriptor, texts_);
    CheckDocuments(report, package, descriptor, pool_);
  }

  const Options& options_;
  std::set<std::string> seen_;
  IdRegistry ids_;
  TextsCache texts_;
  velkor::appindex::StringPool pool_;
  std::list<ParsedDescriptor> descriptors_;  // ids_ points into them
  Outcome outcome_;
};

std::optional<std::set<std::string>> ReadNames(const std::string& path, const Json::Value& root,
                                               const char* member) {
  if (!root.isMember(member)) return std::nullopt;
  std::set<std::string> names;
  bool all_texts = root[member].isArray();
  for (const Json::Value& name : root[member]) {
    all_texts = all_texts && name.isString();
    if (all_texts) names.insert(name.asString());
  }
  if (!all_texts) {
    throw Failure(path + ": \"" + member + "\" is not a list of names", kKnownShape);
  }
  return names;
}

}  // namespace

Outcome Lint(const std::vector<std::string>& paths, const Options& options) {
  Linter linter(options);
  for (const std::string& path : paths) {
    for (const Package& package : FindPackages(path, options.package_dir)) linter.Check(package);
  }
  return linter.Finish();
}

KnownNames ReadKnownNames(const std::string& path) {
  std::string text;
  if (!velkor::ReadRegularFile(path, velkor::kMaxJsonFileBytes, text)) {
    const int read_error = errno;
    throw Failure(path + ": cannot be read: " + WhyNotRead(read_error), AdviceOn(read_error));
  }
  const SourceText source(std::move(text));
  Json::Value root;
  if (const std::optional<SyntaxError> error = ParseJson(source, root)) {
    const Position at = source.At(error->offset);
    throw Failure(path + ":" + std::to_string(at.line) + ":" + std::to_string(at.column) + ": " +
                      error->message,
                  kKnownShape);
  }
  if (!root.isObject()) {
    throw Failure(path + ": not an object", kKnownShape);
  }
  return {ReadNames(path, root, "models"), ReadNames(path, root, "platforms")};
}

}  // namespace tool::lint
