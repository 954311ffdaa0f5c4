#include "tests/support/real_daemon.h"

#include <json/reader.h>
#include <json/writer.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <memory>
#include <stdexcept>

#include "host/framing.h"

namespace test {
namespace {

constexpr char kSocketPath[] = "/var/run/tovoelasticd.sock";

int Connect() {
  const int fd = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strcpy(address.sun_path, kSocketPath);
  if (fd < 0 || connect(fd, reinterpret_cast<sockaddr*>(&address), sizeof(address)) != 0) {
    if (fd >= 0) close(fd);
    throw std::runtime_error(std::string("cannot reach the daemon: ") + std::strerror(errno));
  }
  return fd;
}

// In the child: back to the root that holds the program, then the program.
[[noreturn]] void Run(int outside_fd, const std::string& outside_path, int ready_fd) {
  const std::string ready = std::to_string(ready_fd);
  if (fchdir(outside_fd) == 0 && chroot(".") == 0) {
    execl(TOVOELASTICD_PATH, "tovoelasticd", "--root", outside_path.c_str(), "--foreground",
          "--ready-fd", ready.c_str(), nullptr);
  }
  std::perror("cannot start " TOVOELASTICD_PATH);
  _exit(127);
}

}  // namespace

RealDaemon::RealDaemon(int outside_fd, const std::string& outside_path)
    : outside_fd_(outside_fd), outside_path_(outside_path) {
  Start();
}

RealDaemon::~RealDaemon() { Kill(); }

void RealDaemon::Start() {
  int ready[2];
  if (pipe(ready) != 0) throw std::runtime_error("no pipe");
  pid_ = fork();
  if (pid_ == 0) {
    close(ready[0]);
    Run(outside_fd_, outside_path_, ready[1]);
  }
  close(ready[1]);
  char byte = 0;
  const ssize_t size = read(ready[0], &byte, 1);
  close(ready[0]);
  if (size != 1) throw std::runtime_error("the daemon did not come up");
}

int RealDaemon::Stop() {
  kill(pid_, SIGTERM);
  int status = 0;
  waitpid(pid_, &status, 0);
  pid_ = -1;
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

void RealDaemon::Kill() {
  if (pid_ <= 0) return;
  kill(pid_, SIGKILL);
  waitpid(pid_, nullptr, 0);
  pid_ = -1;
}

Json::Value RealDaemon::Ask(const std::string& command, const Json::Value& data) {
  Json::Value request;
  request["command"] = command;
  request["data"] = data;
  const int fd = Connect();
  std::string reply;
  const bool done = host::SendFrame(fd, Json::writeString(Json::StreamWriterBuilder(), request)) &&
                    host::RecvFrame(fd, reply);
  close(fd);
  if (!done) throw std::runtime_error("no reply to " + command);
  const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
  Json::Value value;
  reader->parse(reply.data(), reply.data() + reply.size(), &value, nullptr);
  return value;
}

std::vector<std::string> RealDaemon::Search(const std::string& lang, const std::string& query) {
  Json::Value data;
  data["id"] = "appindex_" + lang;
  data["query"] = query;
  const Json::Value reply = Ask("search", data);
  if (!reply["success"].asBool()) throw std::runtime_error(reply.toStyledString());
  std::vector<std::string> ids;
  for (const Json::Value& hit : reply["hits"]) ids.push_back(hit["id"].asString());
  return ids;
}

}  // namespace test
