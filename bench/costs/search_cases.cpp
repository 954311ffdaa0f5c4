#include <cstdlib>
#include <filesystem>

#include "appindex/index_mgr_internal.h"
#include "bench/costs/cases.h"
#include "common/dir_reader.h"

namespace bench {
namespace {

constexpr char kPackages[] = "/var/packages/";
constexpr long kFanOut = 10;

// A tree of so many directories, ten in each of them, level by level.
void MakeTree(const std::string& top, long directories) {
  std::vector<std::string> paths = {top};
  std::filesystem::create_directory(top);
  for (std::size_t parent = 0; static_cast<long>(paths.size()) < directories; ++parent) {
    for (long n = 0; n < kFanOut && static_cast<long>(paths.size()) < directories; ++n) {
      paths.push_back(paths[parent] + "/directory" + std::to_string(n));
      std::filesystem::create_directory(paths.back());
    }
  }
}

// Reads every directory once, and asks the system about nothing else.
long Walk(const std::string& path) {
  DIR* const dir = opendir(path.c_str());
  if (dir == nullptr) std::abort();
  long directories = 1;
  std::string child;
  while (const dirent64* entry = readdir64(dir)) {
    const char* name = static_cast<const char*>(entry->d_name);
    const std::string_view view = name;
    if (entry->d_type != DT_DIR || view == "." || view == "..") continue;
    child.assign(path).append(name).append("/");
    directories += Walk(child);
  }
  closedir(dir);
  return directories;
}

}  // namespace

Cases SearchCases(long packages, long directories) {
  // Nothing but the trees, and none has a descriptor, so that all of each is searched.
  std::filesystem::remove_all(kPackages);
  std::filesystem::remove_all("/usr/tovo/tovoman/webman/modules");
  std::filesystem::create_directories("/usr/tovo/tovoman/webman/modules");
  std::filesystem::create_directories(kPackages);
  for (long n = 0; n < packages; ++n) {
    MakeTree(kPackages + ("Package" + std::to_string(n)), directories);
  }
  const long expected = packages * directories + 1;
  Case search{"search", packages * directories, static_cast<double>(packages * directories),
              [] {
                if (!velkor::appindex::FindIndexConf().empty()) std::abort();
              },
              [expected] {
                if (Walk(kPackages) != expected) std::abort();
              }};
  search.rounds = 3;
  return {search};
}

}  // namespace bench
