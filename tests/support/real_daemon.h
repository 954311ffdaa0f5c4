// The real search daemon, running in the test's device root.
#pragma once

#include <json/value.h>
#include <sys/types.h>

#include <string>
#include <vector>

namespace test {

class RealDaemon {
 public:
  // Starts tovoelasticd in the root whose directory is `outside_path` as seen from `outside_fd`,
  // and returns when it listens. Throws when it does not come up.
  RealDaemon(int outside_fd, const std::string& outside_path);
  // Kills it if it still runs.
  ~RealDaemon();
  RealDaemon(const RealDaemon&) = delete;
  RealDaemon& operator=(const RealDaemon&) = delete;

  // Sends SIGTERM and returns its exit status, or -1 when a signal ended it.
  int Stop();
  // kill -9, as a crash or a power cut ends a process.
  void Kill();
  // Starts it again.
  void Start();

  // One exchange with it: the whole reply.
  static Json::Value Ask(const std::string& command, const Json::Value& data);

  // The ids of the hits for `query` in the app index of `lang`, best first.
  static std::vector<std::string> Search(const std::string& lang, const std::string& query);

 private:
  int outside_fd_;
  std::string outside_path_;
  pid_t pid_ = -1;
};

}  // namespace test
