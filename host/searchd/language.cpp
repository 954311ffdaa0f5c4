#include "host/searchd/language.h"

#include <map>

namespace searchd {

Language LanguageOfIndex(const std::string& index_id) {
  // Where words are not inflected, or not with an alphabet, what has endings is English.
  static const std::map<std::string, Language> languages = {
      {"chs", {"zh_Hans", "english", false}},
      {"cht", {"zh_Hant", "english", false}},
      {"csy", {"cs", "", false}},
      {"dan", {"da", "danish", false}},
      {"enu", {"en_US", "english", false}},
      {"fre", {"fr", "french", false}},
      {"ger", {"de", "german", false}},
      {"hun", {"hu", "hungarian", false}},
      {"ita", {"it", "italian", false}},
      {"jpn", {"ja", "english", false}},
      {"krn", {"ko", "english", false}},
      {"nld", {"nl", "dutch", false}},
      {"nor", {"nb", "norwegian", false}},
      {"plk", {"pl", "", false}},
      {"ptb", {"pt_BR", "portuguese", false}},
      {"ptg", {"pt_PT", "portuguese", false}},
      {"rus", {"ru", "russian", false}},
      {"spn", {"es", "spanish", false}},
      {"sve", {"sv", "swedish", false}},
      {"tha", {"th", "english", false}},
      {"trk", {"tr", "turkish", true}},
  };
  const std::size_t underscore = index_id.rfind('_');
  if (underscore == std::string::npos) return {};
  const auto found = languages.find(index_id.substr(underscore + 1));
  return found == languages.end() ? Language{} : found->second;
}

}  // namespace searchd
