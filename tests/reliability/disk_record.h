// What a process did to files, one record an act: written by the recorder that is loaded into the
// process, read by the model of the disk.
#pragma once

#include <cstdint>

namespace test {

// The descriptor to which a process with the recorder writes its records.
constexpr int kDiskRecordFd = 100;

// The variable of its environment that says which device's files it records.
constexpr char kRecordedDisk[] = "TEISEIGATRO_RECORDED_DISK";

// Files and directories are named by their inode numbers, entries by the directory's and their
// name.
struct DiskRecord {
  enum Kind : std::uint32_t {
    kMakeFile,       // entry `name` of `directory`, with the mode `value`
    kMakeDirectory,  // the same
    kWrite,          // `text` at offset `value`
    kTruncate,       // to the size `value`
    kMode,           // the mode `value`
    kSync,           // of the file, or of the entries of the directory
    kRename,         // entry `name` of `directory` becomes entry `text` there
    kRemove,         // entry `name` of `directory`
    kNotModelled     // something that the model does not know; `text` says what
  };
  Kind kind;
  std::uint32_t name_size;  // of the name behind the record
  std::uint64_t text_size;  // of the text behind the name
  std::uint64_t file;
  std::uint64_t directory;
  std::uint64_t value;
};

}  // namespace test
