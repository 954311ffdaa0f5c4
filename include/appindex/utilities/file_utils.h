/// @file
/// Testing, naming, moving and owning files. Paths are byte strings that are used as they stand:
/// only RealPath resolves ".", ".." and repeated "/". All functions may be called from any thread
/// and act with the effective user of the process. Only ChownVelkor throws.
#pragma once

#include <dirent.h>

#include <string>

#include "appindex/export.h"

struct TOVOCOPYARGS;  // the device's copy arguments

namespace velkor {

/// True for a regular file. A symbolic link is not one, whatever it leads to.
TEISEIGATRO_EXPORT bool IsFileExist(const std::string& path);

/// True for a directory. A symbolic link counts only with `follow_link`: then the answer is that
/// for the link's content, used exactly as read, so that a relative one is taken from the current
/// directory of the process and not from the link's. A `path` that ends in "/" makes the system
/// follow the link by itself, in either case. A chain of more than 4096 links is no directory.
TEISEIGATRO_EXPORT bool IsDirExist(const std::string& path, bool follow_link);

/// True when a directory reader gave the entry the type "directory". An entry of unknown type is
/// not looked up: it gives false.
TEISEIGATRO_EXPORT bool IsDirentDir(const dirent& entry, const std::string& path);

/// True when the device's access control grants the calling user at least one bit of `mask` (read
/// 4, write 2, execute 1) on `path`.
TEISEIGATRO_EXPORT bool CheckACLPerm(const std::string& path, int mask);

/// True when the directory is a mount point; false when it is not and when that cannot be told.
TEISEIGATRO_EXPORT bool IsMountPoint(const std::string& path);

/// True when `str` begins with `prefix`; an empty prefix begins every text.
TEISEIGATRO_EXPORT bool StringStartWith(const std::string& str, const std::string& prefix);

/// What follows the last "/": all of a path without one, nothing of one that ends in it.
TEISEIGATRO_EXPORT std::string Basename(const std::string& path);

/// What precedes the last "/": all of a path without one ("name" gives "name", not "."), nothing
/// for
/// "/name", "/a/b" for "/a/b/".
TEISEIGATRO_EXPORT std::string Dirname(const std::string& path);

/// What follows the last "." of the last component, empty when there is none: ".profile" gives
/// "profile", "name." gives "". With `to_lower`, lower-cased byte by byte in the process's locale.
TEISEIGATRO_EXPORT std::string GetFileExtension(const std::string& path, bool to_lower);

/// The absolute path without links, "." and ".."; empty on any failure, such as a missing file.
TEISEIGATRO_EXPORT std::string RealPath(const std::string& path);

/// Removes a file. True when it is gone, also when it was not there; false, with errno set,
/// otherwise.
TEISEIGATRO_EXPORT bool Unlink(const std::string& path);

/// Copies or moves a file as the device's copy arguments say (its own headers define them). Blocks
/// until done. True when done; false with errno set on failure.
TEISEIGATRO_EXPORT bool MVFileImpl(const std::string& src, const std::string& dst,
                                   TOVOCOPYARGS* args);

/// Moves a file, also to another file system. Blocks until done. True when done; false with errno
/// set on failure.
TEISEIGATRO_EXPORT bool MVFile(const std::string& src, const std::string& dst);

/// Copies a file. Blocks until done. True when done; false with errno set on failure.
TEISEIGATRO_EXPORT bool CPFile(const std::string& src, const std::string& dst);

/// Gives the file (where `path` is a link, what it leads to) to the package's own user "Velkor" and
/// its group. Returns whether that worked, with errno set when not. Throws Error 801 without a
/// reason when there is no such user. Holds the SDK mutex while it asks for the user.
TEISEIGATRO_EXPORT bool ChownVelkor(const std::string& path);

}  // namespace velkor
