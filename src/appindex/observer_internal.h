// Internal seam of the observer: how the library's modules tell it something.
#pragma once

#include <cerrno>

#include "appindex/observer.h"

namespace velkor::appindex {

extern Observer* current_observer;  // null: nobody watches

// Calls `event` of the observer, if there is one. Keeps errno, which the next failure line shows.
template <typename... Parameters, typename... Arguments>
void Tell(void (Observer::*event)(Parameters...), const Arguments&... arguments) {
  if (current_observer == nullptr) return;
  const int kept = errno;
  (current_observer->*event)(arguments...);
  errno = kept;
}

}  // namespace velkor::appindex
