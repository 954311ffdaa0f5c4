// Reading a database as a whole, in a process that may crash.
#pragma once

#include <memory>
#include <string>

#include "host/sdk/unique_fd.h"

namespace searchd {

// Xapian reports most damage when it meets it, but some makes it crash. So a database is read once,
// as a whole, before it is used, and in a process of its own. Those processes are started by one
// that has a single thread, as the daemon has too many to make copies of itself.
class CheckProcess {
 public:
  // Starts it, with `output` as its standard output and standard error; call this before any thread
  // is started. It ends with the object. Throws std::runtime_error.
  explicit CheckProcess(int output);

  // Begins to read the database in `path`. Returns a descriptor from which the result can be read:
  // "+" for a database that is whole, what is wrong with another, which is then in the system log
  // too, and nothing when the attempt to read it has crashed. Throws RequestError(kStorage). Any
  // thread may call.
  std::unique_ptr<host::sdk::UniqueFd> Begin(const std::string& path);

 private:
  std::unique_ptr<host::sdk::UniqueFd> requests_;
};

// What CheckProcess says of a database that is whole.
constexpr char kNoDamage = '+';

}  // namespace searchd
