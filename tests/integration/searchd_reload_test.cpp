// SIGHUP: the search daemon connects to the log anew and looks at the files of its indexes again.
#include <csignal>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "tests/support/datagram_socket.h"
#include "tests/support/searchd_test.h"

namespace test {
namespace {

namespace fs = std::filesystem;

class SearchdReload : public SearchdTest {
 protected:
  void SetUp() override {
    SearchdTest::SetUp();
    fs::create_directories(root_ / "dev");
    log_ = std::make_unique<DatagramSocket>(LogPath());
  }

  std::string LogPath() const { return root_ / "dev/log"; }

  // Sends SIGHUP and waits until it has been obeyed.
  void Reload() {
    kill(daemon_->Pid(), SIGHUP);
    log_->ReadUntil("reopened");
  }

  // Copies the files of an index, as a backup does, and back.
  void Backup(const std::string& language) const {
    fs::copy(IndexFile(language), root_ / "backup" / language, fs::copy_options::recursive);
  }
  void Restore(const std::string& language) const {
    fs::remove_all(IndexFile(language));
    fs::copy(root_ / "backup" / language, IndexFile(language), fs::copy_options::recursive);
  }

  std::unique_ptr<DatagramSocket> log_;
};

TEST_F(SearchdReload, ConnectsToTheLogAnew) {
  Start();
  log_->ReadUntil("started");
  // The old socket is still there for whoever holds a connection to it.
  fs::rename(LogPath(), root_ / "dev/log.old");
  DatagramSocket renewed(LogPath());
  kill(daemon_->Pid(), SIGHUP);
  const std::vector<std::string> lines = renewed.ReadUntil("reopened");
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_EQ(lines[0].rfind("<29>", 0), 0U) << "facility daemon, a notice: " << lines[0];
  EXPECT_NE(lines[0].find("tovoelasticd[" + std::to_string(daemon_->Pid()) + "]"),
            std::string::npos)
      << lines[0];
}

TEST_F(SearchdReload, SeesAnIndexThatWasRestored) {
  Start();
  Fill("enu");
  fs::create_directories(root_ / "backup");
  Backup("enu");
  Upsert("enu", Document("new", "New File"));
  Commit("enu");
  EXPECT_EQ(Find("enu", "new"), "new");
  Restore("enu");
  Reload();
  EXPECT_EQ(Find("enu", "new"), "");
  EXPECT_EQ(Find("enu", "file"), "files");

  Upsert("enu", Document("newer", "Newer File"));
  Commit("enu");
  EXPECT_EQ(Find("enu", "newer"), "newer");
  Restart(SIGKILL);
  EXPECT_EQ(Find("enu", "newer"), "newer");
}

TEST_F(SearchdReload, FindsADamagedIndex) {
  Start();
  Fill("enu");
  Fill("ger");
  fs::resize_file(IndexFile("enu", "postlist.glass"), 5000);
  kill(daemon_->Pid(), SIGHUP);
  const std::string line = log_->ReadUntil("an index cannot be used").back();
  EXPECT_NE(line.find("enu/postlist.glass"), std::string::npos) << line;
  EXPECT_EQ(line.rfind("<27>", 0), 0U) << "facility daemon, an error: " << line;
  const Json::Value reply = Ask(SearchRequest("appindex_enu", "file"));
  EXPECT_EQ(CodeOf(reply), 605);
  EXPECT_NE(MessageOf(reply).find("enu/postlist.glass"), std::string::npos) << reply;
  EXPECT_EQ(Find("ger", "file"), "files");
}

TEST_F(SearchdReload, UsesADamagedIndexThatWasRestored) {
  Start();
  Fill("enu");
  fs::create_directories(root_ / "backup");
  Backup("enu");
  fs::resize_file(IndexFile("enu", "postlist.glass"), 5000);
  EXPECT_EQ(Find("enu", "file"), "605");
  Restore("enu");
  Reload();
  EXPECT_EQ(Find("enu", "file"), "files");
  Upsert("enu", Document("new", "New File"));
  Commit("enu");
  EXPECT_EQ(Find("enu", "new"), "new");
}

TEST_F(SearchdReload, KeepsUncommittedChanges) {
  Start();
  Fill("enu");
  for (int i = 0; i < 100; ++i) Upsert("enu", Document("new" + std::to_string(i), "New"));
  Reload();
  EXPECT_EQ(Find("enu", "new"), "");
  EXPECT_EQ(Find("enu", "file"), "files");
  Commit("enu");
  const Json::Value reply = Ask(SearchRequest("appindex_enu", "new"));
  EXPECT_EQ(reply["total"].asInt(), 100);
}

}  // namespace
}  // namespace test
