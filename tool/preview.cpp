#include "tool/preview.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>

#include "appindex/device_identity.h"
#include "appindex/error.h"
#include "appindex/index_mgr_internal.h"
#include "appindex/utilities/file_utils.h"
#include "appindex/utilities/json_helpers.h"
#include "appindex/utils_internal.h"
#include "common/check.h"
#include "common/file_io.h"
#include "tool/failure.h"
#include "tool/lint/report.h"
#include "tool/lint/source_text.h"
#include "tool/refusal.h"

namespace tool {
namespace {

namespace fs = std::filesystem;
namespace index = velkor::appindex;

Json::Value ReadDescriptor(const std::string& file) {
  std::string text;
  if (!velkor::ReadRegularFile(file, velkor::kMaxJsonFileBytes, text)) {
    const int error = errno;
    throw Failure(lint::DisplayPath(file) + ": cannot be read: " + WhyNotRead(error),
                  AdviceOn(error));
  }
  const lint::SourceText source(std::move(text));
  Json::Value root;
  if (const std::optional<lint::SyntaxError> error = lint::ParseJson(source, root)) {
    const lint::Position at = source.At(error->offset);
    throw Failure(lint::DisplayPath(file) + ":" + std::to_string(at.line) + ":" +
                      std::to_string(at.column) + ": " + error->message,
                  "`appindex lint --explain json-syntax` tells more");
  }
  return root;
}

bool IsInstalled(const std::string& file) {
  return std::any_of(index::kAppRoots.begin(), index::kAppRoots.end(),
                     [&](const auto& root) { return velkor::StringStartWith(file, root); });
}

// The record as it would be if its package were installed: the library looks for texts only below
// the places of installed packages, so that those of another place are named as a string set.
Json::Value AsInstalled(const lint::Package& package, const std::string& file, Json::Value record) {
  if (IsInstalled(file) || record["stringset"].isString() || package.texts.empty()) return record;
  const std::string dir = velkor::Dirname(file);
  record["stringset"] = fs::relative(package.texts, dir).string();
  return record;
}

// Which device name of which list decides: `filter` is not null and does not let this device pass.
std::string ReasonOf(const std::string& name, const Json::Value& filter) {
  const bool is_enable = name == "enable";
  std::vector<std::string> names;
  for (const char* member : {"model", "platform"}) {
    if (!filter.isMember(member)) continue;
    const bool is_model = std::strcmp(member, "model") == 0;
    const std::string& own = is_model ? index::GetModel() : index::GetPlatform();
    Json::Value only(Json::objectValue);
    only[member] = filter[member];
    if (is_enable) {
      names.push_back(std::string("the ") + member + " " + own);
    } else if (!index::IsPassFilter(only, false)) {
      return "\"disable\" lists the " + std::string(member) + " " + own;
    }
  }
  if (names.empty()) return "\"enable\" lists no model and no platform";
  return "\"enable\" does not list " + names.front() +
         (names.size() > 1 ? " or " + names.back() : "");
}

// The filter of the object that does not let this device pass; empty when all do.
std::string StoppedBy(const Json::Value& object) {
  if (!index::IsPassFilter(object["enable"], true)) return "enable";
  if (!index::IsPassFilter(object["disable"], false)) return "disable";
  return "";
}

void AppendNothing(std::vector<LeftOut>& left_out, const lint::Node& node, const char* wanted) {
  left_out.push_back({"", node.pointer, "type", std::string("gives nothing: ") + wanted});
}

// What stands in the place of entries and modules and is none.
std::vector<LeftOut> FindNothing(const Json::Value& root) {
  constexpr char kNoObject[] = "not an object";
  std::vector<LeftOut> left_out;
  const lint::Node top{&root, ""};
  const std::vector<lint::Node> entries =
      root.isArray() ? lint::ElementsOf(top) : std::vector<lint::Node>{top};
  for (const lint::Node& entry : entries) {
    if (!entry.value->isObject()) AppendNothing(left_out, entry, kNoObject);
    if (!entry.Has("modules")) continue;
    const lint::Node modules = entry.Member("modules");
    if (!modules.value->isArray() && !modules.value->isObject()) {
      AppendNothing(left_out, modules, "not a list");
    }
    for (const lint::Node& module : lint::ElementsOf(modules)) {
      if (!module.value->isObject()) AppendNothing(left_out, module, kNoObject);
    }
  }
  return left_out;
}

std::vector<LeftOut> FindLeftOut(const Json::Value& root) {
  std::vector<LeftOut> left_out = FindNothing(root);
  for (const lint::Item& item : lint::ItemsOf(root)) {
    const std::string id = lint::IdOf(item);
    if (item.is_module && !StoppedBy(*item.entry.value).empty()) {
      left_out.push_back({id, item.node.pointer, "entry", "its entry is left out"});
      continue;
    }
    const std::string filter = StoppedBy(*item.node.value);
    if (filter.empty()) {
      if (item.is_module && !velkor::isJsonType<std::string>((*item.node.value)["params"])) {
        left_out.push_back({id, item.node.pointer, "params", "its \"params\" is not a text"});
      }
      continue;
    }
    left_out.push_back(
        {id, item.node.pointer, filter, ReasonOf(filter, (*item.node.value)[filter])});
  }
  return left_out;
}

void AppendDocuments(Preview& preview, const lint::Package& package, index::StringPool& pool,
                     const std::string& lang) {
  for (const Json::Value& record : preview.records) {
    const Json::Value installed = AsInstalled(package, preview.file, record);
    Json::Value document = index::MakeDocument(pool, lang, installed);
    RequireTaken(lang, document);
    preview.documents.push_back({lang, std::move(document)});
  }
}

[[noreturn]] void Fail(const std::string& file, const std::exception& exception) {
  const std::string path = lint::DisplayPath(file);
  const Report report = Explain(exception);
  throw Failure(path + ": adding it would fail: " + report.cause,
                "`appindex lint " + path + "` says where", report.exit_code, report.code);
}

}  // namespace

Preview MakePreview(const lint::Package& package, const std::string& file,
                    const PreviewOptions& options) {
  const Json::Value root = ReadDescriptor(file);
  const velkor::MutedLog muted;
  const index::AssumedDevice device(options.model, options.platform);
  Preview preview;
  preview.file = file;
  try {
    preview.left_out = FindLeftOut(root);
    preview.records = index::FindIndexables(file);
  } catch (const velkor::Error& error) {
    const Report report = Explain(error);
    throw Failure(lint::DisplayPath(file) + ": " + report.cause,
                  "--model and --platform say for which device to show it", report.exit_code,
                  report.code);
  }
  index::StringPool pool;
  try {
    for (const std::string& lang : options.langs) AppendDocuments(preview, package, pool, lang);
  } catch (const velkor::Error& error) {
    Fail(file, error);
  } catch (const Json::Exception& exception) {
    Fail(file, exception);
  } catch (const Failure& failure) {
    Fail(file, failure);
  }
  return preview;
}

}  // namespace tool
