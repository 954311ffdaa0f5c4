// The system log of a device root: prints what syslog(3) sends to its /dev/log, a line a message,
// until SIGTERM or SIGINT.
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <stdexcept>

#include "program.h"

namespace {

constexpr char kSocket[] = "/dev/log";
constexpr std::size_t kMaxMessage = 256 * 1024;

volatile std::sig_atomic_t stopped = 0;

int Bind() {
  const int fd = socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, kSocket, sizeof(address.sun_path) - 1);
  unlink(kSocket);
  if (fd < 0 || bind(fd, reinterpret_cast<sockaddr*>(&address), sizeof(address)) != 0 ||
      chmod(kSocket, 0666) != 0) {
    throw std::runtime_error(std::string("cannot bind ") + kSocket + ": " + std::strerror(errno));
  }
  return fd;
}

void StopOn(int signal) {
  struct sigaction action {};
  action.sa_handler = [](int) { stopped = 1; };
  sigaction(signal, &action, nullptr);  // without SA_RESTART: ends the recv below
}

}  // namespace

int main(int argc, char** argv) {
  CLI::App app("Prints the system log of a device root", "device_log");
  return example::Run(app, argc, argv, [] {
    StopOn(SIGTERM);
    StopOn(SIGINT);
    const int fd = Bind();
    std::string message(kMaxMessage, '\0');
    while (stopped == 0) {
      const ssize_t size = recv(fd, message.data(), message.size(), 0);
      if (size > 0) std::cout << message.substr(0, static_cast<std::size_t>(size)) << std::endl;
    }
    unlink(kSocket);
    close(fd);
  });
}
