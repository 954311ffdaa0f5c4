// appindex lint: tells the author of a package what is wrong with it.
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <iostream>
#include <memory>
#include <string>
#include <vector>

#include "tool/context.h"
#include "tool/lint/output.h"
#include "tool/output.h"

namespace tool {
namespace {

constexpr char kAnnotations[] = "github";

struct LintArguments {
  std::vector<std::string> paths;
  std::string package_dir;
  std::string known_file;
  std::string format = "text";
  bool explain = false;
  std::string explained_tag;
  bool strict = false;
  bool list_tags = false;
};

void ListTags(const Context& context) {
  if (context.json) {
    Json::Value tags(Json::arrayValue);
    for (const lint::Tag& tag : lint::AllTags()) tags.append(lint::ToJson(tag));
    PrintJson(tags);
    return;
  }
  for (const lint::Tag& tag : lint::AllTags()) std::cout << tag.name << "\n";
}

void ExplainTag(const Context& context, const std::string& name) {
  const lint::Tag* tag = lint::FindTag(name);
  if (tag == nullptr) {
    throw CLI::ValidationError(
        "--explain", "there is no tag '" + name + "'; appindex lint --list-tags names them all");
  }
  if (context.json) {
    PrintJson(lint::ToJson(*tag));
    return;
  }
  std::cout << tag->name << " (" << lint::SeverityName(tag->severity) << ")\n"
            << tag->summary << "\n\n"
            << tag->explanation << "\n";
}

std::string Summary(const lint::Outcome& outcome) {
  const lint::Counts counts = lint::Count(outcome.findings);
  return Counted(outcome.checked.size(), "descriptor") +
         " checked: " + Counted(counts.errors, "error") + ", " +
         Counted(counts.warnings, "warning") + ", " + Counted(counts.notes, "note");
}

void Write(const Context& context, const LintArguments& arguments, const lint::Outcome& outcome) {
  if (context.json) {
    PrintJson(lint::ToJson(outcome));
  } else if (arguments.format == kAnnotations) {
    lint::WriteAnnotations(std::cout, outcome);
  } else {
    lint::WriteText(std::cout, outcome, MayEmphasise(STDOUT_FILENO));
    lint::WriteTables(std::cout, outcome);
    std::cout.flush();
    Remark(context, Summary(outcome));
  }
}

void CheckPaths(Context& context, const LintArguments& arguments) {
  if (arguments.paths.empty()) throw CLI::RequiredError("PATH");
  lint::Options options;
  options.package_dir = arguments.package_dir;
  if (!arguments.known_file.empty()) options.known = lint::ReadKnownNames(arguments.known_file);
  const lint::Outcome outcome = lint::Lint(arguments.paths, options);
  Write(context, arguments, outcome);
  const lint::Counts counts = lint::Count(outcome.findings);
  const std::size_t counting = counts.errors + (arguments.strict ? counts.warnings : 0);
  context.exit_code = counting > 0 ? kFindings : kDone;
}

void RunLint(Context& context, const LintArguments& arguments) {
  const bool checks = !arguments.list_tags && !arguments.explain;
  if (!checks && !arguments.paths.empty()) {
    throw CLI::ExcludesError("PATH", "--explain and --list-tags");
  }
  if (context.json && arguments.format == kAnnotations) {
    throw CLI::ExcludesError("--format github", "--json");
  }
  if (arguments.list_tags) {
    ListTags(context);
  } else if (arguments.explain) {
    ExplainTag(context, arguments.explained_tag);
  } else {
    CheckPaths(context, arguments);
  }
}

}  // namespace

void AddLintCommand(CLI::App& app, Context& context) {
  const auto arguments = std::make_shared<LintArguments>();
  CLI::App* command = app.add_subcommand("lint", "Check descriptors and their texts");
  command->add_option("PATH", arguments->paths,
                      "A descriptor, a package's directory, or a tree of installed packages");
  command
      ->add_option("--package", arguments->package_dir,
                   "Where the package begins: what will be a directory in /var/packages")
      ->type_name("DIR");
  command
      ->add_option("--known", arguments->known_file,
                   R"(The names that there are: {"models": [...], "platforms": [...]})")
      ->type_name("FILE");
  command->add_option("--format", arguments->format, "text, or github for annotations in a CI")
      ->check(CLI::IsMember({"text", kAnnotations}));
  command->add_flag("--strict", arguments->strict, "Let warnings count as errors do");
  CLI::Option* explain =
      command
          ->add_option("--explain", arguments->explained_tag, "Tell more about a kind of finding")
          ->type_name("TAG");
  command->add_flag("--list-tags", arguments->list_tags, "List the kinds of findings")
      ->excludes(explain);
  command->callback([&context, arguments, explain] {
    arguments->explain = explain->count() > 0;  // of no text too, which is no tag
    RunLint(context, *arguments);
  });
}

}  // namespace tool
