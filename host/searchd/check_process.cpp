#include "host/searchd/check_process.h"

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <syslog.h>
#include <unistd.h>
#include <xapian.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <initializer_list>
#include <stdexcept>
#include <utility>
#include <vector>

#include "host/searchd/index_directory.h"
#include "host/searchd/request_error.h"
#include "host/searchd/system_log.h"

namespace searchd {
namespace {

using host::sdk::UniqueFd;

// More than any database takes, for one whose damage makes the check go on for ever.
constexpr rlim_t kMaxSeconds = 120;
constexpr std::size_t kMaxRequestBytes = 4096;  // a path

// One request on the way: a path, and with it the descriptor that takes the result.
class Message {
 public:
  explicit Message(std::string path) : path_(std::move(path)), part_{path_.data(), path_.size()} {
    header_.msg_iov = &part_;
    header_.msg_iovlen = 1;
    header_.msg_control = control_.data();
    header_.msg_controllen = control_.size();
  }

  bool Send(int socket, int result) {
    cmsghdr* const control = CMSG_FIRSTHDR(&header_);
    control->cmsg_level = SOL_SOCKET;
    control->cmsg_type = SCM_RIGHTS;
    control->cmsg_len = CMSG_LEN(sizeof(int));
    std::memcpy(CMSG_DATA(control), &result, sizeof(int));
    return sendmsg(socket, &header_, MSG_NOSIGNAL) >= 0;
  }

  // Returns the descriptor that takes the result; -1 when there are no more requests.
  int Receive(int socket) {
    const ssize_t size = recvmsg(socket, &header_, MSG_CMSG_CLOEXEC);
    const cmsghdr* const control = CMSG_FIRSTHDR(&header_);
    if (size <= 0 || control == nullptr) return -1;
    path_.resize(static_cast<std::size_t>(size));
    int result = -1;
    std::memcpy(&result, CMSG_DATA(control), sizeof(int));
    return result;
  }

  const std::string& Path() const { return path_; }

 private:
  std::string path_;
  iovec part_;
  msghdr header_{};
  alignas(cmsghdr) std::array<char, CMSG_SPACE(sizeof(int))> control_{};
};

// The functions that follow return what is wrong; an empty text if nothing is.

std::string FindDamageInTable(const std::string& file) {
  try {
    return Xapian::Database::check(file, 0, nullptr) == 0 ? ""
                                                          : "its entries contradict each other";
  } catch (const Xapian::Error& e) {
    return e.get_description();
  }
}

// A table is read as the version file says. If that is damaged, none can be read.
std::string FindDamageInTables(const std::string& path, const std::vector<std::string>& files) {
  std::string damaged;
  std::string cause;
  bool all = true;
  for (const std::string& file : files) {
    const std::string found = FindDamageInTable(file);
    if (found.empty()) all = false;
    if (found.empty() || !damaged.empty()) continue;
    damaged = file;
    cause = found;
  }
  if (damaged.empty()) return {};
  return (all ? path + "/" + kVersionFile : damaged) + " is damaged: " + cause;
}

// Xapian itself takes the absence of a table for a table without entries.
std::string FindMissing(const std::string& path, const std::vector<std::string>& there,
                        std::initializer_list<const char*> tables) {
  for (const char* table : tables) {
    const std::string file = path + "/" + table + ".glass";
    if (std::find(there.begin(), there.end(), file) == there.end()) {
      return file + " is missing: the index is damaged";
    }
  }
  return {};
}

std::string FindDamageInDatabase(const std::string& path) {
  if (!HoldsDatabase(path)) return {};
  const std::vector<std::string> files = TableFiles(path);
  std::string damage = FindMissing(path, files, {"postlist", "termlist"});
  if (damage.empty()) damage = FindDamageInTables(path, files);
  if (!damage.empty()) return damage;
  const Xapian::Database database(path, Xapian::DB_BACKEND_GLASS);
  return database.get_doccount() == 0 ? "" : FindMissing(path, files, {"docdata"});
}

std::string FindDamage(const std::string& path) {
  try {
    return FindDamageInDatabase(path);
  } catch (const Xapian::Error& e) {
    return path + " is damaged: " + e.get_description();
  } catch (const std::exception& e) {
    return e.what();
  }
}

void WriteResult(int fd, const std::string& result) {
  // Whoever reads it sees the end without a result if this fails.
  if (write(fd, result.data(), result.size()) < 0) errno = 0;
}

// In the process that reads one database.
[[noreturn]] void CheckAndExit(const std::string& path, int result_fd) {
  const rlimit limit{kMaxSeconds, kMaxSeconds};
  setrlimit(RLIMIT_CPU, &limit);
  const std::string damage = FindDamage(path);
  if (!damage.empty()) syslog(LOG_ERR, "an index cannot be used: %s", damage.c_str());
  WriteResult(result_fd, damage.empty() ? std::string(1, kNoDamage) : damage);
  _exit(0);
}

// In the process that starts those, until the daemon is gone. It shares nothing with the daemon but
// its end of the socket.
[[noreturn]] void ServeRequests(int socket, int output) {
  constexpr int kRequests = STDIN_FILENO;
  dup2(output, STDERR_FILENO);
  dup2(output, STDOUT_FILENO);
  dup2(socket, kRequests);
  close_range(STDERR_FILENO + 1, ~0U, 0);
  ReopenSystemLog();
  std::signal(SIGCHLD, SIG_IGN);  // nobody waits for the processes that it starts
  for (;;) {
    Message message{std::string(kMaxRequestBytes, '\0')};
    const UniqueFd result(message.Receive(kRequests));
    if (!result.IsOpen()) _exit(0);
    const pid_t child = fork();
    if (child == 0) {
      prctl(PR_SET_PDEATHSIG, SIGKILL);
      CheckAndExit(message.Path(), result.Get());
    }
    if (child > 0) continue;
    const std::string failure = WithErrno("cannot check " + message.Path(), errno);
    syslog(LOG_ERR, "%s", failure.c_str());
    WriteResult(result.Get(), failure);
  }
}

}  // namespace

CheckProcess::CheckProcess(int output) {
  std::array<int, 2> ends{};
  if (socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, ends.data()) != 0) {
    throw std::runtime_error(WithErrno("socketpair", errno));
  }
  requests_ = std::make_unique<UniqueFd>(ends[0]);
  const UniqueFd other_end(ends[1]);
  const pid_t child = fork();
  if (child < 0) throw std::runtime_error(WithErrno("fork", errno));
  if (child == 0) ServeRequests(other_end.Get(), output);
}

std::unique_ptr<UniqueFd> CheckProcess::Begin(const std::string& path) {
  std::array<int, 2> ends{};
  if (pipe2(ends.data(), O_CLOEXEC) != 0) {
    throw RequestError(Code::kStorage, WithErrno("cannot check " + path, errno));
  }
  auto result = std::make_unique<UniqueFd>(ends[0]);
  const UniqueFd write_end(ends[1]);
  if (!Message(path).Send(requests_->Get(), write_end.Get())) {
    throw RequestError(Code::kStorage, WithErrno("cannot check " + path, errno));
  }
  return result;
}

}  // namespace searchd
