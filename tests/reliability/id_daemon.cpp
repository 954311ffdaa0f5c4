#include "tests/reliability/id_daemon.h"

#include <json/value.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>
#include <exception>
#include <stdexcept>
#include <vector>

#include "appindex/utilities/json_helpers.h"
#include "host/framing.h"
#include "tests/support/indexing.h"

namespace test {
namespace {

constexpr char kCommitted[] = "committed";  // the test's own command

[[noreturn]] void Fail(const char* what) {
  throw std::runtime_error(std::string(what) + ": " + std::strerror(errno));
}

int Socket(const std::string& path, int (*attach)(int, const sockaddr*, socklen_t)) {
  const int fd = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  if (path.size() >= sizeof(address.sun_path)) throw std::runtime_error("too long: " + path);
  std::strcpy(address.sun_path, path.c_str());
  if (fd < 0 || attach(fd, reinterpret_cast<sockaddr*>(&address), sizeof(address)) != 0) {
    Fail("the socket of the daemon of ids");
  }
  return fd;
}

class Server {
 public:
  [[noreturn]] void Run(int listener) {
    for (;;) {
      const int fd = accept4(listener, nullptr, nullptr, SOCK_CLOEXEC);
      if (fd < 0 && errno == EINTR) continue;
      if (fd < 0) Fail("accept");
      Handle(fd);
      close(fd);
    }
  }

 private:
  struct Change {
    bool removes;
    std::string document;
  };

  // A client that was killed in the middle of a request has asked for nothing.
  void Handle(int fd) {
    std::string text;
    if (!host::RecvFrame(fd, text)) return;
    Json::Value reply(Json::objectValue);
    reply["success"] = true;
    CarryOut(Parse(text), reply);
    host::SendFrame(fd, velkor::toString(reply));
  }

  void CarryOut(const Json::Value& request, Json::Value& reply) {
    const std::string command = request["command"].asString();
    const Json::Value& data = request["data"];
    const std::string index = data["id"].asString();
    if (command == "document_upsert_by_id" || command == "document_del_by_id") {
      changes_[index].push_back({command == "document_del_by_id", data["doc_id"].asString()});
    } else if (command == "commit") {
      Commit(index);
    } else if (command == kCommitted) {
      for (const auto& [id, documents] : committed_) {
        Json::Value& ids = reply["data"][id] = Json::arrayValue;
        for (const std::string& document : documents) ids.append(document);
      }
    }
  }

  void Commit(const std::string& index) {
    for (const Change& change : changes_[index]) {
      if (change.removes) {
        committed_[index].erase(change.document);
      } else {
        committed_[index].insert(change.document);
      }
    }
    changes_[index].clear();
  }

  std::map<std::string, std::vector<Change>> changes_;  // not committed
  std::map<std::string, std::set<std::string>> committed_;
};

}  // namespace

IdDaemon::IdDaemon(const std::string& root) : socket_(root + kSocket) {
  const int listener = Socket(socket_, bind);
  if (listen(listener, SOMAXCONN) != 0) Fail("the daemon of ids cannot listen");
  process_ = fork();
  if (process_ < 0) Fail("the daemon of ids cannot be started");
  if (process_ == 0) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    try {
      Server().Run(listener);
    } catch (const std::exception&) {
      _exit(1);
    }
  }
  close(listener);
}

IdDaemon::~IdDaemon() {
  kill(process_, SIGKILL);
  waitpid(process_, nullptr, 0);
  unlink(socket_.c_str());
}

std::map<std::string, std::set<std::string>> IdDaemon::Committed() const {
  const int fd = Socket(socket_, connect);
  std::string text;
  const bool answered =
      host::SendFrame(fd, std::string(R"({"command":")") + kCommitted + R"("})") &&
      host::RecvFrame(fd, text);
  close(fd);
  if (!answered) throw std::runtime_error("the daemon of ids does not answer");
  std::map<std::string, std::set<std::string>> committed;
  const Json::Value reply = Parse(text);
  for (const std::string& index : reply["data"].getMemberNames()) {
    std::set<std::string>& documents = committed[index];
    for (const Json::Value& document : reply["data"][index]) {
      documents.insert(document.asString());
    }
  }
  return committed;
}

}  // namespace test
