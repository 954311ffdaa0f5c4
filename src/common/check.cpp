#include "common/check.h"

#include <syslog.h>
#include <unistd.h>

#include <cstring>

namespace velkor {
namespace {

thread_local int muted = 0;

void WriteLine(const CheckSite& site, int failed_with, const std::string& text) {
  if (muted > 0) return;
  const std::string suffix =
      failed_with == 0 ? "" : " [err: " + std::string(std::strerror(failed_with)) + "]";
  syslog(LOG_ERR, "%s:%d (%d, %u) (%s) %s%s", site.module, site.line, getpid(), geteuid(),
         site.function, text.c_str(), suffix.c_str());
  errno = 0;  // also what syslog itself left, such as ENOENT where no log daemon listens
}

std::string FailedText(const char* condition) { return "Failed [" + std::string(condition) + "]"; }

}  // namespace

MutedLog::MutedLog() : kept_errno_(errno) { ++muted; }

MutedLog::~MutedLog() {
  --muted;
  errno = kept_errno_;
}

void LogFailureText(const CheckSite& site, const std::string& text) {
  WriteLine(site, errno, text);
}

void LogFailure(bool ok, const CheckSite& site, const char* condition) {
  if (ok) return;
  const int failed_with = errno;
  WriteLine(site, failed_with, FailedText(condition));
}

void LogNotice(const char* module, int line, const std::string& text) {
  if (muted > 0) return;
  const int kept = errno;
  syslog(LOG_ERR, "%s:%d %s", module, line, text.c_str());
  errno = kept;
}

void LogFailedCheck(const CheckSite& site, const char* condition, const Error& error) {
  const int failed_with = errno;
  WriteLine(site, failed_with, FailedText(condition) + ", reason: " + error.what());
}

void CheckOrThrow(bool ok, const CheckSite& site, const char* condition, Error::ErrorCode code) {
  if (ok) return;
  LogFailedCheck(site, condition, Error(code));
  throw Error(code);
}

}  // namespace velkor
