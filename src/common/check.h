// The one way of reporting a failed step: a line in the system log, then an Error.
//
// Every line is written at priority LOG_ERR, without openlog. A failure line ends in " [err:
// TEXT]", the text of errno, when errno is set, and errno is 0 after it. A stale errno of an
// earlier harmless call therefore shows in the next failure line; that is the convention.
//
// None of these functions blocks on more than syslog(3) or takes a lock.
#pragma once

#include <cerrno>
#include <string>

#include "appindex/error.h"

namespace velkor {

// The place that a line names. The number is fixed: operators match on it, so it does not follow
// the source text.
struct CheckSite {
  const char* module;
  int line;
  const char* function;
};

// While one exists, the thread that made it writes no lines; errno is afterwards what it was
// before. For looking ahead at what is read, and reported, again later.
class MutedLog {
 public:
  MutedLog();
  ~MutedLog();
  MutedLog(const MutedLog&) = delete;
  MutedLog& operator=(const MutedLog&) = delete;

 private:
  const int kept_errno_;
};

// "MODULE:LINE (PID, EUID) (FUNCTION) TEXT"
void LogFailureText(const CheckSite& site, const std::string& text);

// "MODULE:LINE (PID, EUID) (FUNCTION) Failed [CONDITION]"; goes on. `condition` is the text of the
// condition as it is printed.
void LogFailure(bool ok, const CheckSite& site, const char* condition);

// "MODULE:LINE TEXT". Leaves errno as it was.
void LogNotice(const char* module, int line, const std::string& text);

// "MODULE:LINE (PID, EUID) (FUNCTION) Failed [CONDITION], reason: REASON"
void LogFailedCheck(const CheckSite& site, const char* condition, const Error& error);

// Logs the failed check and throws Error(code, make_reason()).
//
// The reason is made twice, for the line and, after the line has cleared errno, for the error: a
// reason that holds the text of errno shows the real one in the log and that of error 0 in the
// error. Callers and operators rely on both.
template <typename MakeReason>
void CheckOrThrow(bool ok, const CheckSite& site, const char* condition, Error::ErrorCode code,
                  const MakeReason& make_reason) {
  if (ok) return;
  {
    const int failed_with = errno;
    const Error error(code, make_reason());
    errno = failed_with;
    LogFailedCheck(site, condition, error);
  }
  throw Error(code, make_reason());
}

// The same without a reason.
void CheckOrThrow(bool ok, const CheckSite& site, const char* condition, Error::ErrorCode code);

}  // namespace velkor
