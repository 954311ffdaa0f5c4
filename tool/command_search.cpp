// What a person finds who types the query into the search box.
#include <json/value.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <cstdio>
#include <cstring>
#include <iomanip>
#include <iostream>
#include <memory>
#include <string>
#include <vector>

#include "appindex/elastic_control.h"
#include "tool/context.h"
#include "tool/daemon.h"
#include "tool/emphasis.h"
#include "tool/languages.h"
#include "tool/output.h"
#include "tool/search_reply.h"
#include "tool/wrap.h"

namespace tool {
namespace {

constexpr int kUsualLimit = 10;
constexpr int kHighestLimit = 1000;  // the daemon's
constexpr char kIndent[] = "     ";  // of what stands below a title

struct Options {
  std::string lang;
  int limit = kUsualLimit;
  bool explain = false;
  bool emphasise = false;
  std::vector<std::string> words;
};

std::string Joined(const std::vector<std::string>& words) {
  std::string text;
  for (const std::string& word : words) text += (text.empty() ? "" : " ") + word;
  return text;
}

Json::Value Ask(const Options& options, const std::string& lang, const std::string& query) {
  Json::Value data;
  data["id"] = velkor::appindex::elastic::GetAppIndexID(lang);
  data["query"] = query;
  data["limit"] = options.limit;
  data["explain"] = options.explain || options.emphasise;
  Json::Value reply = AskDaemon("search", data);
  RequireSearchReply(reply);
  return reply;
}

// How the best hit was found, where that is not what the words say.
std::string HowMatched(const std::string& matched) {
  if (matched == "prefix") return "found as the beginning of words";
  if (matched == "ngram") return "found inside words";
  if (matched == "fuzzy") return "nothing is written so; this is close";
  return "";
}

std::string Number(double value) {
  char text[32];
  std::snprintf(text, sizeof(text), "%.4g", value);
  return text;
}

void PrintExplanation(const Json::Value& hit, bool styled) {
  std::string text = kIndent + ("score " + Number(hit["score"].asDouble()) + ":");
  const char* separator = " ";
  for (const Json::Value& part : hit["explain"]) {
    text +=
        separator + ("\"" + part["text"].asString() + "\" " + part["found"].asString() + " in " +
                     part["member"].asString() + " " + Number(part["worth"].asDouble()));
    separator = ", ";
  }
  std::cout << Styled(OneLine(text), Look::kFaint, styled) << "\n";
}

Likeness LikenessOf(const std::string& found) {
  return found == "stem" ? Likeness::kForm : found == "typo" ? Likeness::kSlip : Likeness::kSame;
}

// What to emphasise in a member of a hit: what was typed, and what was found of it in that member.
// Keywords are not shown; the title stands for them.
std::vector<Sought> SoughtIn(const Json::Value& hit, const std::string& member,
                             const std::string& query) {
  std::vector<Sought> sought = {{query, Likeness::kSame}};
  for (const Json::Value& part : hit["explain"]) {
    const bool by_keyword = member == "title" && part["member"].asString() == "keywords";
    if (!by_keyword && part["member"].asString() != member) continue;
    const Likeness likeness = LikenessOf(part["found"].asString());
    sought.push_back({part["text"].asString(),
                      by_keyword && likeness == Likeness::kSame ? Likeness::kForm : likeness});
  }
  return sought;
}

void PrintDescription(const std::string& text, const std::vector<Sought>& sought, bool styled) {
  if (text.empty()) return;
  const bool wrap = IsTerminal(STDOUT_FILENO);
  const std::size_t indent = std::strlen(kIndent);
  const auto columns = static_cast<std::size_t>(TerminalWidth(STDOUT_FILENO));
  const std::vector<std::string> lines =
      wrap ? Wrapped(text, columns > indent ? columns - indent : 1)
           : std::vector<std::string>{text};
  for (const std::string& line : lines) {
    std::cout << kIndent << (styled ? Emphasised(line, sought) : line) << "\n";
  }
}

void PrintHit(const Json::Value& hit, Json::ArrayIndex number, const std::string& query,
              const Options& options) {
  const bool styled = options.emphasise;
  const std::string title = OneLine(hit["title"].asString());
  std::cout << std::setw(3) << number << ". "
            << (styled ? Emphasised(title, SoughtIn(hit, "title", query)) : title) << "  "
            << Styled("(" + OneLine(hit["id"].asString()) + ")", Look::kFaint, styled) << "\n";
  PrintDescription(OneLine(hit["desc"].asString()), SoughtIn(hit, "desc", query), styled);
  if (options.explain) PrintExplanation(hit, styled);
}

void PrintHits(const Json::Value& reply, const std::string& query, const Options& options) {
  Json::ArrayIndex number = 0;
  for (const Json::Value& hit : reply["hits"]) PrintHit(hit, ++number, query, options);
}

void RemarkOn(const Context& context, const Json::Value& reply) {
  const Json::UInt64 total = reply["total"].asUInt64();
  if (total == 0) Remark(context, "nothing found");
  const std::string how = HowMatched(reply["matched"].asString());
  if (!how.empty()) Remark(context, "(" + how + ")");
  const Json::ArrayIndex shown = reply["hits"].size();
  if (total > shown) Remark(context, "(" + std::to_string(total - shown) + " more: see --limit)");
  if (reply["cut"].asBool()) Remark(context, "(the query is long: only its beginning counted)");
}

void Search(Context& context, Options options) {
  options.emphasise = !context.json && MayEmphasise(STDOUT_FILENO);
  const std::string lang = options.lang.empty() ? UsersLanguage() : options.lang;
  RequireLanguage(lang);
  const std::string query = Joined(options.words);
  Json::Value reply = Ask(options, lang, query);
  if (reply["total"].asUInt64() == 0) context.exit_code = kNothingFound;
  if (context.json) {
    reply.removeMember("success");
    reply["lang"] = lang;
    reply["query"] = query;
    PrintJson(reply);
    return;
  }
  PrintHits(reply, query, options);
  RemarkOn(context, reply);
}

}  // namespace

void AddSearchCommand(CLI::App& app, Context& context) {
  CLI::App* command = app.add_subcommand("search", "Find applications by what a person types");
  const auto options = std::make_shared<Options>();
  command->add_option("--lang", options->lang, "Language code; else that of the locale")
      ->type_name("LANG");
  command->add_option("--limit", options->limit, "How many to show, 10 unless given")
      ->type_name("N")
      ->check(CLI::Validator(CLI::Range(1, kHighestLimit)).description("1 to 1000"));
  command->add_flag("--explain", options->explain, "Say why each ranks where it does");
  command->add_option("QUERY", options->words, "What the person typed")->required()->type_name("");
  command->callback([&context, options] { Search(context, *options); });
}

}  // namespace tool
