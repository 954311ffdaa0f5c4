// What the search daemon keeps on disk, where, and what outlasts its end.
#include <sys/resource.h>
#include <sys/stat.h>

#include <csignal>
#include <filesystem>
#include <functional>
#include <string>
#include <vector>

#include "tests/support/searchd_test.h"

namespace test {
namespace {

namespace fs = std::filesystem;

class SearchdStorage : public SearchdTest {};

TEST_F(SearchdStorage, KeepsIndexesWhereTheyBelong) {
  Start();
  const auto code = [&](const std::string& path) {
    return CodeOf(Ask(CreateRequest("appindex_x", path)));
  };
  EXPECT_EQ(code("/etc/passwd"), 606);
  EXPECT_EQ(code("var/packages/a"), 606);
  EXPECT_EQ(code("/var/packages"), 606);
  EXPECT_EQ(code("/var/packages/"), 603);
  EXPECT_EQ(code("/var/packages/../../etc/x"), 603);
  EXPECT_EQ(code("/var/packages/a//b"), 603);
  EXPECT_EQ(code("/var/packages/a/./b"), 603);
  EXPECT_EQ(code("/var/packages/" + std::string(2000, 'a')), 603);

  fs::create_directory_symlink("/etc", Outside("/var/packages/link"));
  EXPECT_EQ(code("/var/packages/link/x"), 606);
  EXPECT_EQ(code("/var/packages/link"), 606);
  EXPECT_TRUE(fs::is_empty(root_ / "etc"));

  fs::create_directories(Outside("/var/packages/full"));
  WriteFileOf(Outside("/var/packages/full/thesis"), "precious");
  EXPECT_EQ(code("/var/packages/full"), 603);
  EXPECT_EQ(ReadFileOf(Outside("/var/packages/full/thesis")), "precious");

  Create("enu");
  EXPECT_EQ(code(std::string(kIndexes) + "enu"), 603);
  EXPECT_EQ(code(std::string(kIndexes) + "enu/"), 603);
  EXPECT_EQ(code(std::string(kIndexes) + "enu/sub"), 603);
  EXPECT_EQ(code("/var/packages/Velkor"), 603);
  struct stat status {};
  ASSERT_EQ(stat(IndexFile("enu").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777U, 0700U);
}

TEST_F(SearchdStorage, ClearsWhatAForgottenIndexLeft) {
  Start();
  Fill("enu");
  daemon_->Stop(SIGTERM);
  fs::remove(RegistryFile());
  Start();
  EXPECT_EQ(Find("enu", "file"), "601");
  Create("enu");
  EXPECT_EQ(Find("enu", "file"), "");
}

TEST_F(SearchdStorage, KnowsItsIndexesAfterARestart) {
  Start();
  Fill("enu");
  Create("ger");
  Restart(SIGTERM);
  EXPECT_EQ(Find("enu", "file"), "files");
  EXPECT_EQ(Find("ger", "file"), "");
  Upsert("ger", Document("b", "Datei"));
  Commit("ger");
  EXPECT_EQ(Find("ger", "datei"), "b");
}

TEST_F(SearchdStorage, KeepsWhatWasCommittedWhenKilled) {
  Start();
  Fill("enu");
  Restart(SIGKILL);
  EXPECT_EQ(Find("enu", "file"), "files");
}

TEST_F(SearchdStorage, LosesWhatWasNotCommittedWhenKilled) {
  Start();
  Fill("enu");
  Create("ger");
  Commit("enu");  // makes known for good that there is a second index
  // Enough to be applied before a commit asks for it.
  for (int i = 0; i < 100; ++i) {
    Upsert("enu", Document(std::to_string(i), "Xylophone"));
    Upsert("ger", Document(std::to_string(i), "Xylophone"));
  }
  Restart(SIGKILL);
  EXPECT_EQ(Find("enu", "xylophone"), "");
  EXPECT_EQ(Find("ger", "xylophone"), "");
  EXPECT_EQ(Find("enu", "file"), "files");
  Upsert("ger", Document("b", "Datei"));
  Commit("ger");
  EXPECT_EQ(Find("ger", "datei"), "b");
}

TEST_F(SearchdStorage, LosesNoCommittedChangeToADiskThatIsFull) {
  constexpr rlim_t kMostBytes = 300000;  // a file may have: what is beyond fails as on a full disk
  daemon_ = Launch({}, [] {
    const rlimit limit{kMostBytes, kMostBytes};
    setrlimit(RLIMIT_FSIZE, &limit);
  });
  ASSERT_TRUE(daemon_->IsReady());
  Fill("enu");
  int code = 0;
  for (int i = 0; i < 20 && code == 0; ++i) {
    std::string text;
    for (int word = 0; word < 3000; ++word) text += std::to_string(i * 100000 + word) + " ";
    const Json::Value large = Document(std::to_string(i), "Large", text);
    code = CodeOf(Ask(UpsertRequest("appindex_enu", large)));
  }
  if (code == 0) code = CodeOf(Ask(IdRequest("commit", "appindex_enu")));
  EXPECT_EQ(code, 605);
  EXPECT_EQ(Find("enu", "file"), "files");
  EXPECT_EQ(Find("enu", "large"), "");
  Restart(SIGTERM);
  EXPECT_EQ(Find("enu", "file"), "files");
  Upsert("enu", Document("a", "Xylophone"));
  Commit("enu");
  EXPECT_EQ(Find("enu", "xylophone"), "a");
}

TEST_F(SearchdStorage, KeepsToItsDirectoryWhenALinkIsPutInItsWay) {
  Start();
  for (const std::string id : {"deleted", "committed", "searched"}) {
    const std::string path = "/var/packages/" + id + "/index";
    ASSERT_EQ(CodeOf(Ask(CreateRequest(id, path))), 0);
    ASSERT_EQ(CodeOf(Ask(UpsertRequest(id, Document("files", "File Station")))), 0);
    ASSERT_EQ(CodeOf(Ask(IdRequest("commit", id))), 0);
    fs::rename(Outside("/var/packages/" + id), root_ / "etc" / id);
    fs::create_directory_symlink("/etc/" + id, Outside("/var/packages/" + id));
  }
  const auto before = fs::last_write_time(root_ / "etc/committed/index");
  Ask(UpsertRequest("committed", Document("new", "New")));
  EXPECT_EQ(CodeOf(Ask(IdRequest("commit", "committed"))), 605);
  EXPECT_EQ(fs::last_write_time(root_ / "etc/committed/index"), before);
  EXPECT_EQ(CodeOf(Ask(SearchRequest("searched", "file"))), 605);
  EXPECT_EQ(CodeOf(Ask(IdRequest("index_delete", "deleted"))), 0);
  Fill("enu");  // its commit makes the deletion durable
  EXPECT_TRUE(fs::exists(root_ / "etc/deleted/index/iamglass"));
  EXPECT_EQ(CodeOf(Ask(CreateRequest("deleted", "/var/packages/deleted/index"))), 606);
}

// What is put in place of the registry while no daemon runs.
struct RegistryDamage {
  const char* what;
  std::function<void(const fs::path& file)> happen;
};

std::vector<RegistryDamage> EveryRegistryDamage() {
  return {
      {"empty", [](const fs::path& file) { fs::resize_file(file, 0); }},
      {"half", [](const fs::path& file) { fs::resize_file(file, fs::file_size(file) / 2); }},
      {"an array", [](const fs::path& file) { WriteFileOf(file, "[]"); }},
      {"another format",
       [](const fs::path& file) { WriteFileOf(file, R"({"format":2,"indexes":[]})"); }},
      {"indexes that are none",
       [](const fs::path& file) { WriteFileOf(file, R"({"format":1,"indexes":[7]})"); }},
      {"an index elsewhere",
       [](const fs::path& file) {
         WriteFileOf(file, R"({"format":1,"indexes":[{"id":"a","path":"/etc/a",)"
                           R"("mappings":{"property_id":"id"}}]})");
       }},
      {"a directory",
       [](const fs::path& file) {
         fs::remove(file);
         fs::create_directory(file);
       }},
      {"what cannot be read",
       [](const fs::path& file) {
         fs::remove(file);
         fs::create_symlink(file.filename(), file);
       }},
      {"a FIFO",
       [](const fs::path& file) {
         fs::remove(file);
         ASSERT_EQ(mkfifo(file.c_str(), 0600), 0);
       }},
  };
}

TEST_F(SearchdStorage, SetsADamagedRegistryAside) {
  for (const RegistryDamage& damage : EveryRegistryDamage()) {
    SCOPED_TRACE(damage.what);
    Start();
    Fill("enu");
    Fill("ger");
    daemon_->Stop(SIGTERM);
    damage.happen(RegistryFile());
    Start();
    const Json::Value reply = Ask(SearchRequest("appindex_enu", "file"));
    EXPECT_EQ(CodeOf(reply), 605);
    EXPECT_NE(MessageOf(reply).find("indexes.json"), std::string::npos) << reply;
    EXPECT_TRUE(fs::exists(fs::symlink_status(RegistryFile() + ".damaged")));
    EXPECT_TRUE(Ask(IdRequest("index_list", ""))["indexes"].empty());
    Delete("enu");
    EXPECT_EQ(Find("enu", "file"), "601");
    EXPECT_EQ(Find("ger", "file"), "605") << "until it is deleted or created";
    Fill("enu");
    Fill("ger");
    Restart(SIGKILL);
    EXPECT_EQ(Find("enu", "file") + Find("ger", "file"), "filesfiles");
    Delete("enu");
    Delete("ger");
    daemon_->Stop(SIGTERM);
  }
}

}  // namespace
}  // namespace test
