#include "tool/failure.h"

#include <json/value.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <iostream>

#include "appindex/elastic_control_internal.h"
#include "appindex/error.h"
#include "appindex/index_queue_internal.h"
#include "appindex/utilities/file_utils.h"
#include "tool/output.h"

namespace tool {
namespace {

using velkor::Error;

// The daemon's codes that stand in doc/protocol.md and have no name in the library.
constexpr int kStorageFailure = 605;
constexpr int kNotPermitted = 606;

constexpr std::size_t kLongestReason = 300;

// What to do about a right that is missing; nothing more for one who has them all.
std::string AsRoot() { return geteuid() == 0 ? "" : "; run appindex as root"; }

// The system's text of why this process may not write to the directory; empty when it may.
std::string WhyNotWritable(const std::string& dir) {
  return access(dir.c_str(), W_OK | X_OK) == 0 ? "" : std::strerror(errno);
}

bool BeginsWith(const std::string& text, const std::string& prefix) {
  return velkor::StringStartWith(text, prefix);
}

// The library's texts may hold a whole request or document.
std::string Readable(std::string reason) {
  std::replace(reason.begin(), reason.end(), '\n', ' ');
  return Shortened(reason, kLongestReason);
}

std::string LockLine(const Error& error) {
  const std::string& reason = error.reason;
  if (BeginsWith(reason, "Exceed max retry")) {
    const std::string path = reason.substr(reason.find('=') + 1);
    return path +
           ": another process has held this lock for about a minute; `appindex status` "
           "names it, try again when it is done";
  }
  if (BeginsWith(reason, "open failed, path=")) {
    const std::size_t begin = reason.find('=') + 1;
    const std::string path = reason.substr(begin, reason.find(", reason=") - begin);
    const std::string cause = WhyNotWritable(velkor::Dirname(path));
    return path + ": cannot open the lock file" +
           (cause.empty() ? "" : ": its directory: " + cause) + AsRoot();
  }
  return "cannot take a lock: " + Readable(reason);
}

std::string GeneralLine(const Error& error) {
  const std::string& reason = error.reason;
  if (BeginsWith(reason, "rename failed")) {
    const std::string cause = WhyNotWritable(velkor::Dirname(velkor::appindex::kQueuePath));
    return std::string(velkor::appindex::kQueuePath) + ": the queue cannot be moved aside" +
           (cause.empty() ? "; the system log has the cause" : ": its directory: " + cause) +
           AsRoot();
  }
  if (BeginsWith(reason, "Failed to open appindex queue")) {
    return std::string(velkor::appindex::kBatchPath) + ": the batch of requests cannot be read" +
           AsRoot();
  }
  if (BeginsWith(reason, "opendir failed, path=")) {
    return reason.substr(reason.find('=') + 1) + ": the directory cannot be read; is it there?" +
           AsRoot();
  }
  if (reason == "Failed to get unique") {
    return "/etc/tovoinfo.conf: the key \"unique\" cannot be read, so filters by model and "
           "platform "
           "cannot be applied";
  }
  if (BeginsWith(reason, "Malformed hb unique: ")) {
    return "/etc/tovoinfo.conf: \"unique\" is not \"marovant_PLATFORM_MODEL\": " + Readable(reason);
  }
  if (reason == "TLIBHbinfoUserAgentGet failed") {
    return "the system's version cannot be read: see /etc/os-release";
  }
  return Readable(reason);
}

std::string DaemonLine(const Error& error) {
  std::string text = Readable(error.reason);
  constexpr char kPrefix[] = "Request failed, msg=";
  if (BeginsWith(text, kPrefix)) text = text.substr(std::strlen(kPrefix));
  switch (static_cast<int>(error.code)) {
    case kStorageFailure:
      return "the search daemon cannot use an index: " + text +
             "; see to the disk, then run `appindex reindex`";
    case Error::kDaemonIndexMissing:
      return "the search daemon has " + text + "; run `appindex reindex`";
    case kNotPermitted:
      return "the search daemon refuses: " + text + AsRoot();
    default:
      return "the search daemon refuses: " + text;
  }
}

std::string ErrorLine(const Error& error) {
  switch (error.code) {
    case Error::kJsonError:
      return "something is not as it must be: " + Readable(error.reason) +
             "; `appindex lint` checks descriptors";
    case Error::kGeneralError:
      return GeneralLine(error);
    case Error::kCredentialsError:
      return "cannot switch the user: " + Readable(error.reason) + AsRoot();
    case Error::kConfigLoadError:
      return "the state file cannot be read or is not JSON: " + Readable(error.reason) +
             "; remove it and run `appindex reindex`" + AsRoot();
    case Error::kConfigSaveError:
      return error.reason + ": the state file cannot be written" + AsRoot();
    case Error::kLockFileError:
      return LockLine(error);
    case Error::kElasticdRequestError:
      return std::string(velkor::appindex::elastic::kElasticdSockPath) +
             ": the search daemon does not answer; start tovoelasticd and try again";
    default:
      return DaemonLine(error);
  }
}

}  // namespace

Report Explain(const std::exception& exception) {
  if (const auto* error = dynamic_cast<const Error*>(&exception)) {
    const bool unreachable = error->code == Error::kElasticdRequestError;
    return {ErrorLine(*error), error->code, unreachable ? kDaemonUnreachable : kFailed};
  }
  if (const auto* failure = dynamic_cast<const Failure*>(&exception)) {
    return {failure->what(), failure->code(), failure->exit_code()};
  }
  return {Readable(exception.what()), 0, kFailed};
}

ExitCode ReportFailure(const Context& context, const std::exception& exception) {
  const Report report = Explain(exception);
  const std::string code = report.code == 0 ? "" : " (code " + std::to_string(report.code) + ")";
  std::cerr << "appindex: " << report.line << code << "\n";
  if (context.json) {
    Json::Value value;
    value["error"]["message"] = report.line;
    if (report.code != 0) value["error"]["code"] = report.code;
    PrintJson(value);
  }
  return report.exit_code;
}

}  // namespace tool
