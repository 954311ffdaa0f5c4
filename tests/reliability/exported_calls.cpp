#include "tests/reliability/exported_calls.h"

#include <fstream>
#include <set>

namespace test {
namespace {

void Replace(std::string& text, const std::string& from, const std::string& to) {
  for (std::size_t at = 0; (at = text.find(from, at)) != std::string::npos; at += to.size()) {
    text.replace(at, from.size(), to);
  }
}

}  // namespace

std::vector<ExportedCall> AllCalls() {
  std::vector<ExportedCall> all;
  for (const auto& calls : {UtilityCalls(), DeviceCalls(), DaemonCalls()}) {
    all.insert(all.end(), calls.begin(), calls.end());
  }
  return all;
}

std::vector<std::string> ExportedNames() {
  std::ifstream lines(EXPORTED_SYMBOLS);
  std::set<std::string> names;
  std::string line;
  while (std::getline(lines, line)) {
    if (line.find(" for ") != std::string::npos) continue;  // type information, tables
    std::string name = line.substr(0, line.find('('));
    name.erase(0, name.find("velkor::"));  // the result's type
    Replace(name, "[abi:cxx11]", "");
    Replace(name, "std::__cxx11::basic_string<char, std::char_traits<char>, std::allocator<char> >",
            "string");
    Replace(name, " >", ">");
    names.insert(name);
  }
  return {names.begin(), names.end()};
}

}  // namespace test
