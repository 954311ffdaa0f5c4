// What the search daemon tells the system log.
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

class SearchdLog : public SearchdTest {
 protected:
  void SetUp() override {
    SearchdTest::SetUp();
    fs::create_directories(root_ / "dev");
    log_ = std::make_unique<DatagramSocket>(root_ / "dev/log");
  }

  // The lines up to the one that holds `text`, without priority, time and name.
  std::vector<std::string> LinesUntil(const std::string& text) const {
    std::vector<std::string> lines = log_->ReadUntil(text);
    for (std::string& line : lines) line.erase(0, line.find("]: ") + 3);
    return lines;
  }

  static void ReplaceByAFullDirectory(const fs::path& file) {
    fs::remove(file);
    fs::create_directories(file / "precious");
  }

  std::unique_ptr<DatagramSocket> log_;
};

TEST_F(SearchdLog, HasOneLineForEachEvent) {
  Start();
  Create("enu");
  Delete("enu");
  daemon_->Stop(SIGTERM);
  EXPECT_EQ(LinesUntil("stopped"),
            (std::vector<std::string>{
                "started, 0 indexes",
                "index created: appindex_enu in " + std::string(kIndexes) + "enu",
                "index deleted: appindex_enu",
                "stopped",
            }));
}

TEST_F(SearchdLog, HasNoLineForDocumentsCommitsAndSearches) {
  Start();
  Create("enu");
  LinesUntil("index created");
  for (int i = 0; i < 200; ++i) Upsert("enu", Document(std::to_string(i), "File"));
  for (int i = 0; i < 3; ++i) {
    Upsert("enu", Document(std::to_string(i), "Committed File"));
    Commit("enu");
  }
  for (int i = 0; i < 50; ++i) EXPECT_NE(Find("enu", "file"), "");
  daemon_->Stop(SIGTERM);
  EXPECT_EQ(LinesUntil("stopped"), std::vector<std::string>{"stopped"});
}

TEST_F(SearchdLog, HasNoLineForWhatIsTheClientsFault) {
  Start();
  LinesUntil("started");
  EXPECT_EQ(Find("enu", "file"), "601");
  EXPECT_EQ(CodeOf(FromText(AskText("nonsense"))), 603);
  EXPECT_EQ(CodeOf(Ask(CreateRequest("appindex_enu", "/etc"))), 606);
  daemon_->Stop(SIGTERM);
  EXPECT_EQ(LinesUntil("stopped"), std::vector<std::string>{"stopped"});
}

TEST_F(SearchdLog, HasOneLineForADamagedIndexHoweverOftenItIsAsked) {
  Start();
  Fill("enu");
  daemon_->Stop(SIGTERM);
  LinesUntil("stopped");
  fs::resize_file(IndexFile("enu", "postlist.glass"), 100);
  Start();
  for (int i = 0; i < 20; ++i) {
    EXPECT_EQ(Find("enu", "file"), "605");
    EXPECT_EQ(CodeOf(Ask(UpsertRequest("appindex_enu", Document("a", "A")))), 605);
  }
  daemon_->Stop(SIGTERM);
  int lines = 0;
  for (const std::string& line : LinesUntil("stopped")) {
    if (line.find("postlist.glass") != std::string::npos) ++lines;
  }
  EXPECT_EQ(lines, 1);
}

TEST_F(SearchdLog, HasOneLineForADamagedRegistryHoweverOftenItsIndexesAreAsked) {
  Start();
  Fill("enu");
  daemon_->Stop(SIGTERM);
  LinesUntil("stopped");
  WriteFileOf(RegistryFile(), "{");
  Start();
  for (int i = 0; i < 20; ++i) EXPECT_EQ(Find("enu", "file"), "605");
  daemon_->Stop(SIGTERM);
  const std::vector<std::string> lines = LinesUntil("stopped");
  ASSERT_EQ(lines.size(), 3U) << "the registry, the start, the stop";
  EXPECT_NE(lines[0].find("indexes.json"), std::string::npos) << lines[0];
}

TEST_F(SearchdLog, NamesFilesOfADeletedIndexThatCannotBeRemoved) {
  Start();
  Fill("enu");
  ReplaceByAFullDirectory(IndexFile("enu", "postlist.glass"));
  Delete("enu");
  Fill("ger");  // its commit makes the deletion durable
  const std::string line = LinesUntil("files of a deleted index stay").back();
  EXPECT_NE(line.find("enu/postlist.glass"), std::string::npos) << line;
  Restart(SIGTERM);
  EXPECT_EQ(Find("enu", "file"), "601");
  EXPECT_EQ(Find("ger", "file"), "files");
}

// What a daemon leaves that is killed while it makes an index anew where it was deleted.
TEST_F(SearchdLog, NamesFilesThatCannotBeEmptiedAtTheStart) {
  Start();
  Fill("enu");
  Fill("ger");
  daemon_->Stop(SIGTERM);
  LinesUntil("stopped");
  WriteFileOf(IndexFile("enu", "tovoelasticd.emptied"), "");
  ReplaceByAFullDirectory(IndexFile("enu", "postlist.glass"));
  Start();
  const std::string line = LinesUntil("storage failure").back();
  EXPECT_NE(line.find("enu/postlist.glass"), std::string::npos) << line;
  EXPECT_EQ(Find("enu", "file"), "605");
  EXPECT_EQ(Find("ger", "file"), "files");
}

}  // namespace
}  // namespace test
