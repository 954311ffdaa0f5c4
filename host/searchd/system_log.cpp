#include "host/searchd/system_log.h"

#include <syslog.h>

namespace searchd {
namespace {

int g_options = LOG_PID;

void Open() { openlog("tovoelasticd", g_options, LOG_DAEMON); }

}  // namespace

void OpenSystemLog(bool also_standard_error) {
  if (also_standard_error) g_options |= LOG_PERROR;
  Open();
}

void ReopenSystemLog() {
  closelog();
  Open();
}

}  // namespace searchd
