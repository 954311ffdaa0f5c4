#include "tool/descriptor_path.h"

#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>

#include "appindex/error.h"
#include "appindex/index_mgr_internal.h"
#include "appindex/utilities/file_utils.h"
#include "appindex/utilities/json_helpers.h"
#include "common/check.h"
#include "tool/failure.h"

namespace tool {
namespace {

namespace index = velkor::appindex;

std::string Absolute(const std::string& argument) {
  std::string path = std::filesystem::absolute(argument).lexically_normal().string();
  while (path.size() > 1 && path.back() == '/') path.pop_back();
  return path;
}

bool IsInApplication(const std::string& path) {
  for (const std::string& root : index::kAppRoots) {
    // Below the root there is the application's directory, and the descriptor in it.
    if (velkor::StringStartWith(path, root) && path.find('/', root.size()) != std::string::npos) {
      return true;
    }
  }
  return false;
}

std::string FindIn(const std::string& dir) {
  const velkor::MutedLog muted;
  std::string conf_path;
  if (!index::FindIndexConfByAppRoot(conf_path, dir == "/" ? dir : dir + "/", 0)) {
    throw Failure(dir + ": there is no index.conf in it, nor up to five levels below",
                  "name a descriptor, or a directory that holds one");
  }
  return conf_path;
}

}  // namespace

std::string DescriptorPath(const std::string& argument) {
  std::string path = Absolute(argument);
  if (access(path.c_str(), F_OK) != 0) {
    const int error = errno;
    throw Failure(path + ": " + std::strerror(error), AdviceOn(error));
  }
  if (velkor::IsDirExist(path + "/", false)) path = FindIn(path);
  if (velkor::Basename(path) != index::kIndexConf) {
    throw Failure(path + ": others than index.conf are not read",
                  "a descriptor is named index.conf: rename it");
  }
  if (!IsInApplication(path)) {
    throw Failure(path + ": not in a directory of /var/packages or " +
                      "/usr/tovo/tovoman/webman/modules, where applications are",
                  "install it there; `appindex lint` and `show` look at it anywhere");
  }
  if (!velkor::IsFileExist(velkor::RealPath(path))) {
    throw Failure(path + ": not a regular file", AdviceOn(EINVAL));
  }
  return path;
}

std::vector<std::string> DescriptorPaths(const std::vector<std::string>& arguments) {
  std::vector<std::string> paths;
  for (const std::string& argument : arguments) paths.push_back(DescriptorPath(argument));
  return paths;
}

void RequireReadable(const std::string& conf_path) {
  Json::Value root;
  errno = 0;
  if (velkor::fromFile(root, conf_path)) return;
  const int error = errno;
  if (error == 0) throw Failure(conf_path + ": not strict JSON", "`appindex lint` shows where");
  throw Failure(conf_path + ": cannot be read: " + WhyNotRead(error), AdviceOn(error));
}

std::string WhyUnreadable(const std::string& conf_path) {
  try {
    RequireReadable(conf_path);
  } catch (const Failure& failure) {
    return failure.cause().substr(conf_path.size() + 2);
  }
  return "";
}

}  // namespace tool
