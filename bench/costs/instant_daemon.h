// A search daemon that costs nothing: a process that answers success as soon as it is asked.
#pragma once

#include <sys/types.h>

#include <string>

namespace bench {

// Listens on the device root's socket, and takes what is written to the system log, as long as the
// object lives. Without a log, each line would cost a connection that is refused.
class InstantDaemon {
 public:
  InstantDaemon();
  ~InstantDaemon();
  InstantDaemon(const InstantDaemon&) = delete;
  InstantDaemon& operator=(const InstantDaemon&) = delete;

 private:
  pid_t process_;
};

// A request as it is sent: its length and its text.
std::string Frame(const std::string& request);

// The least that carries a frame to the daemon and brings back a short reply: socket, connect,
// send, receive, close, each once.
void BareExchange(const std::string& frame);

}  // namespace bench
