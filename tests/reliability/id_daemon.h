// A search daemon that keeps of each document no more than its id.
#pragma once

#include <json/value.h>

#include <map>
#include <mutex>
#include <set>
#include <string>
#include <thread>
#include <vector>

namespace test {

// Listens on the daemon's socket of the root that the process is in, from construction to
// destruction, and answers every request with success, one connection at a time, on a thread of its
// own. An index is there as soon as something is written to it.
class IdDaemon {
 public:
  IdDaemon();
  ~IdDaemon();
  IdDaemon(const IdDaemon&) = delete;
  IdDaemon& operator=(const IdDaemon&) = delete;

  // The ids that searches would find, by index.
  std::map<std::string, std::set<std::string>> Committed();

 private:
  struct Change {
    bool removes;
    std::string document;
  };

  void Serve();
  void Handle(int fd);
  void CarryOut(const Json::Value& request);

  int listener_;
  std::mutex mutex_;
  std::map<std::string, std::vector<Change>> changes_;  // not committed
  std::map<std::string, std::set<std::string>> committed_;
  std::thread thread_;
};

}  // namespace test
