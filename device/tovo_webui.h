// Contract: the web interface's reader of translated texts.
#pragma once

#include <json/value.h>

#include <string>

namespace TOVO {
namespace PMX {

struct LocalizedStringParser {
  // Reads the texts of one language from directory `dir` (given without a trailing "/"). Returns an
  // object whose members are sections; each section is an object of key and text (a JSON string).
  // Returns an empty value when the directory is absent, unreadable or holds nothing that can be
  // read. May be called from any thread. The format of the files is the port's own.
  static Json::Value ParseTexts(std::string dir);
};

}  // namespace PMX
}  // namespace TOVO
