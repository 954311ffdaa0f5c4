#include "tool/lint/package.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <optional>

#include "appindex/error.h"
#include "appindex/index_mgr_internal.h"
#include "appindex/string_pool_internal.h"
#include "appindex/utilities/file_utils.h"
#include "common/dir_reader.h"
#include "common/searched_dirs.h"
#include "tool/failure.h"

namespace tool::lint {
namespace {

namespace fs = std::filesystem;

constexpr char kPackages[] = "/var/packages/";
constexpr char kModules[] = "/usr/tovo/tovoman/webman/modules/";
constexpr char kBuiltInTexts[] = "/usr/tovo/tovoman/webman/texts/";
constexpr char kTexts[] = "texts";

// How deep the library's searches go: a descriptor lies at most five directories below the package,
// a directory of texts is at most the sixth.
constexpr int kReach = 5;
// How much deeper to look for what was meant to be found.
constexpr int kFurther = 6;

[[noreturn]] void FailOfPath(const std::string& path, int error) {
  throw Failure(path + ": " + std::strerror(error), AdviceOn(error));
}

std::string Absolute(const std::string& path) {
  std::string absolute = fs::absolute(path).lexically_normal().string();
  while (absolute.size() > 1 && absolute.back() == '/') absolute.pop_back();
  return absolute;
}

// Links can lead to one file by countless ways: more of them say nothing new.
constexpr std::size_t kMostFound = 100;

struct Found {
  std::vector<std::string> near;
  std::vector<std::string> deep;
  velkor::SearchedDirs searched;
  std::size_t Count() const { return near.size() + deep.size(); }
};

struct Search {
  const char* name;
  bool directories;  // a match is a directory; its path ends in "/"
};

bool IsLink(const std::string& path) {
  std::error_code error;
  return fs::is_symlink(path, error);
}

// Looks for all that the library's search would stop at. Beyond its reach links are not followed.
void FindAll(Found& found, const Search& search, const std::string& dir, int depth) {
  velkor::DirReader reader(dir);
  if (!reader.IsOpen() || found.searched.Has(reader, depth)) return;
  const std::size_t before = found.Count();
  std::string name;
  while (found.Count() < kMostFound && reader.Next(name)) {
    const std::string child = dir + name + (search.directories ? "/" : "");
    const bool is_dir = velkor::IsDirExist(child, true);
    if (name == search.name && (is_dir || !search.directories)) {
      (depth <= kReach ? found.near : found.deep).push_back(child);
    } else if (is_dir && depth < kReach + kFurther && (depth < kReach || !IsLink(dir + name))) {
      if (reader.MayBeLink()) found.searched.FollowLink();
      FindAll(found, search, search.directories ? child : child + "/", depth + 1);
    }
  }
  if (found.Count() == before) found.searched.Add(reader, depth);
}

Found FindAllSorted(const Search& search, const std::string& dir) {
  Found found;
  FindAll(found, search, dir, 0);
  std::sort(found.near.begin(), found.near.end());
  std::sort(found.deep.begin(), found.deep.end());
  return found;
}

void FindTexts(Package& package) {
  if (package.is_built_in) {
    const std::size_t modules = package.dir.find(kModules);
    package.texts = package.dir.substr(0, modules) + kBuiltInTexts;
    if (!velkor::IsDirExist(package.texts, true)) package.texts.clear();
    return;
  }
  const Found found = FindAllSorted({kTexts, true}, package.dir);
  package.all_texts = found.near;
  package.deep_texts = found.deep;
  try {
    velkor::appindex::FindPkgTextRoot(package.texts, package.dir, 0);
  } catch (const velkor::Error&) {
    // A directory that cannot be opened ends the library's search without a result.
    package.texts.clear();
  }
}

Package MakePackage(const std::string& dir, bool is_built_in) {
  Package package;
  package.dir = dir;
  package.is_built_in = is_built_in;
  const Found found = FindAllSorted({velkor::appindex::kIndexConf, false}, dir);
  package.descriptors = found.near;
  package.deep_descriptors = found.deep;
  FindTexts(package);
  return package;
}

// Where the package begins that `path` lies in, by the place that it has on a device.
std::optional<Package> InstalledPackage(const std::string& path) {
  for (const char* root : {kPackages, kModules}) {
    const std::size_t at = path.rfind(root);
    if (at == std::string::npos) continue;
    const std::size_t name = at + std::strlen(root);
    const std::string dir = path.substr(0, path.find('/', name)) + "/";
    if (velkor::IsDirExist(dir, true)) return MakePackage(dir, root == kModules);
  }
  return std::nullopt;
}

// A descriptor's nearest directory that holds texts, or else its own.
std::string GuessPackage(const std::string& descriptor) {
  std::string dir = velkor::Dirname(descriptor);
  for (int up = 0; up <= kReach && !dir.empty(); ++up, dir = velkor::Dirname(dir)) {
    if (velkor::IsDirExist(dir + "/" + kTexts, true)) return dir + "/";
  }
  return velkor::Dirname(descriptor) + "/";
}

Package PackageOf(const std::string& path, bool is_dir, const std::string& package_dir) {
  if (!package_dir.empty()) {
    const std::string dir = Absolute(package_dir) + "/";
    if (!velkor::IsDirExist(dir, true)) {
      throw Failure(package_dir + ": there is no such directory",
                    "let --package name the one that the package begins with");
    }
    return MakePackage(dir, false);
  }
  if (const std::optional<Package> installed = InstalledPackage(path + (is_dir ? "/" : ""))) {
    return *installed;
  }
  if (is_dir) return MakePackage(path + "/", false);
  Package package = MakePackage(GuessPackage(path), false);
  package.is_guessed = true;
  return package;
}

// All that is installed in `dir`, which ends in "/". Applications without a descriptor are as usual
// as others.
void AppendInstalled(std::vector<Package>& packages, const std::string& dir, bool is_built_in) {
  velkor::DirReader reader(dir);
  if (!reader.IsOpen()) FailOfPath(DisplayPath(dir), errno);
  std::vector<std::string> names;
  std::string name;
  while (reader.Next(name)) names.push_back(name);
  std::sort(names.begin(), names.end());
  for (const std::string& package_name : names) {
    const std::string package_dir = dir + package_name + "/";
    if (!velkor::IsDirExist(package_dir, false)) continue;
    Package package = MakePackage(package_dir, is_built_in);
    package.checked = package.descriptors;
    if (!package.checked.empty() || !package.deep_descriptors.empty()) {
      packages.push_back(std::move(package));
    }
  }
}

bool EndsWith(const std::string& text, const std::string& end) {
  return text.size() >= end.size() && text.compare(text.size() - end.size(), end.size(), end) == 0;
}

// Whether `dir` holds many packages; they are appended then.
bool AppendTree(std::vector<Package>& packages, const std::string& dir) {
  if (EndsWith(dir + "/", kPackages)) {
    AppendInstalled(packages, dir + "/", false);
    return true;
  }
  if (EndsWith(dir + "/", kModules)) {
    AppendInstalled(packages, dir + "/", true);
    return true;
  }
  bool is_tree = false;
  for (const char* root : {kPackages, kModules}) {
    const std::string installed = (dir == "/" ? "" : dir) + root;
    if (!velkor::IsDirExist(installed, true)) continue;
    AppendInstalled(packages, installed, root == kModules);
    is_tree = true;
  }
  return is_tree;
}

}  // namespace

std::vector<Package> FindPackages(const std::string& path, const std::string& package_dir) {
  const std::string absolute = Absolute(path);
  std::error_code error;
  const fs::file_status status = fs::status(absolute, error);
  if (!fs::exists(status)) FailOfPath(path, error ? error.value() : ENOENT);
  const bool is_dir = fs::is_directory(status);
  if (is_dir && !velkor::DirReader(absolute).IsOpen()) FailOfPath(path, errno);
  std::vector<Package> packages;
  if (is_dir && package_dir.empty() && AppendTree(packages, absolute)) return packages;
  Package package = PackageOf(absolute, is_dir, package_dir);
  if (!is_dir) {
    package.checked = {absolute};
  } else {
    const std::string below = absolute + "/";
    for (const std::string& descriptor : package.descriptors) {
      if (velkor::StringStartWith(descriptor, below)) package.checked.push_back(descriptor);
    }
    if (package.checked.empty()) package.checked = package.descriptors;
  }
  packages.push_back(std::move(package));
  return packages;
}

std::string TextsRootOf(const Package& package, const std::string& descriptor,
                        const std::string* stringset) {
  if (stringset == nullptr) return package.texts;
  const std::string root = velkor::Dirname(descriptor) + "/" + *stringset + "/";
  return velkor::IsDirExist(root, true) ? root : "";
}

std::string DisplayPath(const std::string& path) {
  std::error_code error;  // the directory may be gone
  const std::string here = fs::current_path(error).string() + "/";
  if (path == here) return ".";
  return here.size() > 1 && velkor::StringStartWith(path, here) ? path.substr(here.size()) : path;
}

}  // namespace tool::lint
