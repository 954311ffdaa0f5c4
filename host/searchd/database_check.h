// Whether the database that an earlier process has left is whole.
#pragma once

#include <memory>
#include <mutex>
#include <string>

#include "host/sdk/unique_fd.h"

namespace searchd {

// Xapian reports most damage when it meets it, but some makes it crash. So a database is read once,
// as a whole, before it is used, and in a process of its own that may crash.
class DatabaseCheck {
 public:
  // Starts to check the database in `path`. Call it before any thread is started.
  static std::unique_ptr<DatabaseCheck> Start(const std::string& path);

  // A database that this process has made, and nothing is to be checked of.
  DatabaseCheck() = default;

  // Waits for the result. Throws RequestError(kStorage) if the database is damaged, each time. Any
  // thread may call.
  void Await();

 private:
  DatabaseCheck(std::string path, int result_fd);

  const std::string path_;
  std::mutex mutex_;
  std::unique_ptr<host::sdk::UniqueFd> result_fd_;  // null when the result is there
  std::string damage_;
};

}  // namespace searchd
