// Whether the database of an index is whole, and still as the daemon has left it.
#pragma once

#include <atomic>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

#include "host/sdk/unique_fd.h"
#include "host/searchd/check_process.h"
#include "host/searchd/index_directory.h"
#include "host/searchd/request_error.h"

namespace searchd {

// Looks before each use whether somebody else has changed the files. If so, they are read as a
// whole again, and what was opened before must not be used any more. Any thread may call.
class DatabaseCheck {
 public:
  enum class Files {
    kFound,  // left by an earlier process: they are to be checked
    kMade,   // by this process
  };

  // Starts to check files that are found. `process` must outlive the object.
  DatabaseCheck(std::string path, CheckProcess& process, Files files);

  // Waits until it is known whether the files are whole. Returns a number that grows whenever they
  // have to be opened again. Throws RequestError(kStorage), for damage KnownDamage, each time.
  unsigned Await();

  // Throws KnownDamage if it is known that the files are damaged, and costs next to nothing if not.
  // Never waits.
  void ThrowIfDamaged();

  // Checks the files again, whatever they look like. Not while the daemon is changing them.
  void Renew();

  // The time in which the daemon itself changes the files. One at a time.
  class Writing {
   public:
    // As Await.
    explicit Writing(DatabaseCheck& check);
    ~Writing();
    Writing(const Writing&) = delete;
    Writing& operator=(const Writing&) = delete;

    unsigned Generation() const { return generation_; }

   private:
    DatabaseCheck& check_;
    unsigned generation_;
  };

 private:
  unsigned AwaitLocked();
  void LookLocked();
  void Begin();

  const std::string path_;
  CheckProcess& process_;
  std::mutex mutex_;
  std::optional<FilesState> state_;  // in which the files are whole or being checked
  bool renew_ = false;
  bool writing_ = false;
  unsigned generation_ = 0;
  std::unique_ptr<host::sdk::UniqueFd> result_fd_;  // null when the result is there
  std::string damage_;
  std::atomic<bool> damaged_ = false;  // whether there is a text in damage_
};

}  // namespace searchd
