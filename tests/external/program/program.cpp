// The library's main work on a device that is not the host: what it asks of the device, and what
// reaches the search daemon there. Prints what is wrong and returns 1, or returns 0.
//   tiny_program DIR     DIR is empty, and becomes the root of the device
#include <appindex/config.h>
#include <appindex/device_identity.h>
#include <appindex/elastic_control.h>
#include <appindex/error.h>
#include <appindex/index_mgr.h>
#include <appindex/utilities.h>

#include <cstdio>
#include <filesystem>
#include <fstream>
#include <set>
#include <string>
#include <vector>

#include "host/device_root.h"
#include "tests/external/device/tiny_device.h"

namespace {

constexpr char kClock[] = "/var/packages/Clock/index.conf";

int failures = 0;

void Expect(bool ok, const char* what) {
  if (ok) return;
  std::fprintf(stderr, "tiny_program: not true: %s\n", what);
  ++failures;
}

void WriteFile(const std::string& path, const std::string& content) {
  std::filesystem::create_directories(std::filesystem::path(path).parent_path());
  std::ofstream(path) << content;
}

void EnterDevice(const char* dir) {
  host::EnterDeviceRoot(dir);
  std::filesystem::create_directories("/usr/tovo/tovoman/webman/modules");
  std::filesystem::create_directories("/var/packages/Velkor/etc");
  std::filesystem::create_directories("/var/packages/Clock/texts");
  WriteFile("/var/run/tovoelasticd.sock", "");  // that it is there is all that is looked at
  WriteFile(kClock, R"({"app":"Clock","title":"clock:title","enable":{"platform":["tiny"]}})");
  WriteFile("/var/packages/Other/index.conf",
            R"({"app":"Other","title":"Other","disable":{"model":["one"]}})");
}

// What a call sends.
template <typename Call>
std::vector<Json::Value> SentBy(const Call& call) {
  tiny::TheDevice().sent.clear();
  call();
  std::vector<Json::Value> requests;
  for (const std::string& message : tiny::TheDevice().sent) {
    Expect(velkor::fromString(requests.emplace_back(), message), "each message is JSON");
  }
  return requests;
}

void CheckAdd() {
  const std::set<std::string>& langs = velkor::appindex::GetSupportedLangs();
  Expect(langs.size() == 21, "there are 21 languages");
  const auto sent = SentBy([] { velkor::appindex::Add(kClock, true); });
  Expect(sent.size() == 2 * langs.size(), "a document and a commit for each language");
  if (failures != 0) return;
  auto request = sent.begin();
  for (const std::string& lang : langs) {
    const Json::Value upsert = *request++;
    const Json::Value commit = *request++;
    const char* title = lang == "ger" ? "Kleine Uhr" : "Small clock";
    Expect(upsert["command"] == "document_upsert_by_id", "a document comes first");
    Expect(upsert["data"]["id"] == "appindex_" + lang, "it goes into the language's index");
    Expect(upsert["data"]["data"]["title"] == title, "it has the device's text");
    Expect(commit["command"] == "commit", "a commit comes second");
    Expect(commit["data"]["id"] == "appindex_" + lang, "it is the same index's");
  }
}

void CheckReindex() {
  const std::size_t langs = velkor::appindex::GetSupportedLangs().size();
  const auto sent = SentBy([] { velkor::appindex::Reindex(); });
  // Delete, create, the document of the one application that this device shows, commit.
  Expect(sent.size() == 4 * langs, "a rebuild leaves out what the device's filter excludes");
  Expect(velkor::appindex::Config().indexed_version == "tiny-1.0", "the device's version is kept");
  Expect(tiny::TheDevice().acted == std::vector<std::string>{"root"}, "as the device's root");
}

void CheckFiles() {
  WriteFile("/tmp/a", "text");
  Expect(velkor::CPFile("/tmp/a", "/tmp/b") && velkor::IsFileExist("/tmp/a"), "a copy");
  Expect(velkor::MVFile("/tmp/b", "/tmp/c") && !velkor::IsFileExist("/tmp/b"), "a move");
  Expect(std::filesystem::file_size("/tmp/c") == 4, "the content comes along");
  Expect(velkor::CheckACLPerm("/tmp/c", 4) && !velkor::CheckACLPerm("/tmp/b", 4), "permissions");
  Expect(!velkor::IsMountPoint("/tmp"), "no mount point");
  Expect(velkor::ChownVelkor("/tmp/c"), "the packages' user");
}

void CheckSilentDaemon() {
  tiny::TheDevice().listening = false;
  try {
    velkor::appindex::Del(kClock, true);
    Expect(false, "a daemon that takes no connection is an error");
  } catch (const velkor::Error& error) {
    Expect(error.code == velkor::Error::kElasticdRequestError, "which says so");
  }
}

}  // namespace

int main(int, char** argv) {
  EnterDevice(argv[1]);
  CheckAdd();
  CheckReindex();
  CheckFiles();
  CheckSilentDaemon();
  return failures == 0 ? 0 : 1;
}
