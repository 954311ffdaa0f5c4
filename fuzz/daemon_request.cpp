// Requests to the search daemon, one a line, as its server hands them over, and what becomes of the
// indexes.
//
// The daemon works in the directory that TEISEIGATRO_FUZZ_ROOT names, as its root: everything below
// "/var/packages" in it goes after each input.
#include <json/value.h>
#include <unistd.h>
#include <xapian.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <map>
#include <memory>
#include <set>
#include <sstream>
#include <stdexcept>
#include <string>

#include "appindex/elastic_control_internal.h"
#include "appindex/utilities/json_helpers.h"
#include "fuzz/target.h"
#include "host/device_root.h"
#include "host/framing.h"
#include "host/searchd/catalog.h"
#include "host/searchd/check_process.h"
#include "host/searchd/dispatcher.h"
#include "host/searchd/folding.h"
#include "host/searchd/index_directory.h"
#include "host/searchd/json_text.h"
#include "host/searchd/terms.h"

namespace fuzz {
namespace {

namespace fs = std::filesystem;

constexpr char kPackages[] = "/var/packages";
constexpr char kState[] = "/var/lib/tovoelasticd";
constexpr char kRegistry[] = "/var/lib/tovoelasticd/indexes.json";

constexpr uid_t kRoot = 0;
constexpr uid_t kStranger = 12345;

// The index that every input finds, empty.
constexpr char kIndex[] = "appindex_ger";
constexpr char kIndexPath[] = "/var/packages/Velkor/etc/appindex.db/ger";

class Daemon {
 public:
  std::string Ask(const std::string& request, uid_t client) {
    searchd::Answer answer = dispatcher_.Handle(request, client);
    if (answer.after) answer.after();
    return answer.text;
  }

  void Rest() {
    while (dispatcher_.HasIdleWork()) dispatcher_.DoIdleWork();
  }

  // With nothing but the one index.
  void BeginAnew() {
    for (const auto& index : catalog_.All()) catalog_.Delete(index->Definition().id);
    catalog_.Save();
    for (const auto& entry : fs::directory_iterator(kPackages)) fs::remove_all(entry.path());
    catalog_.Create({kIndex, kIndexPath, velkor::appindex::elastic::GetAppIndexMappings()});
  }

 private:
  searchd::CheckProcess checks_{STDERR_FILENO};
  searchd::Catalog catalog_{kRegistry, checks_};
  searchd::Dispatcher dispatcher_{catalog_};
};

std::unique_ptr<Daemon> daemon_in_root;

// What the answers say that there is.
struct KnownIndex {
  std::string path;
  std::set<std::string> documents;
};
using KnownIndexes = std::map<std::string, KnownIndex>;

void HasHits(const Json::Value& reply) {
  Require(reply["total"].isUInt() && reply["hits"].isArray(), "a search tells total and hits");
  Require(reply["total"].asUInt() >= reply["hits"].size(), "no more hits are shown than found");
  for (const Json::Value& hit : reply["hits"]) {
    Require(hit.isObject() && hit["score"].isNumeric(), "a hit has a score");
  }
}

Json::Value Read(const std::string& text) {
  Require(text.size() <= host::kMaxFrameBytes, "a reply fits into a frame");
  Json::Value reply;
  Require(velkor::fromString(reply, text), "a reply is JSON");
  Require(searchd::ParseJson(text) == reply, "a reply is JSON as strict as that of requests");
  Require(reply.isObject() && reply["success"].isBool(), "a reply tells about success");
  if (!reply["success"].asBool()) {
    Require(reply["error"]["code"].isInt(), "a failure has a code");
    Require(!reply["error"]["msg"].asString().empty(), "a failure has a message");
  }
  if (reply.isMember("hits")) HasHits(reply);
  return reply;
}

// What a request that succeeded has changed. Returns whether it can have been any change.
bool Follow(KnownIndexes& known, const Json::Value& request) {
  const std::string command = request["command"].asString();
  const Json::Value& data = request["data"];
  const std::string id = data["id"].asString();
  if (command == "index_create") {
    known[id] = {searchd::CheckedIndexPath(data["path"].asString()), {}};
  } else if (command == "index_delete") {
    known.erase(id);
  } else if (command == "document_upsert_by_id") {
    known[id].documents.insert(data["doc_id"].asString());
  } else if (command == "document_del_by_id") {
    known[id].documents.erase(data["doc_id"].asString());
  } else {
    return false;
  }
  return true;
}

bool Changes(KnownIndexes& known, const std::string& line) {
  const Json::Value as_stranger = Read(daemon_in_root->Ask(line, kStranger));
  const Json::Value reply = Read(daemon_in_root->Ask(line, kRoot));
  if (!reply["success"].asBool()) {
    Require(!as_stranger["success"].asBool(), "a stranger may not do more than root");
    return false;
  }
  const bool is_change = Follow(known, searchd::ParseJson(line));
  Require(!is_change || !as_stranger["success"].asBool(), "a stranger changes nothing");
  return is_change;
}

Json::Value RequestFor(const char* command, const std::string& index) {
  Json::Value request(Json::objectValue);
  request["command"] = command;
  request["data"]["id"] = index;
  return request;
}

void HoldsItsDocuments(const std::string& id, const KnownIndex& index) {
  const std::string commit = velkor::toString(RequestFor("commit", id));
  Require(Read(daemon_in_root->Ask(commit, kRoot))["success"].asBool(),
          "what was accepted can be committed");
  if (!searchd::HoldsDatabase(index.path)) {
    Require(index.documents.empty(), "documents are in a database");
    return;
  }
  const Xapian::Database database(index.path);
  Require(database.get_doccount() == index.documents.size(), "there is each document, once");
  for (const std::string& document : index.documents) {
    Require(database.get_termfreq(searchd::KeyTerm(document)) == 1, "a document has its key");
  }
}

void HoldsWhatItSaid(const KnownIndexes& known) {
  daemon_in_root->Rest();
  for (const auto& [id, index] : known) HoldsItsDocuments(id, index);
  const Json::Value list = Read(daemon_in_root->Ask(R"({"command":"index_list"})", kStranger));
  Require(list["indexes"].size() == known.size(), "the indexes are those that were made");
  for (const Json::Value& entry : list["indexes"]) {
    const auto index = known.find(entry["id"].asString());
    Require(index != known.end() && entry["path"] == index->second.path,
            "an index is where it was made");
    Require(entry["documents"].asUInt() == index->second.documents.size(),
            "an index counts its documents");
  }
}

}  // namespace

void Prepare() {
  const char* root = std::getenv("TEISEIGATRO_FUZZ_ROOT");
  if (root == nullptr || fs::equivalent(root, "/")) {
    throw std::runtime_error("TEISEIGATRO_FUZZ_ROOT must name an empty directory");
  }
  searchd::LoadFolding();
  fs::create_directories(std::string(root) + kPackages);
  fs::create_directories(std::string(root) + kState);
  host::EnterDeviceRoot(root);
  daemon_in_root = std::make_unique<Daemon>();
  daemon_in_root->BeginAnew();
}

void Try(const std::string& input) {
  KnownIndexes known{{kIndex, {kIndexPath, {}}}};
  bool changed = false;
  std::istringstream lines(input);
  for (std::string line; std::getline(lines, line);) changed = Changes(known, line) || changed;
  if (!changed) return;
  HoldsWhatItSaid(known);
  daemon_in_root->BeginAnew();
}

}  // namespace fuzz
