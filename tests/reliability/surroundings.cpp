#include "tests/reliability/surroundings.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <climits>
#include <csignal>

#include "appindex/utilities/credentials.h"
#include "tests/support/indexing.h"

namespace test {
namespace {

constexpr int kMaxDescriptor = 256;

std::string Signals() {
  std::string text;
  for (int number = 1; number < NSIG; ++number) {
    struct sigaction action {};
    if (sigaction(number, nullptr, &action) != 0 || action.sa_handler == SIG_DFL) continue;
    text += " " + std::to_string(number) + (action.sa_handler == SIG_IGN ? "-" : "+");
  }
  return text;
}

bool IsHeld(const char* path) {
  const int fd = open(path, O_RDONLY | O_CLOEXEC);
  if (fd < 0) return false;
  const bool free = flock(fd, LOCK_EX | LOCK_NB) == 0;
  close(fd);
  return !free;
}

}  // namespace

std::string Surroundings() {
  std::string text = "descriptors";
  for (int fd = 0; fd < kMaxDescriptor; ++fd) {
    if (fcntl(fd, F_GETFD) >= 0) text += " " + std::to_string(fd);
  }
  const mode_t mask = umask(0);
  umask(mask);
  std::array<char, PATH_MAX> directory{};
  if (getcwd(directory.data(), directory.size()) == nullptr) directory = {'?'};
  return text + ", user " + std::to_string(geteuid()) + " " + std::to_string(getegid()) +
         ", umask " + std::to_string(mask) + ", in " + directory.data() + ", signals" + Signals();
}

std::string HeldLock() {
  for (const char* path : {kProcessLock, kQueue}) {
    if (IsHeld(path)) return path;
  }
  if (!velkor::sdk::SDKMutex().TryLock()) return "the SDK mutex";
  velkor::sdk::SDKMutex().Unlock();
  return "";
}

}  // namespace test
