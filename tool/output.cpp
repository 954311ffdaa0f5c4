#include "tool/output.h"

#include <sys/ioctl.h>
#include <unistd.h>

#include <cstdlib>
#include <iostream>

#include "appindex/utilities/json_helpers.h"

namespace tool {
namespace {

constexpr int kUsualWidth = 80;
constexpr char kBold[] = "\033[1m";
constexpr char kFaint[] = "\033[2m";
constexpr char kPlain[] = "\033[0m";
constexpr long long kMinute = 60;
constexpr long long kHour = 60 * kMinute;
constexpr long long kDay = 24 * kHour;

bool IsSet(const char* variable) {
  const char* value = std::getenv(variable);
  return value != nullptr && *value != '\0';
}

bool BeginsCharacter(char byte) { return (static_cast<unsigned char>(byte) & 0xC0U) != 0x80U; }

}  // namespace

bool IsTerminal(int fd) {
  const char* term = std::getenv("TERM");
  return isatty(fd) != 0 && (term == nullptr || std::string(term) != "dumb");
}

bool MayEmphasise(int fd) { return IsTerminal(fd) && !IsSet("NO_COLOR"); }

int TerminalWidth(int fd) {
  winsize size{};
  return ioctl(fd, TIOCGWINSZ, &size) == 0 && size.ws_col > 0 ? size.ws_col : kUsualWidth;
}

std::string Styled(const std::string& text, Look look, bool may_emphasise) {
  if (!may_emphasise || look == Look::kPlain) return text;
  return (look == Look::kBold ? kBold : kFaint) + text + kPlain;
}

void PrintJson(const Json::Value& value) { std::cout << velkor::toString(value) << "\n"; }

void Remark(const Context& context, const std::string& text) {
  if (!context.quiet) std::cerr << OneLine(text) << "\n";
}

std::string Counted(std::size_t count, const std::string& noun) {
  return std::to_string(count) + " " + noun + (count == 1 ? "" : "s");
}

std::string Shortened(const std::string& text, std::size_t columns) {
  std::size_t characters = 0;
  std::size_t last = 0;  // where the last character that fits begins
  for (std::size_t at = 0; at < text.size(); ++at) {
    if (!BeginsCharacter(text[at])) continue;
    if (characters == columns) return columns == 0 ? "" : text.substr(0, last) + "~";
    ++characters;
    last = at;
  }
  return text;
}

std::string OneLine(const std::string& text) {
  std::string line;
  for (std::size_t at = 0; at < text.size(); ++at) {
    const auto byte = static_cast<unsigned char>(text[at]);
    const auto next = static_cast<unsigned char>(at + 1 < text.size() ? text[at + 1] : 0);
    const bool is_c1 = byte == 0xC2U && next >= 0x80U && next < 0xA0U;  // U+0080 to U+009F
    line += byte < 0x20U || byte == 0x7FU || is_c1 ? ' ' : text[at];
    if (is_c1) ++at;
  }
  return line;
}

std::string Duration(long long seconds) {
  if (seconds < kMinute) return std::to_string(seconds) + " s";
  if (seconds < kHour) return std::to_string(seconds / kMinute) + " min";
  if (seconds < 2 * kDay) {
    return std::to_string(seconds / kHour) + " h " + std::to_string(seconds % kHour / kMinute) +
           " min";
  }
  return std::to_string(seconds / kDay) + " days";
}

}  // namespace tool
