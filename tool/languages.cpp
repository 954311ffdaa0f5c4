#include "tool/languages.h"

#include <CLI/CLI.hpp>
#include <cstdlib>
#include <map>

#include "appindex/device_identity.h"

namespace tool {
namespace {

constexpr char kEnglish[] = "enu";

// By language, and by language and territory where the territory decides.
const std::map<std::string, std::string> kCodes = {
    {"cs", "csy"}, {"da", "dan"},    {"de", "ger"},    {"en", "enu"},    {"es", "spn"},
    {"fr", "fre"}, {"hu", "hun"},    {"it", "ita"},    {"ja", "jpn"},    {"ko", "krn"},
    {"nb", "nor"}, {"nl", "nld"},    {"nn", "nor"},    {"no", "nor"},    {"pl", "plk"},
    {"pt", "ptg"}, {"pt_BR", "ptb"}, {"ru", "rus"},    {"sv", "sve"},    {"th", "tha"},
    {"tr", "trk"}, {"zh", "chs"},    {"zh_HK", "cht"}, {"zh_MO", "cht"}, {"zh_TW", "cht"},
};

}  // namespace

std::string CodeOfLocale(const std::string& locale) {
  const std::string name = locale.substr(0, locale.find_first_of(".@"));
  auto found = kCodes.find(name);
  if (found == kCodes.end()) found = kCodes.find(name.substr(0, name.find('_')));
  return found == kCodes.end() ? kEnglish : found->second;
}

std::string UsersLanguage() {
  for (const char* variable : {"LC_ALL", "LC_MESSAGES", "LANG"}) {
    const char* locale = std::getenv(variable);
    if (locale != nullptr && *locale != '\0') return CodeOfLocale(locale);
  }
  return kEnglish;
}

void RequireLanguage(const std::string& lang) {
  const auto& codes = velkor::appindex::GetSupportedLangs();
  if (codes.count(lang) != 0) return;
  std::string all;
  for (const std::string& code : codes) all += " " + code;
  throw CLI::ValidationError("--lang",
                             "no language has the code \"" + lang + "\"; there are" + all);
}

}  // namespace tool
