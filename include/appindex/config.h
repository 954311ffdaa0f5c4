/// @file
/// The record of the system version that the index was last built for.
#pragma once

#include <string>

#include "appindex/export.h"

namespace velkor::appindex {

/// The state file "/var/packages/Velkor/etc/appindex.cfg", a JSON object with the string
/// "indexed_version". An object of this class is used by one thread at a time.
class TEISEIGATRO_EXPORT Config {
 public:
  /// Loads the record, with the effective user's rights. `indexed_version` stays empty when there
  /// is no file or the file has no such string. Throws Error 504 with "Cannot load json: " and the
  /// path when the file cannot be read (only root may, once it was saved) or is not valid JSON
  /// (logged too), and Error 120 when its JSON is not an object.
  Config();

  /// The version of the system that is running, as the device names it. Asked once and kept, unless
  /// it came back empty. The reference is valid as long as the object. Throws Error 502 with
  /// "TLIBHbinfoUserAgentGet failed", logged too.
  const std::string& GetCurrentVersion();

  /// Writes the record, mode 0600, replacing the file as a whole: after a crash there is the old
  /// record or the new one. Other members that the file had are dropped. Blocks until the content
  /// is on disk.
  ///
  /// Switches the effective user of the process to "root" first. A process that ran as another user
  /// goes on as root afterwards. Throws Error 503 when it may not switch, Error 505 with the path
  /// when the file cannot be written and Error 502 with the path when its mode cannot be set; each
  /// is logged too.
  void Save();

  std::string indexed_version;  ///< empty: never indexed, or not known
  std::string current_version;  ///< filled by GetCurrentVersion
};

}  // namespace velkor::appindex
