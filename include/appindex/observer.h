/// @file
/// Watching the library at work, for a program that shows its progress.
#pragma once

#include <chrono>
#include <cstddef>
#include <string>

#include "appindex/export.h"

namespace velkor::appindex {

/// Is told what Add, Del, Reindex and ProcessQueue do. Whether there is one changes nothing that
/// they send, log, write or wait for; they read each descriptor once more to count its documents.
///
/// Each call comes from the thread that does the work, which goes on when it returns. A call may
/// throw, which ends the work there as a failure does: the exception leaves the library as it is,
/// what was written stays written, and a batch of the queue stays to be carried out again. An Error
/// with the code of a daemon would be taken for the daemon's; throw another type.
class TEISEIGATRO_EXPORT Observer {
 public:
  /// What a call waits for.
  enum class Wait {
    kLock,      ///< another process holds a lock: it works the queue, or writes a request
    kSocket,    ///< the search daemon's socket is missing
    kNotReady,  ///< the search daemon's database is not ready
    kBusy,      ///< the search daemon is busy
  };

  Observer() = default;
  virtual ~Observer();
  Observer(const Observer&) = delete;             ///< not copied
  Observer& operator=(const Observer&) = delete;  ///< not copied

  /// ProcessQueue is about to carry out request `number`, from 1, of a batch of `total`.
  virtual void OnRequest(std::size_t number, std::size_t total) = 0;

  /// Add, Del or Reindex is about to begin, with so many documents to write or delete: the items of
  /// its descriptors, in each of the 21 languages. The descriptors are read again when their turn
  /// comes, so a package that changes meanwhile makes for more or fewer. An Add that becomes a full
  /// rebuild makes a second call; a rebuild within a rebuild too, and what is left of the outer one
  /// follows it uncounted.
  virtual void OnWork(std::size_t documents) = 0;

  /// The daemon has taken one document, or its deletion, of descriptor `conf_path` in language
  /// `lang`. The texts are valid during the call.
  virtual void OnDocument(const std::string& conf_path, const std::string& lang) = 0;

  /// The call is about to wait so long before it tries again, once more after each vain attempt.
  /// What it waits for inside the system, such as an answer of the daemon, is not told.
  virtual void OnWait(Wait reason, std::chrono::milliseconds pause) = 0;
};

/// Makes `observer` the one that is told, in place of the one before; null, as at the beginning:
/// none. It must stay valid until it is replaced. Not while another thread is in a call of the
/// library.
TEISEIGATRO_EXPORT void SetObserver(Observer* observer);

}  // namespace velkor::appindex
