#include "tool/failure.h"

#include <fcntl.h>
#include <json/value.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <iostream>
#include <iterator>
#include <limits>

#include "appindex/elastic_control_internal.h"
#include "appindex/error.h"
#include "appindex/index_queue_internal.h"
#include "appindex/utilities/file_utils.h"
#include "common/dir_reader.h"
#include "common/file_io.h"
#include "tool/lock_path.h"
#include "tool/output.h"
#include "tool/refusal.h"

namespace tool {
namespace {

using velkor::Error;
using velkor::appindex::kBatchPath;
using velkor::appindex::kQueuePath;
using velkor::appindex::elastic::kElasticdSockPath;

// The daemon's codes that stand in doc/protocol.md and have no name in the library.
constexpr int kUnknownCommand = 604;
constexpr int kStorageFailure = 605;
constexpr int kNotPermitted = 606;
constexpr int kNotReady[] = {607, 608, 610};

constexpr std::size_t kLongestReason = 300;

constexpr char kTovoInfo[] = "/etc/tovoinfo.conf";
constexpr char kAsRoot[] = "run appindex as root";
constexpr char kRebuild[] = "run `appindex reindex`";
constexpr char kTryLater[] = "try again later";

// What a failure's line is made of.
struct Said {
  std::string cause;  // begins with the file, where one is to blame
  std::string advice;
};

bool IsRoot() { return geteuid() == 0; }

std::string AsRootOr(const char* advice) { return IsRoot() ? advice : kAsRoot; }

bool BeginsWith(const std::string& text, const std::string& prefix) {
  return velkor::StringStartWith(text, prefix);
}

std::string Behind(const std::string& text, char mark) { return text.substr(text.find(mark) + 1); }

// The library's texts may hold a whole request or document.
std::string Readable(const std::string& reason) {
  return Shortened(OneLine(reason), kLongestReason);
}

// What the library says of a failure comes without the system's number, which it has cleared by
// then. These find it again, as far as it is still so; 0 when it is not.

int ErrorOfWriting(const std::string& dir) {
  return faccessat(AT_FDCWD, dir.c_str(), W_OK | X_OK, AT_EACCESS) == 0 ? 0 : errno;
}

int ErrorOfReading(const std::string& path) {
  std::string text;
  return velkor::ReadRegularFile(path, std::numeric_limits<std::size_t>::max(), text) ? 0 : errno;
}

int ErrorOfListing(const std::string& dir) { return velkor::DirReader(dir).IsOpen() ? 0 : errno; }

// "WHAT: the system's text", and what to do about it.
Said With(const std::string& what, int error, const std::string& otherwise) {
  if (error == 0) return {what, otherwise};
  return {what + ": " + WhyNotRead(error), AdviceOn(error)};
}

Said LockLine(const std::string& reason) {
  if (BeginsWith(reason, "Exceed max retry")) {
    return {Behind(reason, '=') + ": another process has held this lock for about half a minute",
            "`appindex status` names it, try again when it is done"};
  }
  if (BeginsWith(reason, "open failed, path=")) {
    const std::string path = Behind(reason.substr(0, reason.find(", reason=")), '=');
    const std::string what = path + ": the lock file cannot be opened";
    constexpr Protection kWhateverThereIs = {2, 2};  // that would make it fail, and it has
    const LockPath lock = LookAtLock(path, kWhateverThereIs);
    if (lock.state == LockPath::kProtected) return {what + ": " + WhyNotOpened(lock), "remove it"};
    return With(what, lock.error, kTryLater);
  }
  return {"a lock cannot be taken: " + Readable(reason), kTryLater};
}

Said GeneralLine(const std::string& reason) {
  if (BeginsWith(reason, "rename failed")) {
    return With(std::string(kQueuePath) + ": the queue cannot be moved aside",
                ErrorOfWriting(velkor::Dirname(kQueuePath)), "the system log has the cause");
  }
  if (BeginsWith(reason, "Failed to open appindex queue")) {
    return With(std::string(kBatchPath) + ": the batch of requests cannot be read",
                ErrorOfReading(kBatchPath), kTryLater);
  }
  if (BeginsWith(reason, "opendir failed, path=")) {
    const std::string dir = Behind(reason, '=');
    return With(dir + ": the directory cannot be read", ErrorOfListing(dir), kTryLater);
  }
  if (reason == "Failed to get unique") {
    return {std::string(kTovoInfo) +
                ": the key \"unique\" cannot be read, so filters by model and platform cannot be "
                "applied",
            "write it there as unique=\"marovant_PLATFORM_MODEL\""};
  }
  if (BeginsWith(reason, "Malformed hb unique: ")) {
    return {std::string(kTovoInfo) + ": \"unique\" is not \"marovant_PLATFORM_MODEL\": " +
                Readable(Behind(reason, ':').substr(1)),
            "correct it"};
  }
  if (reason == "TLIBHbinfoUserAgentGet failed") {
    return {"/etc/os-release: the system's version cannot be read",
            "let it have ID and VERSION_ID"};
  }
  if (BeginsWith(reason, "/")) {
    return {Readable(reason) + ": the mode of the file cannot be set",
            AsRootOr("see to its file system")};
  }
  return {Readable(reason), "the system log has the failure"};
}

Said StateFileLine(const std::string& path) {
  const int error = ErrorOfReading(path);
  if (error != 0) return With(path + ": the state file cannot be read", error, "");
  return {path + ": the state file is not JSON",
          std::string("remove it and ") + kRebuild + (IsRoot() ? "" : ", both as root")};
}

std::string DaemonAdvice(int code) {
  switch (code) {
    case Error::kDaemonIndexMissing:
      return kRebuild;
    case kRejected:
      return "if it is about a descriptor's texts, `appindex lint` shows where";
    case kUnknownCommand:
      return "install the daemon that belongs to this appindex";
    case kStorageFailure:
      return std::string("see to the disk, then ") + kRebuild;
    case kNotPermitted:
      return AsRootOr("see what its paths lead through: no link may be among them");
    case Error::kDaemonBusy:
      return std::string(kTryLater) + ", nothing is lost";
    default:
      return "its lines in the system log may tell more";
  }
}

Said DaemonLine(int code, const std::string& reason) {
  constexpr char kPrefix[] = "Request failed, msg=";
  const std::string text =
      Readable(BeginsWith(reason, kPrefix) ? reason.substr(std::strlen(kPrefix)) : reason);
  const std::string daemon = std::string(kElasticdSockPath) + ": the search daemon ";
  if (IsNotReady(code)) {
    return {daemon + "is starting: " + text, "try again soon"};
  }
  const char* does = code == Error::kDaemonIndexMissing ? "has "
                     : code == Error::kDaemonBusy       ? "is busy: "
                     : code == kStorageFailure          ? "cannot use an index: "
                                                        : "refuses: ";
  return {daemon + does + text, DaemonAdvice(code)};
}

Said LineOf(const Error& error) {
  switch (error.code) {
    case Error::kJsonError:
      return {"something is not as it must be: " + Readable(error.reason),
              "`appindex lint` checks descriptors"};
    case Error::kGeneralError:
      return GeneralLine(error.reason);
    case Error::kCredentialsError:
      return {"the user cannot be switched: " + Readable(error.reason),
              AsRootOr("see to the user database")};
    case Error::kConfigLoadError:
      return StateFileLine(
          error.reason.substr(std::min(error.reason.find('/'), error.reason.size())));
    case Error::kConfigSaveError:
      return With(error.reason + ": the state file cannot be written",
                  ErrorOfWriting(velkor::Dirname(error.reason)), "see to the disk");
    case Error::kLockFileError:
      return LockLine(error.reason);
    case Error::kChownError:
      return {"the user Velkor, whom the package's files belong to, cannot be looked up",
              "add it to the user database"};
    case Error::kElasticdRequestError:
      return {std::string(kElasticdSockPath) + ": the search daemon does not answer",
              "start tovoelasticd and try again"};
    default:
      return DaemonLine(error.code, error.reason);
  }
}

Report ReportOf(const Said& said, int code, ExitCode exit_code) {
  return {said.cause + "; " + said.advice, code, exit_code, said.cause};
}

}  // namespace

std::string AdviceOn(int error) {
  switch (error) {
    case EACCES:
    case EPERM:
      return AsRootOr("see what forbids it even to root");
    case ENOENT:
    case ENOTDIR:
      return "see whether the path is right";
    case EISDIR:
    case EINVAL:
    case ELOOP:
    case ENXIO:
      return "put a regular file in its place";
    case EFBIG:
      return "make it smaller";
    case EDQUOT:
    case ENOSPC:
      return "make room on its file system";
    case EROFS:
      return "let its file system be written to";
    case EIO:
      return "see to the disk";
    default:
      return kTryLater;
  }
}

bool IsNotReady(int code) {
  return std::count(std::begin(kNotReady), std::end(kNotReady), code) != 0;
}

std::string WhyNotRead(int error) {
  if (error == EINVAL) return "not a regular file";
  if (error == EFBIG) return "longer than 16 MiB";
  return std::strerror(error);
}

Report Explain(const std::exception& exception) {
  if (const auto* error = dynamic_cast<const Error*>(&exception)) {
    const bool unreachable = error->code == Error::kElasticdRequestError;
    return ReportOf(LineOf(*error), error->code, unreachable ? kDaemonUnreachable : kFailed);
  }
  if (const auto* failure = dynamic_cast<const Failure*>(&exception)) {
    return {failure->what(), failure->code(), failure->exit_code(), failure->cause()};
  }
  if (dynamic_cast<const Json::Exception*>(&exception) != nullptr) {
    return ReportOf({"a value stands where a text belongs: " + Readable(exception.what()),
                     "`appindex lint` shows where"},
                    0, kFailed);
  }
  const std::string line = Readable(exception.what());
  return {line, 0, kFailed, line};
}

ExitCode ReportFailure(const Context& context, const std::exception& exception) {
  const Report report = Explain(exception);
  const std::string code = report.code == 0 ? "" : " (code " + std::to_string(report.code) + ")";
  std::cerr << "appindex: " << OneLine(report.line) << code << "\n";
  if (context.json) {
    Json::Value value;
    value["error"]["message"] = report.line;
    if (report.code != 0) value["error"]["code"] = report.code;
    PrintJson(value);
  }
  return report.exit_code;
}

}  // namespace tool
