#include "common/pattern.h"

#include <boost/regex.hpp>

namespace velkor {

bool SearchPattern(const char* pattern, const std::string& text, std::vector<std::string>& groups) {
  boost::smatch match;
  if (!boost::regex_search(text, match, boost::regex(pattern))) return false;
  groups.assign(match.begin() + 1, match.end());
  return true;
}

}  // namespace velkor
