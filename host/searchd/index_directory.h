// The directory of an index: where it may lie, what it may hold, and what is durable in it.
//
// It holds a marker file, which says that the files are the daemon's, and a Xapian database as soon
// as there is one. None of the calls follows a symbolic link below "/var/packages/".
#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <vector>

namespace searchd {

// The path as it is kept: absolute, below "/var/packages/", without a trailing "/". Throws
// RequestError: kRejected for a path that is not plain (empty, ".", ".." or over-long components),
// kNotPermitted for one elsewhere.
std::string CheckedIndexPath(const std::string& path);

// Makes the empty directory of a new index with missing parents, mode 0700. What an earlier index
// left there is cleared: it is known by its marker, or the caller has `known` the index. Anything
// else that is found there is rejected. Until it is done, another file says that what is there is
// to be cleared.
void PrepareIndexDirectory(const std::string& path, bool known);

// Does so for an index that is known, where a process has died in the middle of it. Throws
// RequestError.
void FinishEmptying(const std::string& path);

// Removes an index's files and its directory. A directory that is gone already is no error.
void RemoveIndexDirectory(const std::string& path);

// Whether there is a database to open; false for an index into which nothing was ever committed.
// Throws RequestError(kStorage) when the directory is not that of an index.
bool HoldsDatabase(const std::string& path);

// The file of a database that says which state of its tables holds.
constexpr const char* kVersionFile = "iamglass";

// The files of the database's tables that are there, whatever they hold.
std::vector<std::string> TableFiles(const std::string& path);

// What tells a state of the index's files from every other: it changes when one of them is written,
// replaced or removed, by whomever. Empty when the directory cannot be reached.
using FilesState = std::vector<std::array<std::int64_t, 5>>;
FilesState StateOfFiles(const std::string& path);

// Makes the directory's entries durable, and with `parents` the directory itself.
void SyncIndexDirectory(const std::string& path, bool parents);

}  // namespace searchd
