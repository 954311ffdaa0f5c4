// What the server needs of whoever answers requests.
#pragma once

#include <sys/types.h>

#include <functional>
#include <string>

namespace searchd {

struct Answer {
  std::string text;             // the reply
  std::function<void()> after;  // may be empty; called when the reply is on its way; must not throw
};

// Called by several threads at once. None of the calls throws.
class Handler {
 public:
  virtual ~Handler() = default;

  // A guess from a glance: whether the request is answered sooner than another thread is woken.
  virtual bool IsQuick(const std::string& request) = 0;

  // Answers one request; `client` is the effective user id of who connected.
  virtual Answer Handle(const std::string& request, uid_t client) = 0;

  // The reply to a request that is longer than a frame may be.
  virtual std::string TooLong() = 0;

  // Lets go of the files that it holds, and opens them again when they are needed.
  virtual void Reopen() = 0;

  // Whether there is something to do when no request comes for a moment, and doing a part of it.
  virtual bool HasIdleWork() = 0;
  virtual void DoIdleWork() = 0;
};

}  // namespace searchd
