#include "host/searchd/language.h"

#include <map>

namespace searchd {

Language LanguageOfIndex(const std::string& index_id) {
  static const std::map<std::string, Language> languages = {
      {"chs", {"zh_Hans", false}}, {"cht", {"zh_Hant", false}}, {"csy", {"cs", false}},
      {"dan", {"da", false}},      {"enu", {"en_US", false}},   {"fre", {"fr", false}},
      {"ger", {"de", false}},      {"hun", {"hu", false}},      {"ita", {"it", false}},
      {"jpn", {"ja", false}},      {"krn", {"ko", false}},      {"nld", {"nl", false}},
      {"nor", {"nb", false}},      {"plk", {"pl", false}},      {"ptb", {"pt_BR", false}},
      {"ptg", {"pt_PT", false}},   {"rus", {"ru", false}},      {"spn", {"es", false}},
      {"sve", {"sv", false}},      {"tha", {"th", false}},      {"trk", {"tr", true}},
  };
  const std::size_t underscore = index_id.rfind('_');
  if (underscore == std::string::npos) return {};
  const auto found = languages.find(index_id.substr(underscore + 1));
  return found == languages.end() ? Language{} : found->second;
}

}  // namespace searchd
