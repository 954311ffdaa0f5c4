#include "host/searchd/index.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <unistd.h>

#include <atomic>
#include <csignal>
#include <filesystem>
#include <functional>
#include <string>
#include <vector>

#include "host/searchd/index_reader.h"
#include "host/searchd/json_text.h"
#include "host/searchd/language.h"
#include "host/searchd/mapping.h"
#include "host/searchd/request_error.h"
#include "tests/support/device_root_test.h"

namespace searchd {
namespace {

namespace fs = std::filesystem;

constexpr char kPath[] = "/var/packages/Velkor/etc/indexes/enu";
constexpr char kBackup[] = "/tmp/backup";

class IndexTest : public test::DeviceRootTest {
 protected:
  IndexTest() {
    PrepareIndexDirectory(kPath, false);
    index_ = std::make_unique<Index>(
        IndexDefinition{"appindex_enu", kPath, ParseJson(R"({"property_id":"id"})")}, checks_,
        DatabaseCheck::Files::kMade, crowded_);
  }

  static std::string File(const std::string& name) { return std::string(kPath) + "/" + name; }

  void Upsert(const std::string& id) {
    const Json::Value document = ParseJson(R"({"id":")" + id + R"("})");
    index_->Upsert(id, document, 100);
  }

  // As the daemon does when no request comes for a moment: changes are on their way to the files.
  void UpsertMany() {
    for (int i = 0; i < 100; ++i) Upsert("new" + std::to_string(i));
    while (index_->HasWork()) index_->DoWork();
  }

  // What `call` fails with; fails the test when it does not.
  static RequestError FailureOf(const std::function<void()>& call) {
    try {
      call();
    } catch (const RequestError& e) {
      return e;
    }
    ADD_FAILURE() << "nothing failed";
    return {Code::kRejected, ""};
  }

  CheckProcess checks_{STDERR_FILENO};
  std::atomic<int> crowded_ = 0;
  std::unique_ptr<Index> index_;
};

// Whoever answers clients must not be the one to apply what too many of them have asked for.
TEST_F(IndexTest, IsCrowdedWhileTooManyChangesWait) {
  EXPECT_EQ(crowded_, 0);
  for (int i = 0; i < 63; ++i) Upsert("new" + std::to_string(i));
  EXPECT_EQ(crowded_, 0);
  Upsert("last");
  EXPECT_EQ(crowded_, 1);
  index_->Commit();
  EXPECT_EQ(crowded_, 0);
  EXPECT_EQ(index_->DocumentCount(), 64U);
}

TEST_F(IndexTest, IsCrowdedWhileTooLargeChangesWait) {
  index_->Upsert("large", ParseJson(R"({"id":"large"})"), 8 * 1024 * 1024);
  EXPECT_EQ(crowded_, 1);
  index_->ApplyChanges();
  EXPECT_EQ(crowded_, 0);
}

TEST_F(IndexTest, KeepsUncommittedChangesOverAReopening) {
  UpsertMany();
  index_->Reopen();
  EXPECT_EQ(index_->DocumentCount(), 0U);
  index_->Commit();
  EXPECT_EQ(index_->DocumentCount(), 100U);
  Upsert("one more");
  index_->Commit();
  EXPECT_EQ(index_->DocumentCount(), 101U);
}

TEST_F(IndexTest, SeesFilesThatSomebodyHasReplaced) {
  Upsert("old");
  index_->Commit();
  fs::copy(kPath, kBackup);
  UpsertMany();
  index_->Commit();
  EXPECT_EQ(index_->DocumentCount(), 101U);
  fs::remove_all(kPath);
  fs::copy(kBackup, kPath);
  EXPECT_EQ(index_->DocumentCount(), 1U);
  Upsert("new");
  index_->Commit();
  EXPECT_EQ(index_->DocumentCount(), 2U);
}

TEST_F(IndexTest, GivesUpUncommittedChangesToReplacedFilesAndSaysSoOnce) {
  Upsert("old");
  index_->Commit();
  fs::copy(kPath, kBackup);
  UpsertMany();
  fs::remove_all(kPath);
  fs::copy(kBackup, kPath);
  const RequestError failure = FailureOf([&] { index_->Commit(); });
  EXPECT_EQ(failure.GetCode(), Code::kStorage);
  EXPECT_NE(std::string(failure.what()).find(kPath), std::string::npos) << failure.what();
  EXPECT_EQ(index_->DocumentCount(), 1U);
  Upsert("new");
  index_->Commit();
  EXPECT_EQ(index_->DocumentCount(), 2U);
}

TEST_F(IndexTest, SaysWithTheNextChangeWhatWasLostInAPause) {
  Upsert("old");
  index_->Commit();
  fs::copy(kPath, kBackup);
  Upsert("lost");
  index_->ApplyChanges();
  fs::remove_all(kPath);
  fs::copy(kBackup, kPath);
  ASSERT_TRUE(index_->HasWork());
  index_->DoWork();
  const RequestError failure = FailureOf([&] { Upsert("new"); });
  EXPECT_EQ(failure.GetCode(), Code::kStorage);
  EXPECT_NE(std::string(failure.what()).find("uncommitted changes were lost"), std::string::npos)
      << failure.what();
  Upsert("new");
  index_->Commit();
  EXPECT_EQ(index_->DocumentCount(), 2U);
}

// What is beyond the limit on a file's size fails as on a full disk.
TEST_F(IndexTest, SaysWithTheNextChangeWhatAFullDiskHasLost) {
  const auto expect_loss = [&](rlim_t most_bytes, const std::function<void()>& work) {
    rlimit usual{};
    ASSERT_EQ(getrlimit(RLIMIT_FSIZE, &usual), 0);
    const rlimit full{most_bytes, usual.rlim_max};
    ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &full), 0);
    work();
    ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &usual), 0);
    const RequestError failure = FailureOf([&] { Upsert("new"); });
    EXPECT_EQ(failure.GetCode(), Code::kStorage);
    EXPECT_NE(
        std::string(failure.what()).find("uncommitted changes were lost: " + std::string(kPath)),
        std::string::npos)
        << failure.what();
  };
  std::signal(SIGXFSZ, SIG_IGN);
  Upsert("lost");
  expect_loss(1, [&] { index_->ApplyChanges(); });  // making the first files
  Upsert("old");
  index_->Commit();
  for (int i = 0; i < 1000; ++i) Upsert("lost" + std::to_string(i));
  index_->ApplyChanges();
  expect_loss(10000, [&] { index_->DoWork(); });  // writing to them
  Upsert("new");
  index_->Commit();
  EXPECT_EQ(index_->DocumentCount(), 2U);
}

// Each commit may write over what only older states of the files need.
TEST_F(IndexTest, ASearchThatCommitsHaveOvertakenStartsAgain) {
  // Every time with other words, and enough of them for tables of many blocks.
  const auto commit = [&](int time) {
    for (int i = 0; i < 40; ++i) {
      const std::string id = "id" + std::to_string(i);
      std::string title = "time" + std::to_string(time);
      for (int word = 0; word < 50; ++word)
        title += " w" + std::to_string((i * 50 + word) * 7 + time);
      index_->Upsert(id, ParseJson(R"({"id":")" + id + R"(","title":")" + title + "\"}"), 1000);
    }
    index_->Commit();
  };
  commit(0);
  DatabaseCheck check(kPath, checks_, DatabaseCheck::Files::kFound);
  const Mapping mapping = Mapping::Parse(index_->Definition().mappings);
  IndexReader reader(kPath, mapping, LanguageOfIndex("appindex_enu"), check);
  EXPECT_EQ(reader.DocumentCount(), 40U);
  for (int time = 1; time <= 5; ++time) commit(time);
  SearchRequest request;
  request.query = "time5";
  EXPECT_EQ(reader.Search(request).total, 40U);
}

TEST_F(IndexTest, TakesChangesAgainOnceItIsRestored) {
  Upsert("old");
  index_->Commit();
  fs::copy(kPath, kBackup);
  fs::resize_file(File("postlist.glass"), 100);
  EXPECT_EQ(FailureOf([&] { index_->Commit(); }).GetCode(), Code::kStorage);
  EXPECT_EQ(FailureOf([&] { Upsert("new"); }).GetCode(), Code::kStorage);
  fs::remove_all(kPath);
  fs::copy(kBackup, kPath);
  Upsert("new");
  index_->Commit();
  EXPECT_EQ(index_->DocumentCount(), 2U);
}

// Another thread may have found it just before it was deleted.
TEST_F(IndexTest, IsUnknownToWhoeverStillHoldsItOnceItIsClosed) {
  Upsert("old");
  index_->Commit();
  EXPECT_EQ(index_->DocumentCount(), 1U);
  Upsert("waiting");
  index_->Close();
  for (const std::function<void()>& use : std::vector<std::function<void()>>{
           [&] { Upsert("new"); }, [&] { index_->Delete("old"); }, [&] { index_->Commit(); },
           [&] { index_->DocumentCount(); }, [&] { index_->Search({}); }}) {
    EXPECT_EQ(FailureOf(use).GetCode(), Code::kNoSuchIndex);
  }
  index_->Reopen();
  index_->ApplyChanges();
  EXPECT_FALSE(index_->HasWork());
}

TEST_F(IndexTest, NeverCommitsOverDamage) {
  for (const char* name : {"iamglass", "postlist.glass", "docdata.glass", "termlist.glass"}) {
    Upsert("old");
    index_->Commit();
    UpsertMany();
    fs::resize_file(File(name), fs::file_size(File(name)) / 3);
    for (int i = 0; i < 2; ++i) {
      const RequestError failure = FailureOf([&] { index_->Commit(); });
      EXPECT_EQ(failure.GetCode(), Code::kStorage) << name;
      EXPECT_NE(std::string(failure.what()).find(File(name)), std::string::npos) << failure.what();
    }
    EXPECT_EQ(FailureOf([&] { Upsert("new"); }).GetCode(), Code::kStorage) << name;
    EXPECT_EQ(FailureOf([&] { index_->DocumentCount(); }).GetCode(), Code::kStorage) << name;
    index_->Close();
    PrepareIndexDirectory(kPath, true);
    const IndexDefinition definition = index_->Definition();
    index_ = std::make_unique<Index>(definition, checks_, DatabaseCheck::Files::kMade, crowded_);
  }
}

TEST_F(IndexTest, NeverCommitsThroughALink) {
  Upsert("old");
  index_->Commit();
  UpsertMany();
  fs::rename(kPath, "/tmp/elsewhere");
  fs::create_directory_symlink("/tmp/elsewhere", kPath);
  const fs::file_time_type before = fs::last_write_time("/tmp/elsewhere");
  EXPECT_EQ(FailureOf([&] { index_->Commit(); }).GetCode(), Code::kStorage);
  EXPECT_EQ(fs::last_write_time("/tmp/elsewhere"), before);
}

// Another process that has the index open for writing.
class Holder {
 public:
  Holder() : fd_(open(File().c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600)) {
    struct flock lock {};
    lock.l_type = F_WRLCK;
    lock.l_len = 1;
    if (fcntl(fd_, F_OFD_SETLK, &lock) != 0) ADD_FAILURE() << "cannot lock " << File();
  }
  ~Holder() { close(fd_); }
  Holder(const Holder&) = delete;
  Holder& operator=(const Holder&) = delete;

 private:
  static std::string File() { return std::string(kPath) + "/flintlock"; }

  int fd_;
};

TEST_F(IndexTest, LosesNothingWhileAnotherProcessHoldsIt) {
  {
    const Holder holder;
    Upsert("one");
    index_->ApplyChanges();
    EXPECT_EQ(FailureOf([&] { index_->Commit(); }).GetCode(), Code::kBusy);
    index_->DoWork();
    EXPECT_FALSE(index_->HasWork()) << "it must not be tried again without end";
    Upsert("two");
    EXPECT_EQ(FailureOf([&] { index_->Commit(); }).GetCode(), Code::kBusy);
    const RequestError failure = FailureOf([&] {
      for (int i = 0; i < 1000; ++i) Upsert("many" + std::to_string(i));
    });
    EXPECT_EQ(failure.GetCode(), Code::kBusy) << "what waits must have an end";
  }
  index_->Commit();
  EXPECT_GE(index_->DocumentCount(), 3U);
  EXPECT_LT(index_->DocumentCount(), 1000U);
}

}  // namespace
}  // namespace searchd
