// The examples of doc/protocol.md, as its reader meets them.
#pragma once

#include <json/value.h>

#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace test {

// A block of JSON that holds a request, and the reply beside it: the next block, or a text
// "Reply: `{...}`", before another request. What stands before it may say what happens first:
// "After `FILE` has been removed:", "While another process holds `FILE`:" and "When it has let go
// of it:".
struct ProtocolExample {
  std::string heading;  // it stands below
  int line = 0;
  Json::Value request;
  std::optional<Json::Value> reply;
  std::optional<std::string> removed_file;
  std::optional<std::string> held_file;
  bool let_go = false;
};

struct ProtocolDoc {
  std::vector<ProtocolExample> examples;
  std::vector<std::string> commands;  // that have a heading below "Commands"
  std::set<int> codes;                // of the table of codes
  std::set<std::string> members;      // of all tables of members
  // The table of limits: what there is a limit of, and the first number, in bytes if it is a size.
  std::map<std::string, std::size_t> limits;
};

// Throws when a block of JSON in it is not JSON.
ProtocolDoc ReadProtocolDoc(const std::string& file);

}  // namespace test
