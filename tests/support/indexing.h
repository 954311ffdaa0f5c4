// What the tests of the index manager share: where its files are, applications in the device root,
// the work queue as its writers write it, and the requests that a call is to send.
#pragma once

#include <gtest/gtest.h>
#include <json/reader.h>
#include <json/value.h>
#include <json/writer.h>  // prints values in failure messages

#include <fstream>
#include <sstream>
#include <string>
#include <vector>

#include "appindex/error.h"
#include "appindex/utilities/lock_file.h"
#include "tests/support/device_root_test.h"

namespace test {

constexpr char kQueue[] = "/var/packages/Velkor/etc/appindex.queue";
constexpr char kBatch[] = "/var/packages/Velkor/etc/appindex.queue.tmp";
constexpr char kProcessLock[] = "/tmp/velkor_appindex_process.lck";
constexpr char kRecord[] = "/var/packages/Velkor/etc/appindex.cfg";
constexpr char kDatabase[] = "/var/packages/Velkor/etc/appindex.db/";
constexpr char kSocket[] = "/var/run/tovoelasticd.sock";

// The languages in the order in which every loop of the library visits them.
inline const std::vector<std::string>& LangsInOrder() {
  static const std::vector<std::string> langs = {"chs", "cht", "csy", "dan", "enu", "fre", "ger",
                                                 "hun", "ita", "jpn", "krn", "nld", "nor", "plk",
                                                 "ptb", "ptg", "rus", "spn", "sve", "tha", "trk"};
  return langs;
}

inline Json::Value Parse(const std::string& text) {
  Json::Value value;
  std::istringstream(text) >> value;
  return value;
}

// The descriptor path of package `name`.
inline std::string ConfOf(const std::string& name) {
  return "/var/packages/" + name + "/target/ui/index.conf";
}

// Installs package `name` with one item whose id and title are its name; returns the descriptor's
// path.
inline std::string Install(const std::string& name) {
  WriteFile(ConfOf(name), R"({"app":")" + name + R"(","title":")" + name + R"("})");
  return ConfOf(name);
}

// Appends a request as every writer does: a whole line, under the lock on the queue's path.
inline void Enqueue(const std::string& line) {
  const velkor::LockFile lock(kQueue, true);
  std::ofstream(kQueue, std::ios::app) << line << '\n';
}

inline std::string Request(int op, const std::string& path) {
  return R"({"op":)" + std::to_string(op) + R"(,"path":")" + path + R"("})";
}

// For each language in order all of `patterns`, with its code in place of "LANG".
inline std::vector<std::string> PerLang(const std::vector<std::string>& patterns) {
  std::vector<std::string> commands;
  for (const std::string& lang : LangsInOrder()) {
    for (std::string command : patterns) {
      command.replace(command.find("LANG"), 4, lang);
      commands.push_back(command);
    }
  }
  return commands;
}

inline std::vector<std::string> Joined(const std::vector<std::vector<std::string>>& parts) {
  std::vector<std::string> all;
  for (const auto& part : parts) all.insert(all.end(), part.begin(), part.end());
  return all;
}

// The commands, as ScriptedDaemon::Commands gives them, of adding and removing one item.
inline std::vector<std::string> AddCommands(const std::string& id) {
  return PerLang({"document_upsert_by_id appindex_LANG " + id, "commit appindex_LANG"});
}
inline std::vector<std::string> DelCommands(const std::string& id) {
  return PerLang({"document_del_by_id appindex_LANG " + id, "commit appindex_LANG"});
}

// Those of a full rebuild that finds items with these ids, in this order.
inline std::vector<std::string> ReindexCommands(const std::vector<std::string>& ids) {
  std::vector<std::vector<std::string>> parts = {
      PerLang({"index_delete appindex_LANG", "index_create appindex_LANG"})};
  for (const std::string& id : ids) {
    parts.push_back(PerLang({"document_upsert_by_id appindex_LANG " + id}));
  }
  parts.push_back(PerLang({"commit appindex_LANG"}));
  return Joined(parts);
}

// The Error that `call` throws; fails the test when it throws none.
template <typename Call>
velkor::Error ThrownBy(const Call& call) {
  try {
    call();
  } catch (const velkor::Error& error) {
    return error;
  }
  ADD_FAILURE() << "no Error was thrown";
  return velkor::Error(0);
}

}  // namespace test
