// For a build that knows no service manager.
#include "host/searchd/service_manager.h"

namespace searchd {

int TakeActivatedSocket() { return -1; }

void NotifyReady() {}
void NotifyReloading() {}
void NotifyStopping() {}

}  // namespace searchd
