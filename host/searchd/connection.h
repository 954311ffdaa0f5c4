// One client: a request arrives, a reply leaves, and it never makes a thread wait.
#pragma once

#include <sys/types.h>

#include <chrono>
#include <cstddef>
#include <string>

#include "host/sdk/unique_fd.h"

namespace searchd {

class Connection {
 public:
  using TimePoint = std::chrono::steady_clock::time_point;

  enum class State {
    kReceiving,  // a part of the request is missing
    kReceived,   // the request is there
    kTooLong,    // the announced request is longer than a frame may be
    kSending,    // a part of the reply could not be sent yet
    kDone,       // the reply is sent, or the client is gone
  };

  // Takes the non-blocking socket `fd`. The request must be there by `deadline`.
  Connection(int fd, TimePoint deadline);

  int Fd() const { return fd_.Get(); }
  uid_t Client() const { return client_; }
  TimePoint Deadline() const { return deadline_; }
  State GetState() const { return state_; }

  // Takes in what has arrived, or sends what can be sent.
  void Continue();

  // The request, once; valid in kReceived.
  std::string TakeRequest();

  // Begins to send the reply, which must be gone by `deadline`.
  void Reply(const std::string& text, TimePoint deadline);

 private:
  void Receive();
  void Send();
  void CheckFrame();

  const host::sdk::UniqueFd fd_;
  uid_t client_;
  TimePoint deadline_;
  State state_ = State::kReceiving;
  std::string bytes_;  // of the frame that arrives or leaves, its header included
  std::size_t sent_ = 0;
};

}  // namespace searchd
