// The daemon's connection to the system log. Lines are written with syslog(3), by any thread.
#pragma once

namespace searchd {

// From now on; on standard error as well if asked.
void OpenSystemLog(bool also_standard_error);

// Connects anew, as the log may have been restarted or moved.
void ReopenSystemLog();

}  // namespace searchd
