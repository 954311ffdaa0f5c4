#include "tests/crash/process_state.h"

#include <fcntl.h>
#include <grp.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <iterator>
#include <sstream>

namespace test {
namespace {

constexpr int kMaxDescriptors = 256;  // more than any test has open
constexpr int kSignals = 31;          // those that have names

template <typename T>
std::string Text(const std::vector<T>& values) {
  std::ostringstream text;
  for (const T& value : values) text << " " << value;
  return text.str();
}

template <typename T>
std::string Change(const char* what, const std::vector<T>& before, const std::vector<T>& after) {
  if (before == after) return "";
  return std::string(what) + ":" + Text(before) + " ->" + Text(after) + "\n";
}

}  // namespace

ProcessState ProcessState::Now() {
  closelog();
  ProcessState state;
  for (int fd = 0; fd < kMaxDescriptors; ++fd) {
    if (fcntl(fd, F_GETFD) >= 0) state.descriptors.push_back(fd);
  }
  state.users.resize(3);
  getresuid(&state.users[0], &state.users[1], &state.users[2]);
  state.groups.resize(3);
  getresgid(&state.groups[0], &state.groups[1], &state.groups[2]);
  std::vector<gid_t> more(static_cast<std::size_t>(getgroups(0, nullptr)));
  if (getgroups(static_cast<int>(more.size()), more.data()) >= 0) {
    state.groups.insert(state.groups.end(), more.begin(), more.end());
  }
  state.mask = umask(0);
  umask(state.mask);
  struct stat here {};
  stat(".", &here);
  state.directory = {here.st_dev, here.st_ino};
  for (int number = 1; number <= kSignals; ++number) {
    struct sigaction action {};
    sigaction(number, nullptr, &action);
    state.signals.push_back(reinterpret_cast<const void*>(action.sa_handler));
  }
  return state;
}

std::string ProcessState::Changes(const ProcessState& after) const {
  std::vector<int> still_open;
  std::set_intersection(descriptors.begin(), descriptors.end(), after.descriptors.begin(),
                        after.descriptors.end(), std::back_inserter(still_open));
  return Change("descriptors", descriptors, still_open) + Change("users", users, after.users) +
         Change("groups", groups, after.groups) +
         Change("umask", std::vector<mode_t>{mask}, std::vector<mode_t>{after.mask}) +
         Change("working directory", directory, after.directory) +
         Change("signals", signals, after.signals);
}

std::string ProcessState::Kept(const ProcessState& after) const {
  std::vector<int> kept;
  std::set_difference(after.descriptors.begin(), after.descriptors.end(), descriptors.begin(),
                      descriptors.end(), std::back_inserter(kept));
  return Text(kept);
}

}  // namespace test
