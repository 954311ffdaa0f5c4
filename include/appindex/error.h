/// @file
/// The one exception type of the library.
#pragma once

#include <cstdint>
#include <stdexcept>
#include <string>

#include "appindex/export.h"

/// The library: its error, and the utilities that the other parts are made with.
namespace velkor {

/// Every failure that the library reports is thrown as an Error: a number that tells what failed
/// and a text that tells why. The search daemon's numbers arrive in the same field as the library's
/// own, taken as they are.
class TEISEIGATRO_EXPORT Error : public std::runtime_error {
 public:
  /// Any value of 32 bits may be stored, also one without a name here.
  enum ErrorCode : std::int32_t {
    kJsonError = 120,         ///< a JSON member is missing or has the wrong type
    kGeneralError = 502,      ///< a general operation failed, the reason says which
    kCredentialsError = 503,  ///< a user is unknown or the effective user cannot be switched
    kConfigLoadError = 504,   ///< the state file exists but is not valid JSON
    kConfigSaveError = 505,   ///< the state file cannot be written
    kLockFileError = 506,     ///< a lock file cannot be opened, or is held elsewhere for too long
    kChownError = 801,        ///< the package's own user is unknown
    kElasticdRequestError = 913,  ///< the exchange with the search daemon failed
    kTextsRootError = 1300,       ///< no directory of texts was found; never leaves the library

    // Reported by the search daemon.
    kDaemonIndexMissing = 601,  ///< there is no index with the id asked for
    kDaemonBusy = 1400,         ///< retried by the library, so it never leaves it
  };

  /// An error without a reason.
  explicit Error(ErrorCode code);
  /// The same for a number that may have no name.
  explicit Error(int code);
  /// An error and why it happened.
  Error(ErrorCode code, const std::string& reason);
  /// The same for a number that may have no name.
  Error(int code, const std::string& reason);

  Error(const Error&) = default;             ///< as usual
  Error& operator=(const Error&) = default;  ///< as usual
  ~Error() override;

  /// The reason alone, empty when none was given; valid as long as the object. The whole message,
  /// "Velkor error, code=N" with ", reason=[...]" behind it where there is a reason, is what the
  /// base class gives: error.std::runtime_error::what().
  const char* what() const noexcept override;

  ErrorCode code;      ///< what failed; any number, see ErrorCode
  std::string reason;  ///< why; empty when none was given
};

}  // namespace velkor
