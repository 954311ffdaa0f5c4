#include "host/searchd/index_directory.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <memory>
#include <string_view>
#include <vector>

#include "host/sdk/unique_fd.h"
#include "host/searchd/request_error.h"

namespace searchd {
namespace {

using host::sdk::UniqueFd;

constexpr std::string_view kPackages = "/var/packages/";
constexpr std::size_t kMaxPathBytes = 1024;
constexpr std::size_t kMaxComponentBytes = 255;

constexpr const char* kMarker = "tovoelasticd.index";
// As long as it is there, the files beside it are of an index that was deleted, or half of them.
constexpr const char* kEmptied = "tovoelasticd.emptied";
constexpr std::array<const char*, 6> kTables = {"docdata.glass",  "postlist.glass",
                                                "position.glass", "spelling.glass",
                                                "synonym.glass",  "termlist.glass"};
constexpr std::array<const char*, 3> kOtherFiles = {kVersionFile, "flintlock", "v.tmp"};

[[noreturn]] void Fail(const std::string& path) {
  throw RequestError(Code::kStorage, WithErrno(path, errno));
}

void Sync(int dir, const std::string& path) {
  if (fsync(dir) != 0) Fail(path);
}

std::vector<std::string> Components(std::string_view path) {
  std::vector<std::string> components;
  for (;;) {
    const std::size_t slash = path.find('/');
    components.emplace_back(path.substr(0, slash));
    if (slash == std::string_view::npos) return components;
    path.remove_prefix(slash + 1);
  }
}

int OpenDirectoryAt(int parent, const std::string& name) {
  return openat(parent, name.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
}

// Opens "/var/packages" or a directory below it component by component, and makes missing ones if
// asked. Returns -1 when one is missing.
int OpenDirectory(std::string_view path, bool make) {
  const std::string whole(path);
  int dir = open(std::string(kPackages).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  if (dir < 0) Fail(std::string(kPackages));
  if (path.size() <= kPackages.size()) return dir;
  for (const std::string& name : Components(path.substr(kPackages.size()))) {
    const UniqueFd parent(dir);
    dir = OpenDirectoryAt(parent.Get(), name);
    if (dir < 0 && errno == ENOENT) {
      if (!make) return -1;
      if (mkdirat(parent.Get(), name.c_str(), S_IRWXU) != 0) Fail(whole);
      dir = OpenDirectoryAt(parent.Get(), name);
    }
    if (dir < 0 && (errno == ELOOP || errno == ENOTDIR)) {
      throw RequestError(Code::kNotPermitted,
                         whole + ": \"" + name + "\" is a link or not a directory");
    }
    if (dir < 0) Fail(whole);
  }
  return dir;
}

std::vector<std::string> Entries(int dir, const std::string& path) {
  // A stream of its own, because closing it closes the descriptor.
  UniqueFd copy(openat(dir, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!copy.IsOpen()) Fail(path);
  const std::unique_ptr<DIR, int (*)(DIR*)> stream(fdopendir(copy.Get()), closedir);
  if (!stream) Fail(path);
  static_cast<void>(copy.Release());  // the stream's from now on
  std::vector<std::string> names;
  while (const dirent* entry = readdir(stream.get())) {
    const std::string name = entry->d_name;
    if (name != "." && name != "..") names.push_back(name);
  }
  return names;
}

template <typename Names>
bool Contains(const Names& names, const std::string& name) {
  return std::find(names.begin(), names.end(), name) != names.end();
}

bool IsIndexFile(const std::string& name) {
  return name == kMarker || name == kEmptied || Contains(kTables, name) ||
         Contains(kOtherFiles, name);
}

void RemoveFile(int dir, const std::string& path, const char* name) {
  if (unlinkat(dir, name, 0) == 0 || errno == ENOENT) return;
  // Somebody has put a directory in its place; it goes if it is empty.
  if (errno != EISDIR || unlinkat(dir, name, AT_REMOVEDIR) != 0) Fail(path + "/" + name);
}

void MakeFile(int dir, const std::string& path, const char* name, int how) {
  const UniqueFd file(
      openat(dir, name, O_WRONLY | O_CREAT | O_NOFOLLOW | O_CLOEXEC | how, S_IRUSR | S_IWUSR));
  if (!file.IsOpen()) Fail(path + "/" + name);
}

// The marker goes last: as long as a file of the index is there, the directory is known as ours.
void RemoveIndexFiles(int dir, const std::string& path) {
  for (const char* name : kTables) RemoveFile(dir, path, name);
  for (const char* name : kOtherFiles) RemoveFile(dir, path, name);
  RemoveFile(dir, path, kMarker);
}

void ClearLeftovers(int dir, const std::string& path, bool known) {
  const std::vector<std::string> names = Entries(dir, path);
  if (names.empty()) return;
  const bool ours = known || Contains(names, kMarker) || Contains(names, kEmptied);
  for (const std::string& name : names) {
    if (ours && IsIndexFile(name)) continue;
    throw RequestError(Code::kRejected,
                       "\"path\" holds what is not of an index: " + path + "/" + name);
  }
  MakeFile(dir, path, kEmptied, 0);
  RemoveIndexFiles(dir, path);
}

bool IsFile(int dir, const char* name, off_t at_least) {
  struct stat status {};
  return fstatat(dir, name, &status, AT_SYMLINK_NOFOLLOW) == 0 && S_ISREG(status.st_mode) &&
         status.st_size >= at_least;
}

}  // namespace

std::string CheckedIndexPath(const std::string& path) {
  if (path.size() > kMaxPathBytes) {
    throw RequestError(Code::kRejected,
                       "\"path\" is longer than " + std::to_string(kMaxPathBytes) + " bytes");
  }
  if (path.compare(0, kPackages.size(), kPackages) != 0) {
    throw RequestError(Code::kNotPermitted,
                       "\"path\" must lie below " + std::string(kPackages) + ": " + path);
  }
  std::string_view below = std::string_view(path).substr(kPackages.size());
  if (!below.empty() && below.back() == '/') below.remove_suffix(1);
  for (const std::string& name : Components(below)) {
    if (name.empty() || name == "." || name == ".." || name.size() > kMaxComponentBytes) {
      throw RequestError(Code::kRejected,
                         "\"path\" must not have empty, \".\", \"..\" or over-long parts: " + path);
    }
  }
  return std::string(kPackages).append(below);
}

void PrepareIndexDirectory(const std::string& path, bool known) {
  const UniqueFd dir(OpenDirectory(path, true));
  ClearLeftovers(dir.Get(), path, known);
  MakeFile(dir.Get(), path, kMarker, O_EXCL);
  RemoveFile(dir.Get(), path, kEmptied);
}

void FinishEmptying(const std::string& path) {
  const UniqueFd dir(OpenDirectory(path, false));
  if (dir.IsOpen() && IsFile(dir.Get(), kEmptied, 0)) PrepareIndexDirectory(path, true);
}

void RemoveIndexDirectory(const std::string& path) {
  const std::size_t slash = path.rfind('/');
  const UniqueFd parent(OpenDirectory(std::string_view(path).substr(0, slash), false));
  const UniqueFd dir(OpenDirectory(path, false));
  if (!parent.IsOpen() || !dir.IsOpen()) return;
  RemoveIndexFiles(dir.Get(), path);
  RemoveFile(dir.Get(), path, kEmptied);
  // One that holds something else stays: whoever put it there may want it.
  if (unlinkat(parent.Get(), path.c_str() + slash + 1, AT_REMOVEDIR) != 0 && errno != ENOTEMPTY &&
      errno != EEXIST) {
    Fail(path);
  }
}

bool HoldsDatabase(const std::string& path) {
  const UniqueFd dir(OpenDirectory(path, false));
  if (!dir.IsOpen() || !IsFile(dir.Get(), kMarker, 0)) {
    throw RequestError(Code::kStorage, path + "/" + kMarker + " is missing: the index is damaged");
  }
  if (IsFile(dir.Get(), kVersionFile, 0)) return true;
  for (const char* table : kTables) {
    if (!IsFile(dir.Get(), table, 1)) continue;
    throw RequestError(Code::kStorage,
                       path + "/" + kVersionFile + " is missing: the index is damaged");
  }
  return false;
}

std::vector<std::string> TableFiles(const std::string& path) {
  std::vector<std::string> files;
  const UniqueFd dir(OpenDirectory(path, false));
  if (!dir.IsOpen()) return files;
  for (const std::string& name : Entries(dir.Get(), path)) {
    if (Contains(kTables, name)) files.push_back(path + "/" + name);
  }
  return files;
}

FilesState StateOfFiles(const std::string& path) {
  FilesState state;
  try {
    const UniqueFd dir(OpenDirectory(path, false));
    if (!dir.IsOpen()) return state;
    const auto add = [&](const char* name) {
      struct stat file {};
      if (fstatat(dir.Get(), name, &file, AT_SYMLINK_NOFOLLOW) != 0) file = {};
      state.push_back({static_cast<std::int64_t>(file.st_ino), file.st_mode, file.st_size,
                       file.st_ctim.tv_sec, file.st_ctim.tv_nsec});
    };
    add(kMarker);
    add(kVersionFile);
    for (const char* table : kTables) add(table);
  } catch (const RequestError&) {
    state.clear();
  }
  return state;
}

void SyncIndexDirectory(const std::string& path, bool parents) {
  std::string_view at = path;
  do {
    const UniqueFd dir(OpenDirectory(at, false));
    if (!dir.IsOpen()) Fail(path);
    Sync(dir.Get(), path);
    at = at.substr(0, at.rfind('/'));
  } while (parents && at.size() + 1 >= kPackages.size());
}

}  // namespace searchd
