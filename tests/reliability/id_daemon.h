// A search daemon that keeps of each document no more than its id.
#pragma once

#include <sys/types.h>

#include <map>
#include <set>
#include <string>

namespace test {

// Listens on the daemon's socket of the root that the process is in, or of that below `root`, from
// construction to destruction, and answers every request with success, one connection at a time. An
// index is there as soon as something is written to it. A process of its own: a test that forks
// while one of its threads is allocating memory may get a child that waits for the allocator for
// ever.
class IdDaemon {
 public:
  explicit IdDaemon(const std::string& root = "");
  ~IdDaemon();
  IdDaemon(const IdDaemon&) = delete;
  IdDaemon& operator=(const IdDaemon&) = delete;

  // The ids that searches would find, by index.
  std::map<std::string, std::set<std::string>> Committed() const;

 private:
  const std::string socket_;
  pid_t process_;
};

}  // namespace test
