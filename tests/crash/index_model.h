// The search daemon's indexes as the library's commands leave them.
#pragma once

#include <json/value.h>

#include <map>
#include <mutex>
#include <string>

#include "tests/support/scripted_daemon.h"

namespace test {

class IndexModel {
 public:
  using Index = std::map<std::string, Json::Value>;  // documents by id
  using Indexes = std::map<std::string, Index>;      // by the index's id

  // Carries out one request, as the daemon does; for ScriptedDaemon.
  Reaction React(const Json::Value& request);

  // What searches would see.
  Indexes Committed();

  // From now on these are the indexes, all committed.
  void Set(const Indexes& indexes);

 private:
  Reaction Change(const std::string& command, const Json::Value& data);

  std::mutex mutex_;
  Indexes current_;
  Indexes committed_;
};

}  // namespace test
