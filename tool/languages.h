// The device's language codes, as people choose them.
#pragma once

#include <string>

namespace tool {

// The code for a locale's name, such as "ger" for "de_AT.UTF-8". "enu" for one without a code, such
// as "C".
std::string CodeOfLocale(const std::string& locale);

// That of the locale in which the user reads messages.
std::string UsersLanguage();

// Throws CLI::ValidationError, with the codes there are, for a text that is not one.
void RequireLanguage(const std::string& lang);

}  // namespace tool
