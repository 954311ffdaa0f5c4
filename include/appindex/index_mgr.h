// The library's work: keeping the search index of the installed applications.
//
// None of these calls may run at the same time as another in one process; between processes,
// ProcessQueue holds a lock that keeps other callers of ProcessQueue out. All of them block as
// elastic_control.h describes, and throw velkor::Error as each comment says; a failure is in the
// system log before it is thrown. An Error of the daemon, or 913 when it cannot be reached, may
// come from any of them. Each acts with the caller's effective user; only a full rebuild switches
// to root at its end, to write the state file, and stays root.
#pragma once

#include <string>

#include "appindex/export.h"

namespace velkor::appindex {

// Writes the search documents of one application: for each of the 21 languages one document per
// item of the descriptor `conf_path`, with a pause of 10 ms before each. With `commit`, each
// language's index is committed after its documents; a caller that adds many applications passes
// false and commits once.
//
// Does nothing when the last component of `conf_path` is not "index.conf". A descriptor that cannot
// be read or parsed is logged and gives no documents; it is not an error. A keyword of the wrong
// shape is logged and left out. When the daemon reports that an index is missing (601), the call
// becomes a full Reindex.
//
// Throws Error 502 when the descriptor filters by device and the device's unique string is
// unreadable, Error 120 when an item's id is not a string, and lets the JSON library's own
// exception through when a title, a description or a keyword cannot be made into text. What was
// written before stays written.
TEISEIGATRO_EXPORT void Add(const std::string& conf_path, bool commit);

// Deletes, in each language, the documents whose items the descriptor `conf_path` lists now: it
// must still be readable, and items that the device filters exclude are not deleted. `commit` as
// for Add.
//
// Does nothing when the last component of `conf_path` is not "index.conf". Throws as Add does, but
// recovers from nothing: the languages before the failure stay deleted, the rest untouched.
TEISEIGATRO_EXPORT void Del(const std::string& conf_path, bool commit);

// Rebuilds the whole index: finds one descriptor per application below "/var/packages/" and
// "/usr/tovo/tovoman/webman/modules/", drops and creates every language's index, adds every
// application, commits, and records the system version in the state file.
//
// Throws Error 502, "opendir failed, path=" and the path, when a directory cannot be read; nothing
// has been deleted then. A failure later leaves the indexes partly filled and the recorded version
// as it was. Also throws what Add and Config throw. Takes at least 0.21 s per item.
TEISEIGATRO_EXPORT void Reindex();

// Carries out the work that other programs have queued in
// "/var/packages/Velkor/etc/appindex.queue": moves the queue aside, folds it to one operation per
// descriptor (the last one holds), carries them out in the byte order of their paths, and goes on
// until the queue stays empty. Returns at once, with the work left queued, while the daemon's
// socket file is missing.
//
// At most one process at a time works the queue; another waits for it up to about 58 s and then
// throws Error 506. Throws Error 502 when the queue cannot be moved or read, and what Add, Del and
// Reindex throw. Requests are carried out at least once: after a failure or a crash the next call
// starts the unfinished batch again from its beginning.
TEISEIGATRO_EXPORT void ProcessQueue();

}  // namespace velkor::appindex
