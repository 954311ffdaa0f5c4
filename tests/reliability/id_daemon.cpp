#include "tests/reliability/id_daemon.h"

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>

#include "host/framing.h"
#include "tests/support/indexing.h"

namespace test {
namespace {

int Listen() {
  const int fd = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strcpy(address.sun_path, kSocket);
  if (fd < 0 || bind(fd, reinterpret_cast<sockaddr*>(&address), sizeof(address)) != 0 ||
      listen(fd, SOMAXCONN) != 0) {
    throw std::runtime_error(std::string("cannot listen: ") + std::strerror(errno));
  }
  return fd;
}

}  // namespace

IdDaemon::IdDaemon() : listener_(Listen()), thread_([this] { Serve(); }) {}

IdDaemon::~IdDaemon() {
  shutdown(listener_, SHUT_RDWR);  // wakes the accept
  thread_.join();
  close(listener_);
  unlink(kSocket);
}

std::map<std::string, std::set<std::string>> IdDaemon::Committed() {
  const std::lock_guard<std::mutex> lock(mutex_);
  return committed_;
}

void IdDaemon::Serve() {
  for (;;) {
    const int fd = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
    if (fd < 0 && errno != EINTR) return;
    if (fd < 0) continue;
    Handle(fd);
    close(fd);
  }
}

// A client that was killed in the middle of a request has asked for nothing.
void IdDaemon::Handle(int fd) {
  std::string text;
  if (!host::RecvFrame(fd, text)) return;
  CarryOut(Parse(text));
  host::SendFrame(fd, R"({"success":true})");
}

void IdDaemon::CarryOut(const Json::Value& request) {
  const std::string command = request["command"].asString();
  const Json::Value& data = request["data"];
  const std::string index = data["id"].asString();
  const std::lock_guard<std::mutex> lock(mutex_);
  if (command == "document_upsert_by_id" || command == "document_del_by_id") {
    changes_[index].push_back({command == "document_del_by_id", data["doc_id"].asString()});
  } else if (command == "commit") {
    for (const Change& change : changes_[index]) {
      if (change.removes) {
        committed_[index].erase(change.document);
      } else {
        committed_[index].insert(change.document);
      }
    }
    changes_[index].clear();
  }
}

}  // namespace test
