#include "host/searchd/database_check.h"

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <syslog.h>
#include <unistd.h>
#include <xapian.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <utility>

#include "host/searchd/index_directory.h"
#include "host/searchd/request_error.h"

namespace searchd {
namespace {

using host::sdk::UniqueFd;

// What the process that checks says of a database in which it finds nothing wrong.
constexpr char kWhole = '+';
// More than any database takes, for one whose damage makes the check go on for ever.
constexpr rlim_t kMaxSeconds = 120;

// What is wrong with the database; empty if nothing is.
std::string FindDamage(const std::string& path) {
  try {
    if (!HoldsDatabase(path)) return {};
    for (const char* table : {"docdata", "postlist", "termlist"}) {
      const std::string file = path + "/" + table + ".glass";
      if (Xapian::Database::check(file, 0, nullptr) != 0) return file + " is damaged";
    }
    const Xapian::Database database(path, Xapian::DB_BACKEND_GLASS);
    return {};
  } catch (const Xapian::Error& e) {
    return path + " is damaged: " + e.get_description();
  } catch (const std::exception& e) {
    return path + " is damaged: " + e.what();
  }
}

// In a process that shares nothing with the daemon but the end of a pipe.
[[noreturn]] void CheckAndExit(const std::string& path, int result_fd) {
  constexpr int kOnlyFd = STDERR_FILENO + 1;
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  closelog();  // its descriptor goes with the others
  dup2(result_fd, kOnlyFd);
  close_range(kOnlyFd + 1, ~0U, 0);
  const rlimit limit{kMaxSeconds, kMaxSeconds};
  setrlimit(RLIMIT_CPU, &limit);
  const std::string damage = FindDamage(path);
  const std::string result = damage.empty() ? std::string(1, kWhole) : damage;
  if (!damage.empty()) syslog(LOG_ERR, "an index cannot be used: %s", damage.c_str());
  _exit(write(kOnlyFd, result.data(), result.size()) < 0 ? 1 : 0);
}

std::string ReadToEnd(int fd) {
  std::string text;
  std::array<char, 1024> part{};
  for (;;) {
    const ssize_t n = read(fd, part.data(), part.size());
    if (n < 0 && errno == EINTR) continue;
    if (n <= 0) return text;
    text.append(part.data(), static_cast<std::size_t>(n));
  }
}

}  // namespace

DatabaseCheck::DatabaseCheck(std::string path, int result_fd)
    : path_(std::move(path)), result_fd_(std::make_unique<UniqueFd>(result_fd)) {}

std::unique_ptr<DatabaseCheck> DatabaseCheck::Start(const std::string& path) {
  std::signal(SIGCHLD, SIG_IGN);  // nobody waits for the process that checks
  std::array<int, 2> ends{};
  if (pipe2(ends.data(), O_CLOEXEC) != 0) {
    throw RequestError(Code::kStorage, WithErrno("pipe", errno));
  }
  const UniqueFd write_end(ends[1]);
  std::unique_ptr<DatabaseCheck> check(new DatabaseCheck(path, ends[0]));
  const pid_t child = fork();
  if (child < 0) throw RequestError(Code::kStorage, WithErrno("fork", errno));
  if (child == 0) CheckAndExit(path, write_end.Get());
  return check;
}

void DatabaseCheck::Await() {
  const std::lock_guard lock(mutex_);
  if (result_fd_) {
    const std::string result = ReadToEnd(result_fd_->Get());
    result_fd_.reset();
    if (result.empty()) {
      damage_ = path_ + " is damaged: the attempt to read it has crashed";
    } else if (result[0] != kWhole) {
      damage_ = result;
    }
  }
  if (!damage_.empty()) throw RequestError(Code::kStorage, damage_);
}

}  // namespace searchd
