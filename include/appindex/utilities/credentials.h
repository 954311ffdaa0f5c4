/// @file
/// Switching the effective user of the process.
#pragma once

#include <cstdint>
#include <string>

#include "appindex/export.h"
#include "appindex/utilities/lock_mutex.h"

/// What guards the calls of the device's own libraries.
namespace velkor::sdk {

/// The one mutex around every call into the device's user database and credential functions. Made
/// on first use, from any thread, and destroyed when the process exits. Not recursive: no guard
/// below may be made, used or destroyed by a thread that holds it.
TEISEIGATRO_EXPORT Mutex& SDKMutex();

/// A scope in which the process may act as another user. The effective user belongs to the whole
/// process: other threads act as that user too. Every failure is Error 503, logged too.
class TEISEIGATRO_EXPORT SDKCredentials {
 public:
  /// Remembers the current effective user, to whom the destructor switches back; does not switch.
  /// Throws Error 503 when the user database does not know the user, with the text
  /// "TOVOUserGetByUID failed, err=" less as many of its first characters as the device's error
  /// number says.
  SDKCredentials();

  /// Switches to user `name`, as AsUser does. The destructor of this form switches to `name` again,
  /// not to the caller: SDKCredentials("root") leaves the process running as root.
  explicit SDKCredentials(const std::string& name);

  /// Switches back when the effective user or group is not the one met at construction. Throws
  /// Error 503 without a reason when that fails; while another exception unwinds the stack, that
  /// ends the process.
  ~SDKCredentials() noexcept(false);

  SDKCredentials(const SDKCredentials&) = delete;             ///< not copied
  SDKCredentials& operator=(const SDKCredentials&) = delete;  ///< not copied

  /// Switches the effective user, its group and its groups to `target_username`, or to "root" when
  /// that user is an administrator. Throws Error 503 without a reason, with the effective user as
  /// it was, when that fails.
  void AsUser(const std::string& target_username);

 private:
  std::uint32_t euid_;
  std::uint32_t egid_;
  std::string username_;  // whom the destructor switches to
};

}  // namespace velkor::sdk
