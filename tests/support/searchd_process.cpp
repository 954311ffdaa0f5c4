#include "tests/support/searchd_process.h"

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>

namespace test {
namespace {

struct Pipe {
  Pipe() {
    if (pipe2(ends.data(), O_CLOEXEC) != 0) abort();
  }
  std::array<int, 2> ends{};
};

}  // namespace

void Fd::Close() {
  if (fd_ >= 0) close(fd_);
  fd_ = -1;
}

std::string ReadToEnd(int fd) {
  std::string text;
  std::array<char, 4096> part{};
  ssize_t n = 0;
  while ((n = read(fd, part.data(), part.size())) > 0) {
    text.append(part.data(), static_cast<std::size_t>(n));
  }
  return text;
}

sockaddr_un SocketAddress(const std::string& path) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, path.c_str(), sizeof(address.sun_path) - 1);
  return address;
}

Fd Connect(const std::string& path) {
  Fd fd(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  const sockaddr_un address = SocketAddress(path);
  if (connect(fd.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof(address)) != 0) {
    fd.Close();
  }
  return fd;
}

SearchdProcess::SearchdProcess(std::vector<std::string> arguments, bool wait_until_ready,
                               const std::function<void()>& prepare) {
  const Pipe ready;
  const Pipe errors;
  if (wait_until_ready) {
    arguments.insert(arguments.end(), {"--ready-fd", std::to_string(ready.ends[1])});
  }
  std::vector<char*> argv{const_cast<char*>(TOVOELASTICD_PATH)};
  for (std::string& argument : arguments) argv.push_back(argument.data());
  argv.push_back(nullptr);
  pid_ = fork();
  if (pid_ == 0) {
    fcntl(ready.ends[1], F_SETFD, 0);
    dup2(errors.ends[1], STDERR_FILENO);
    if (prepare) prepare();
    execv(TOVOELASTICD_PATH, argv.data());
    _exit(127);
  }
  close(ready.ends[1]);
  close(errors.ends[1]);
  errors_ = std::make_unique<Fd>(errors.ends[0]);
  const Fd ready_end(ready.ends[0]);
  if (wait_until_ready) ready_ = ReadToEnd(ready_end.Get()) == "ready\n";
}

SearchdProcess::~SearchdProcess() {
  if (pid_ > 0) Stop(SIGKILL);
}

SearchdProcess::Result SearchdProcess::Wait() {
  std::string text = ReadToEnd(errors_->Get());
  int status = 0;
  while (waitpid(pid_, &status, 0) < 0 && errno == EINTR) {
  }
  pid_ = -1;
  return {WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status), text};
}

SearchdProcess::Result SearchdProcess::Stop(int signal) {
  kill(pid_, signal);
  return Wait();
}

}  // namespace test
