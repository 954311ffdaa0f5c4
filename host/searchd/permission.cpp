#include "host/searchd/permission.h"

#include <pwd.h>
#include <unistd.h>

#include <cerrno>
#include <vector>

namespace searchd {
namespace {

constexpr const char* kIndexingUser = "Velkor";

}  // namespace

bool MayChangeIndexes(uid_t client) {
  if (client == 0 || client == geteuid()) return true;
  std::vector<char> buffer(1024);
  passwd entry{};
  passwd* found = nullptr;
  int error = 0;
  while ((error = getpwnam_r(kIndexingUser, &entry, buffer.data(), buffer.size(), &found)) ==
         ERANGE) {
    buffer.resize(2 * buffer.size());
  }
  return error == 0 && found != nullptr && found->pw_uid == client;
}

}  // namespace searchd
