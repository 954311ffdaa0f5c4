// The system's search box: what a person sees for a few letters typed, in their language.
#include <appindex/elastic_control.h>
#include <appindex/utilities/json_helpers.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>

#include "host/framing.h"
#include "program.h"

namespace {

constexpr char kSocket[] = "/var/run/tovoelasticd.sock";
constexpr int kHitsShown = 3;

std::string Exchange(const std::string& request) {
  const int fd = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, kSocket, sizeof(address.sun_path) - 1);
  std::string reply;
  errno = 0;
  const bool done = fd >= 0 &&
                    connect(fd, reinterpret_cast<sockaddr*>(&address), sizeof(address)) == 0 &&
                    host::SendFrame(fd, request) && host::RecvFrame(fd, reply);
  const int failed_with = errno;
  if (fd >= 0) close(fd);
  if (!done) {
    throw std::runtime_error(std::string("no answer from the search daemon at ") + kSocket + ": " +
                             std::strerror(failed_with));
  }
  return reply;
}

Json::Value Search(const std::string& lang, const std::string& query) {
  Json::Value request;
  request["command"] = "search";
  request["data"]["id"] = velkor::appindex::elastic::GetAppIndexID(lang);
  request["data"]["query"] = query;
  request["data"]["limit"] = kHitsShown;
  Json::Value reply;
  if (!velkor::fromString(reply, Exchange(velkor::toString(request)))) {
    throw std::runtime_error("the search daemon's answer is not JSON");
  }
  if (!reply["success"].asBool()) throw std::runtime_error(reply["error"]["msg"].asString());
  return reply;
}

}  // namespace

int main(int argc, char** argv) {
  CLI::App app("Searches the installed applications", "search_box");
  std::string lang;
  std::string query;
  app.add_option("lang", lang, "Language code, such as ger")->required();
  app.add_option("query", query, "What the person typed")->required();
  return example::Run(app, argc, argv, [&] {
    const Json::Value reply = Search(lang, query);
    std::cout << "  [" << lang << "] " << query << "\n";
    for (const Json::Value& hit : reply["hits"]) {
      std::cout << "      " << hit["title"].asString() << "  (" << hit["id"].asString() << ")\n"
                << "        " << hit["desc"].asString() << "\n";
    }
    const Json::UInt64 total = reply["total"].asUInt64();
    if (total == 0) std::cout << "      nothing found\n";
    if (total > reply["hits"].size()) {
      std::cout << "      ... and " << total - reply["hits"].size() << " more\n";
    }
    std::cout << "\n";
  });
}
