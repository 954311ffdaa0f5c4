#include "tests/tool/tool_process.h"

#include <fcntl.h>
#include <sys/ioctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstring>
#include <memory>
#include <stdexcept>
#include <thread>
#include <utility>

namespace test {
namespace {

constexpr unsigned short kRows = 24;

// The text arrays of a program, made before the fork.
class Texts {
 public:
  explicit Texts(std::vector<std::string> texts) : texts_(std::move(texts)) {
    for (std::string& text : texts_) pointers_.push_back(text.data());
    pointers_.push_back(nullptr);
  }
  char* const* Get() const { return pointers_.data(); }

 private:
  std::vector<std::string> texts_;
  std::vector<char*> pointers_;
};

std::vector<std::string> CommandLine(const Outside& outside,
                                     const std::vector<std::string>& arguments) {
  std::vector<std::string> line = {"appindex", "--root", outside.path};
  line.insert(line.end(), arguments.begin(), arguments.end());
  return line;
}

std::vector<std::string> Variables(const Environment& given) {
  Environment all = given;
  all.insert({{"TERM", "xterm"}, {"LC_ALL", "C.UTF-8"}, {"PATH", "/usr/bin:/bin"}});
  std::vector<std::string> variables;
  for (const auto& [name, value] : all) variables.push_back(name + "=" + value);
  return variables;
}

// Starts it with these as its standard streams.
pid_t Start(const Outside& outside, const std::vector<std::string>& arguments,
            const Environment& environment, int in, int out, int err) {
  const Texts line(CommandLine(outside, arguments));
  const Texts variables(Variables(environment));
  const pid_t pid = fork();
  if (pid != 0) return pid;
  if (setsid() >= 0 && fchdir(outside.root_fd) == 0 && chroot(".") == 0 && dup2(in, 0) == 0 &&
      dup2(out, 1) == 1 && dup2(err, 2) == 2) {
    ioctl(0, TIOCSCTTY, 0);  // refused where it is no terminal
    execve(APPINDEX_PATH, line.Get(), variables.Get());
  }
  std::perror("cannot start " APPINDEX_PATH);
  _exit(127);
}

int StatusOf(pid_t pid) {
  int status = 0;
  if (waitpid(pid, &status, 0) != pid) return -1;
  return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

// The other side of a new terminal, which has no path in the root that the test is in.
Fd OpenTerminal(const Outside& outside) {
  const int unlocked = 0;
  Fd terminal(openat(outside.root_fd, "dev/ptmx", O_RDWR | O_NOCTTY | O_CLOEXEC));
  if (terminal.Get() < 0 || ioctl(terminal.Get(), TIOCSPTLCK, &unlocked) != 0) {
    throw std::runtime_error(std::string("no terminal: ") + std::strerror(errno));
  }
  return terminal;
}

void SetColumns(int terminal, int columns) {
  winsize size{};
  size.ws_row = kRows;
  size.ws_col = static_cast<unsigned short>(columns);
  ioctl(terminal, TIOCSWINSZ, &size);
}

pid_t StartIn(int terminal, const Outside& outside, const std::vector<std::string>& arguments,
              const Environment& environment) {
  const Fd side(ioctl(terminal, TIOCGPTPEER, O_RDWR | O_NOCTTY | O_CLOEXEC));
  return Start(outside, arguments, environment, side.Get(), side.Get(), side.Get());
}

struct Pipe {
  Pipe() {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0) throw std::runtime_error("no pipe");
    read_end = std::make_unique<Fd>(ends[0]);
    write_end = std::make_unique<Fd>(ends[1]);
  }
  std::unique_ptr<Fd> read_end;
  std::unique_ptr<Fd> write_end;
};

}  // namespace

Finished RunTool(const Outside& outside, const std::vector<std::string>& arguments,
                 const Environment& environment) {
  const Pipe in, out, err;
  const pid_t pid = Start(outside, arguments, environment, in.read_end->Get(), out.write_end->Get(),
                          err.write_end->Get());
  for (const Pipe* pipe : {&in, &out, &err}) pipe->write_end->Close();
  Finished finished;
  std::thread errors([&] { finished.err = ReadToEnd(err.read_end->Get()); });
  finished.out = ReadToEnd(out.read_end->Get());
  errors.join();
  finished.status = StatusOf(pid);
  return finished;
}

ToolInTerminal::ToolInTerminal(const Outside& outside, int columns,
                               const std::vector<std::string>& arguments,
                               const Environment& environment)
    : terminal_(OpenTerminal(outside)) {
  SetColumns(terminal_.Get(), columns);
  pid_ = StartIn(terminal_.Get(), outside, arguments, environment);
}

ToolInTerminal::~ToolInTerminal() {
  if (pid_ < 0) return;
  kill(pid_, SIGKILL);
  waitpid(pid_, nullptr, 0);
}

bool ToolInTerminal::ReadMore() {
  char buffer[4096];
  const ssize_t size = read(terminal_.Get(), buffer, sizeof(buffer));
  if (size > 0) output_.append(buffer, static_cast<std::size_t>(size));
  return size > 0;  // the kernel reports the end of a terminal as an error
}

bool ToolInTerminal::ReadUntil(const std::string& text) {
  while (output_.find(text) == std::string::npos) {
    if (!ReadMore()) return false;
  }
  return true;
}

void ToolInTerminal::Type(const std::string& text) const {
  if (write(terminal_.Get(), text.data(), text.size()) < 0) {
    throw std::runtime_error("the terminal is closed");
  }
}

void ToolInTerminal::Resize(int columns) const { SetColumns(terminal_.Get(), columns); }

void ToolInTerminal::Signal(int signal) const { kill(pid_, signal); }

int ToolInTerminal::Wait() {
  while (ReadMore()) {
  }
  const int status = StatusOf(pid_);
  pid_ = -1;
  return status;
}

termios ToolInTerminal::Settings() const {
  termios settings{};
  tcgetattr(terminal_.Get(), &settings);
  return settings;
}

}  // namespace test
