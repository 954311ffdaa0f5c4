#include "bench/speed/daemon.h"

#include <appindex/elastic_control.h>
#include <appindex/utilities/json_helpers.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <atomic>
#include <cstring>
#include <memory>
#include <stdexcept>
#include <thread>

#include "appindex/elastic_control_internal.h"
#include "host/framing.h"
#include "host/sdk/unique_fd.h"

namespace bench {
namespace {

namespace elastic = velkor::appindex::elastic;

constexpr char kDone[] = R"({"success":true})";
constexpr unsigned kClients = 2;

class Connection {
 public:
  Connection() : fd_(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::strcpy(address.sun_path, elastic::kElasticdSockPath);
    if (!fd_.IsOpen() ||
        connect(fd_.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof(address)) != 0) {
      throw std::runtime_error("the search daemon does not run");
    }
  }
  int Get() const { return fd_.Get(); }

 private:
  const host::sdk::UniqueFd fd_;
};

std::string Request(const char* command, const Json::Value& data) {
  Json::Value request(Json::objectValue);
  request["command"] = command;
  request["data"] = data;
  return velkor::toString(request);
}

Json::Value DataFor(const std::string& lang) {
  Json::Value data(Json::objectValue);
  data["id"] = elastic::GetAppIndexID(lang);
  return data;
}

// Takes one request after the other from those that all clients share.
class Client {
 public:
  Client(const std::vector<std::string>& requests, std::atomic<std::size_t>& next)
      : requests_(requests), next_(next), thread_([this] { Run(); }) {}

  // Returns what went wrong; empty when nothing did.
  std::string Join() {
    thread_.join();
    return failure_;
  }

 private:
  void Run() {
    try {
      for (std::size_t i = next_++; i < requests_.size(); i = next_++) {
        const std::string reply = Exchange(requests_[i]);
        if (reply != kDone) throw std::runtime_error("the daemon refuses: " + reply);
      }
    } catch (const std::exception& e) {
      failure_ = e.what();
    }
  }

  const std::vector<std::string>& requests_;
  std::atomic<std::size_t>& next_;
  std::string failure_;
  std::thread thread_;
};

}  // namespace

std::string Exchange(const std::string& request) {
  const Connection connection;
  std::string reply;
  if (!host::SendFrame(connection.Get(), request) || !host::RecvFrame(connection.Get(), reply)) {
    throw std::runtime_error("the search daemon does not answer");
  }
  return reply;
}

Json::Value Ask(const std::string& request) {
  const std::string text = Exchange(request);
  Json::Value reply;
  if (!velkor::fromString(reply, text) || !reply["success"].asBool()) {
    throw std::runtime_error("the daemon refuses: " + text);
  }
  return reply;
}

pid_t DaemonProcess() {
  const Connection connection;
  ucred peer{};
  socklen_t size = sizeof(peer);
  if (getsockopt(connection.Get(), SOL_SOCKET, SO_PEERCRED, &peer, &size) != 0) {
    throw std::runtime_error("no peer");
  }
  return peer.pid;
}

std::string UpsertRequest(const std::string& lang, const Json::Value& document) {
  return R"({"command":"document_upsert_by_id","data":{"id":)" +
         velkor::toString(elastic::GetAppIndexID(lang)) + R"(,"doc_id":)" +
         velkor::toString(document["id"]) + R"(,"data":)" + velkor::toString(document) + "}}";
}

std::string CommitRequest(const std::string& lang) { return Request("commit", DataFor(lang)); }

std::string SearchRequest(const std::string& lang, const std::string& query) {
  Json::Value data = DataFor(lang);
  data["query"] = query;
  data["limit"] = 20;
  return Request("search", data);
}

void SendAll(const std::vector<std::string>& requests) {
  std::atomic<std::size_t> next = 0;
  std::vector<std::unique_ptr<Client>> clients;
  for (unsigned i = 0; i < kClients; ++i) {
    clients.push_back(std::make_unique<Client>(requests, next));
  }
  std::string failure;
  for (const auto& client : clients) failure += client->Join();
  if (!failure.empty()) throw std::runtime_error(failure);
}

}  // namespace bench
