// What a full rebuild costs beyond its pauses, with the real search daemon.
#include <appindex/index_mgr.h>
#include <appindex/utilities/json_helpers.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <cstring>
#include <stdexcept>
#include <string>
#include <vector>

#include "bench/measure.h"
#include "host/device_root.h"
#include "host/framing.h"

namespace {

constexpr useconds_t kPauseMicroseconds = 10000;
constexpr int kPauses = 200;
constexpr double kLimit = 1.03;

// How many documents the daemon holds: one record in one language each.
double CountDocuments() {
  const int fd = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strcpy(address.sun_path, "/var/run/tovoelasticd.sock");
  std::string text;
  Json::Value reply;
  if (fd < 0 || connect(fd, reinterpret_cast<sockaddr*>(&address), sizeof(address)) != 0 ||
      !host::SendFrame(fd, R"({"command":"index_list","data":{}})") || !host::RecvFrame(fd, text) ||
      !velkor::fromString(reply, text)) {
    throw std::runtime_error("the search daemon does not list its indexes");
  }
  close(fd);
  double documents = 0;
  for (const Json::Value& index : reply["indexes"]) documents += index["documents"].asDouble();
  return documents;
}

}  // namespace

int main(int argc, char** argv) {
  CLI::App app("Cost of a full rebuild, against its pauses");
  std::string root;
  app.add_option("root", root, "A device root whose search daemon runs")->required();
  CLI11_PARSE(app, argc, argv);
  host::EnterDeviceRoot(root);

  std::vector<double> pauses;
  for (int i = 0; i < kPauses; ++i) {
    pauses.push_back(bench::SecondsOf([] { usleep(kPauseMicroseconds); }));
  }
  double pause = 0;
  for (const double seconds : pauses) pause += seconds / kPauses;

  const double rebuild = bench::SecondsOf([] { velkor::appindex::Reindex(); });
  const double expected = CountDocuments() * pause;
  std::printf("usleep(10000): %.0f us; rebuild: %.3f s, its pauses: %.3f s\n", pause * 1e6, rebuild,
              expected);
  return bench::Judge("Reindex / its pauses", rebuild / expected, kLimit);
}
