/// @file
/// The library's work: keeping the search index of the installed applications.
///
/// None of these calls may run at the same time as another in one process; between processes,
/// ProcessQueue holds a lock that keeps other callers of ProcessQueue out. All of them block as
/// elastic_control.h describes and throw velkor::Error as each comment says. An Error of the
/// daemon, or 913 when it cannot be reached, may come from any of them. A failure is in the system
/// log before it is thrown, but for codes 120 and 506 and for exceptions of the JSON library. Each
/// call acts with the caller's effective user; only a full rebuild switches to root at its end, to
/// write the state file, and stays root.
#pragma once

#include <string>

#include "appindex/export.h"

/// The search index of the installed applications.
namespace velkor::appindex {

/// Writes the search documents of one application: for each of the 21 languages one document per
/// item of the descriptor `conf_path`, with a pause of 10 ms before each. With `commit`, each
/// language's index is committed after its documents; a caller that adds many applications passes
/// false and commits once.
///
/// Does nothing when the last component of `conf_path` is not "index.conf". A descriptor that
/// cannot be read or parsed is logged and gives no documents; it is not an error. A keyword of the
/// wrong shape is logged and left out, and so, unlogged, are those behind 16 MiB of keywords, more
/// than any daemon takes. When the daemon reports that an index is missing (601), the call becomes
/// a full Reindex, and throws what that throws; only a daemon that goes on losing indexes while
/// they are rebuilt makes it give up and throw 601.
///
/// Throws Error 502 when the descriptor filters by device and the device's unique string is
/// unreadable, Error 120 when an item's id is not a string, and lets the JSON library's own
/// exception through when a title, a description or a keyword cannot be made into text. What was
/// written before stays written.
TEISEIGATRO_EXPORT void Add(const std::string& conf_path, bool commit);

/// Deletes, in each language, the documents whose items the descriptor `conf_path` lists now: it
/// must still be readable, and items that the device filters exclude are not deleted. A descriptor
/// that cannot be read is logged and deletes nothing. `commit` as for Add.
///
/// Does nothing when the last component of `conf_path` is not "index.conf". Throws Error 502 as Add
/// does and any code of the daemon, 601 too, and lets the JSON library's own exception through when
/// an item's id cannot be made into text. The languages before the failure stay deleted, the rest
/// untouched.
TEISEIGATRO_EXPORT void Del(const std::string& conf_path, bool commit);

/// Rebuilds the whole index: finds one descriptor per application, drops and creates every
/// language's index, adds every application, commits, and records the system version in the state
/// file.
///
/// An application is a directory in "/var/packages/" or "/usr/tovo/tovoman/webman/modules/", or a
/// link to one, unless its name is "Docuvault". Its descriptor is the first "index.conf" met in it
/// or up to five levels below, in the order in which the file system lists them; a link on the way
/// counts when its content, taken from the current directory, leads to a directory.
///
/// Throws Error 502, "opendir failed, path=" and the path, when a directory cannot be opened, and
/// what Config throws when the state file cannot be read; nothing has been deleted then. A failure
/// later leaves the indexes partly filled and the recorded version as it was: what Add and Config
/// throw, and any code of the daemon. Takes at least 0.21 s per item.
TEISEIGATRO_EXPORT void Reindex();

/// Carries out the work that other programs have queued in
/// "/var/packages/Velkor/etc/appindex.queue": moves the queue aside, folds it to one operation per
/// descriptor (the last one holds), carries them out in the byte order of their paths, and goes on
/// until the queue stays empty. Returns at once, with the work left queued, while the daemon's
/// socket file is missing.
///
/// A request is a line {"op":N,"path":"..."}: 1 calls Add, 2 calls Del, both with commit, 3 calls
/// Reindex and needs no path; other numbers do nothing. A line that is not JSON is skipped, one
/// without a whole number "op" is logged and skipped. Whoever writes requests appends whole lines,
/// each ending in a line feed, while holding a lock on the queue file itself, as LockFile or
/// flock(2) takes it: open the file, lock it, make sure that it is still the file at that path,
/// else begin again; then write.
///
/// At most one process at a time works the queue; another waits for it up to about 58 s and then
/// throws Error 506, and so does a call while a writer holds the queue's lock for as long. Throws
/// Error 502 when the queue cannot be moved or read ("rename failed, reason=" or "Failed to open
/// appindex queue, reason=": the cause is in the log line, the thrown text always ends in that of
/// error 0), and what Add, Del and Reindex throw. Requests are carried out at least once: after a
/// failure or a crash the next call starts the unfinished batch again from its beginning.
TEISEIGATRO_EXPORT void ProcessQueue();

}  // namespace velkor::appindex
