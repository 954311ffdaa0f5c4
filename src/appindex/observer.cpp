#include "appindex/observer.h"

#include "appindex/observer_internal.h"
#include "common/lock_pause.h"

namespace velkor::appindex {

Observer* current_observer = nullptr;

Observer::~Observer() = default;

void SetObserver(Observer* observer) {
  current_observer = observer;
  if (observer == nullptr) {
    on_lock_pause = nullptr;
  } else {
    on_lock_pause = [](std::chrono::milliseconds pause) {
      Tell(&Observer::OnWait, Observer::Wait::kLock, pause);
    };
  }
}

}  // namespace velkor::appindex
