// appindex show: what a descriptor gives, before anything is sent.
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <cstring>
#include <iostream>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "appindex/device_identity.h"
#include "tool/context.h"
#include "tool/failure.h"
#include "tool/lint/package.h"
#include "tool/output.h"
#include "tool/preview.h"

namespace tool {
namespace {

struct ShowArguments {
  std::string path;
  std::set<std::string> langs;
  std::string package_dir;
  PreviewOptions options;
};

Json::Value ToJson(const Preview& preview) {
  Json::Value json(Json::objectValue);
  json["file"] = lint::DisplayPath(preview.file);
  json["records"] = preview.records;
  json["documents"] = Json::Value(Json::arrayValue);
  for (const PreviewDocument& made : preview.documents) {
    Json::Value document(Json::objectValue);
    document["lang"] = made.lang;
    document["document"] = made.document;
    json["documents"].append(document);
  }
  json["left_out"] = Json::Value(Json::arrayValue);
  for (const LeftOut& item : preview.left_out) {
    Json::Value left_out(Json::objectValue);
    left_out["id"] = item.id;
    left_out["pointer"] = item.pointer;
    left_out["filter"] = item.filter;
    left_out["reason"] = item.reason;
    json["left_out"].append(left_out);
  }
  return json;
}

// The members that differ from one another; "search_title" is the title again.
void WriteDocument(const PreviewDocument& made) {
  const char* before = made.lang.c_str();
  for (const char* member : {"title", "desc", "keywords"}) {
    std::cout << "  " << before << "  " << member << std::string(10 - std::strlen(member), ' ')
              << OneLine(made.document[member].asString()) << "\n";
    before = "   ";
  }
}

std::string NameOf(const LeftOut& item) {
  if (!item.id.empty()) return item.id;
  return item.pointer.empty() ? "the descriptor" : item.pointer;
}

void WriteText(const Preview& preview) {
  const bool emphasise = MayEmphasise(STDOUT_FILENO);
  std::cout << OneLine(lint::DisplayPath(preview.file)) << "\n";
  for (Json::ArrayIndex i = 0; i < preview.records.size(); ++i) {
    const Json::Value& record = preview.records[i];
    const std::string owner = record["owner"].asString();
    std::cout << "\n" << Styled(OneLine(record["id"].asString()), Look::kBold, emphasise);
    if (!owner.empty()) std::cout << "  (a module of " << OneLine(owner) << ")";
    std::cout << "\n";
    // All records of one language stand before those of the next.
    for (std::size_t at = i; at < preview.documents.size(); at += preview.records.size()) {
      WriteDocument(preview.documents[at]);
    }
  }
  if (!preview.left_out.empty()) std::cout << "\nLeft out on this device:\n";
  for (const LeftOut& item : preview.left_out) {
    std::cout << "  " << OneLine(NameOf(item)) << ": " << OneLine(item.reason) << "\n";
  }
}

std::vector<Preview> MakePreviews(const ShowArguments& arguments) {
  std::vector<Preview> previews;
  for (const lint::Package& package : lint::FindPackages(arguments.path, arguments.package_dir)) {
    for (const std::string& file : package.checked) {
      previews.push_back(MakePreview(package, file, arguments.options));
    }
  }
  if (previews.empty()) {
    throw Failure(arguments.path + ": there is no index.conf in it or up to five levels below",
                  "name a descriptor, or a directory that holds one");
  }
  return previews;
}

void Show(const Context& context, ShowArguments arguments) {
  const std::set<std::string>& all = velkor::appindex::GetSupportedLangs();
  const std::set<std::string>& langs = arguments.langs.empty() ? all : arguments.langs;
  arguments.options.langs.assign(langs.begin(), langs.end());
  const std::vector<Preview> previews = MakePreviews(arguments);
  if (context.json) {
    Json::Value descriptors(Json::arrayValue);
    for (const Preview& preview : previews) descriptors.append(ToJson(preview));
    Json::Value json(Json::objectValue);
    json["descriptors"] = descriptors;
    PrintJson(json);
    return;
  }
  const char* separator = "";
  for (const Preview& preview : previews) {
    std::cout << separator;
    WriteText(preview);
    separator = "\n";
  }
}

}  // namespace

void AddShowCommand(CLI::App& app, Context& context) {
  const auto arguments = std::make_shared<ShowArguments>();
  CLI::App* command = app.add_subcommand("show", "Show what a descriptor gives; nothing is sent");
  command
      ->add_option("PATH", arguments->path,
                   "A descriptor, a package's directory, or a tree of installed packages")
      ->required();
  command->add_option("--lang", arguments->langs, "Only in this language; may be repeated")
      ->type_name("LANG")
      ->allow_extra_args(false)  // what follows may be the path
      ->check(CLI::IsMember(velkor::appindex::GetSupportedLangs()));
  command->add_option("--model", arguments->options.model, "As on a device of this model")
      ->type_name("MODEL");
  command->add_option("--platform", arguments->options.platform, "As on a device of this platform")
      ->type_name("PLATFORM");
  command
      ->add_option("--package", arguments->package_dir,
                   "Where the package begins: what will be a directory in /var/packages")
      ->type_name("DIR");
  command->callback([&context, arguments] { Show(context, *arguments); });
}

}  // namespace tool
