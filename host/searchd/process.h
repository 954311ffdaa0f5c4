// The daemon as a process: background, lock, socket, signals.
#pragma once

#include <sys/types.h>

#include <stdexcept>
#include <string>

#include "host/sdk/unique_fd.h"

namespace searchd {

class AlreadyRunning : public std::runtime_error {
  using std::runtime_error::runtime_error;
};

// Goes on in a new session in a child process. The calling process ends here: with 0 when the child
// has written to the returned descriptor, or with the child's exit status when it ends before.
int GoToBackground();

// Lets go of the terminal: standard input, output and error become `null_fd`.
void DropTerminal(int null_fd);

// Writes "ready" to the descriptor and closes it.
void ReportReady(int fd);

// Holds a lock file as long as it lives; the system lets go of it however the process ends. The
// file stays and holds the process id. Throws AlreadyRunning or std::runtime_error.
class ProcessLock {
 public:
  explicit ProcessLock(const std::string& file);

 private:
  host::sdk::UniqueFd fd_;
};

// The socket file of the daemon. It goes with the object, unless another has taken its place.
class SocketFile {
 public:
  // Makes a listening socket that every user may connect to. A socket that nobody listens on is
  // replaced; anything else that is there is left alone, and std::runtime_error thrown.
  explicit SocketFile(std::string path);
  ~SocketFile();
  SocketFile(const SocketFile&) = delete;
  SocketFile& operator=(const SocketFile&) = delete;

  // Gives the socket away.
  int Release() { return listener_.Release(); }

 private:
  const std::string path_;
  host::sdk::UniqueFd listener_;
  dev_t device_ = 0;
  ino_t inode_ = 0;
};

// Blocks SIGTERM, SIGINT and SIGHUP in the calling thread and those it starts, and returns a
// signalfd that becomes readable when one arrives. From then on a write to where nobody reads or
// beyond a limit on file sizes fails without a signal.
int CatchSignals();

// Gives the first thread a heap, and the others one together: each with its own, they would hold on
// to several times what they use, and with the first one's they would slow down its quick answers.
// Call it before any thread is started.
void ShareHeaps();

// As many descriptors as the system allows: each open index holds several.
void RaiseDescriptorLimit();

}  // namespace searchd
