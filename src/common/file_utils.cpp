#include "appindex/utilities/file_utils.h"

#include <limits.h>
#include <stdlib.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cctype>
#include <cerrno>
#include <memory>

#include "appindex/error.h"
#include "appindex/utilities/credentials.h"
#include "device/tovo_file.h"
#include "device/tovo_user.h"

namespace velkor {
namespace {

// The kernel itself gives up after 40 links; only links that lead to each other come this far.
constexpr int kMaxLinks = 4096;

constexpr std::size_t kMaxLinkBytes = 4095;

constexpr char kPackageUser[] = "Velkor";

// Reads the content of a link; false when that fails.
bool ReadLink(const std::string& path, std::string& content) {
  std::array<char, kMaxLinkBytes> buffer{};
  const ssize_t size = readlink(path.c_str(), buffer.data(), buffer.size());
  if (size < 0) return false;
  content.assign(buffer.data(), static_cast<std::size_t>(size));
  return true;
}

struct Owner {
  uid_t uid;
  gid_t gid;
};

Owner LookUpPackageUser() {
  const LockMutex lock(sdk::SDKMutex());
  TOVOUSER* found = nullptr;
  if (TOVOUserGet(kPackageUser, &found) < 0 || found == nullptr) throw Error(Error::kChownError);
  const std::unique_ptr<TOVOUSER, void (*)(TOVOUSER*)> record(found, TOVOUserFree);
  // The device's user query asks for the home service with every user that it looks up; nothing
  // here depends on the answer.
  TOVOServiceUserHomeIsEnabled(kPackageUser);
  return {record->uid, record->gid};
}

}  // namespace

bool IsFileExist(const std::string& path) {
  struct stat info {};
  return lstat(path.c_str(), &info) == 0 && S_ISREG(info.st_mode);
}

bool IsDirExist(const std::string& path, bool follow_link) {
  std::string current = path;
  for (int links = 0; links <= kMaxLinks; ++links) {
    struct stat info {};
    if (lstat(current.c_str(), &info) != 0) return false;
    if (S_ISDIR(info.st_mode)) return true;
    if (!S_ISLNK(info.st_mode) || !follow_link) return false;
    if (!ReadLink(current, current)) return false;
  }
  return false;
}

bool IsDirentDir(const dirent& entry, const std::string& /*path*/) {
  return entry.d_type == DT_DIR;
}

bool CheckACLPerm(const std::string& path, int mask) {
  int perm = 0;
  return TOVOACLPermGet(path.c_str(), &perm) >= 0 && (perm & mask) != 0;
}

bool IsMountPoint(const std::string& path) { return TOVOFSDirIsMntPoint(path.c_str()) > 0; }

bool StringStartWith(const std::string& str, const std::string& prefix) {
  return str.compare(0, prefix.size(), prefix) == 0;
}

std::string Basename(const std::string& path) {
  const std::string::size_type slash = path.rfind('/');
  return slash == std::string::npos ? path : path.substr(slash + 1);
}

std::string Dirname(const std::string& path) { return path.substr(0, path.rfind('/')); }

std::string GetFileExtension(const std::string& path, bool to_lower) {
  const std::string name = Basename(path);
  const std::string::size_type dot = name.rfind('.');
  if (dot == std::string::npos) return "";
  std::string extension = name.substr(dot + 1);
  if (to_lower) {
    for (char& c : extension) {
      c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    }
  }
  return extension;
}

std::string RealPath(const std::string& path) {
  std::array<char, PATH_MAX> buffer{};  // 4096 bytes, what realpath may fill
  return realpath(path.c_str(), buffer.data()) == nullptr ? "" : buffer.data();
}

bool Unlink(const std::string& path) { return unlink(path.c_str()) == 0 || errno == ENOENT; }

bool MVFileImpl(const std::string& src, const std::string& dst, TOVOCOPYARGS* args) {
  return TOVOFileCopy(src.c_str(), dst.c_str(), args) == 0;
}

bool MVFile(const std::string& src, const std::string& dst) {
  TOVOCOPYARGS args{};
  args.words[0] = 1;
  args.words[1] = 1;
  return MVFileImpl(src, dst, &args);
}

bool CPFile(const std::string& src, const std::string& dst) {
  TOVOCOPYARGS args{};
  args.words[0] = 1;
  return MVFileImpl(src, dst, &args);
}

bool ChownVelkor(const std::string& path) {
  const Owner owner = LookUpPackageUser();
  return chown(path.c_str(), owner.uid, owner.gid) == 0;
}

}  // namespace velkor
