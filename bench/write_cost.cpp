// What writing one document costs, measured against a bare connect, send, receive and close of the
// same bytes; and, for information, what it costs in Add with its pause taken out, which includes
// reading the descriptor and looking up the texts.
#include <appindex/elastic_control.h>
#include <appindex/index_mgr.h>
#include <appindex/utilities/json_helpers.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <csignal>
#include <cstring>
#include <mutex>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "bench/measure.h"
#include "host/device_root.h"
#include "host/framing.h"

// In place of the C library's: the pause is no part of the cost.
extern "C" __attribute__((visibility("default"))) int usleep(useconds_t /*microseconds*/) {
  return 0;
}

namespace {

constexpr char kSocket[] = "/var/run/tovoelasticd.sock";
constexpr char kReply[] = R"({"success":true})";
constexpr int kRounds = 51;
constexpr double kLimit = 1.5;

int Open() {
  const int fd = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  if (fd < 0) throw std::runtime_error("no socket");
  return fd;
}

sockaddr_un Address() {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strcpy(address.sun_path, kSocket);
  return address;
}

// A daemon that does nothing but answer; keeps the requests of the first run.
class Responder {
 public:
  Responder() : listener_(Open()) {
    sockaddr_un address = Address();
    unlink(kSocket);
    if (bind(listener_, reinterpret_cast<sockaddr*>(&address), sizeof(address)) != 0 ||
        listen(listener_, SOMAXCONN) != 0) {
      throw std::runtime_error("cannot listen");
    }
    thread_ = std::thread([this] { Serve(); });
  }
  ~Responder() {
    shutdown(listener_, SHUT_RDWR);
    thread_.join();
    close(listener_);
  }

  std::vector<std::string> TakeRequests() {
    const std::lock_guard<std::mutex> lock(mutex_);
    keep_ = false;
    return std::move(requests_);
  }

 private:
  void Serve() {
    for (;;) {
      const int fd = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
      if (fd < 0) return;
      std::string request;
      if (host::RecvFrame(fd, request)) host::SendFrame(fd, kReply);
      close(fd);
      const std::lock_guard<std::mutex> lock(mutex_);
      if (keep_) requests_.push_back(std::move(request));
    }
  }

  int listener_;
  std::mutex mutex_;
  bool keep_ = true;
  std::vector<std::string> requests_;
  std::thread thread_;
};

void BareExchange(const std::string& request) {
  const int fd = Open();
  const sockaddr_un address = Address();
  std::string reply;
  if (connect(fd, reinterpret_cast<const sockaddr*>(&address), sizeof(address)) != 0 ||
      !host::SendFrame(fd, request) || !host::RecvFrame(fd, reply)) {
    throw std::runtime_error("the bare exchange failed");
  }
  close(fd);
}

struct Write {
  std::string lang;
  Json::Value document;
};

std::vector<Write> WritesOf(const std::vector<std::string>& requests) {
  std::vector<Write> writes;
  for (const std::string& text : requests) {
    Json::Value request;
    if (!velkor::fromString(request, text)) throw std::runtime_error("a request is not JSON");
    const std::string id = request["data"]["id"].asString();
    writes.push_back({id.substr(id.find('_') + 1), request["data"]["data"]});
  }
  return writes;
}

}  // namespace

int main(int argc, char** argv) {
  CLI::App app("Cost of writing one document, against a bare exchange");
  std::string root;
  std::string descriptor;
  app.add_option("root", root, "A device root")->required();
  app.add_option("descriptor", descriptor, "Path of an index.conf in it")->required();
  CLI11_PARSE(app, argc, argv);

  host::EnterDeviceRoot(root);
  Responder responder;
  velkor::appindex::Add(descriptor, false);  // also fills the caches of texts
  const std::vector<std::string> requests = responder.TakeRequests();

  const std::vector<Write> writes = WritesOf(requests);

  std::vector<double> bare;
  std::vector<double> upsert;
  std::vector<double> add;
  for (int round = 0; round < kRounds; ++round) {
    bare.push_back(bench::SecondsOf([&] {
      for (const std::string& request : requests) BareExchange(request);
    }));
    upsert.push_back(bench::SecondsOf([&] {
      for (const Write& write : writes) {
        velkor::appindex::elastic::IndexUpsert(write.lang, write.document);
      }
    }));
    add.push_back(bench::SecondsOf([&] { velkor::appindex::Add(descriptor, false); }));
  }
  const double microseconds = 1e6 / static_cast<double>(requests.size());
  std::printf("bare exchange: %.1f us; upsert: %.1f us; in Add: %.1f us (%zu documents)\n",
              bench::Median(bare) * microseconds, bench::Median(upsert) * microseconds,
              bench::Median(add) * microseconds, requests.size());
  return bench::Judge("writing one document / bare exchange",
                      bench::Median(upsert) / bench::Median(bare), kLimit);
}
