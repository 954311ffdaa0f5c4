// The service manager that may have started the daemon: the socket that it hands over, and what it
// is told. Without one that asked for it, all of this does nothing.
#pragma once

namespace searchd {

// Takes the listening socket that the service manager has opened for the daemon; -1 when there is
// none. It is found once, and only in the process that was started. Throws std::runtime_error when
// something else was handed over than one Unix stream socket that listens.
int TakeActivatedSocket();

// Requests are accepted; what was asked for with NotifyReloading is done.
void NotifyReady();
void NotifyReloading();
void NotifyStopping();

}  // namespace searchd
