// Files of indexes that are damaged, before the search daemon starts and while it runs.
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <fstream>
#include <functional>
#include <string>
#include <vector>

#include "tests/support/searchd_test.h"

namespace test {
namespace {

namespace fs = std::filesystem;

constexpr const char* kMarker = "tovoelasticd.index";
constexpr const char* kVersionFile = "iamglass";

// Something that happens to a file of an index.
struct Damage {
  std::string name;  // of the index that it happens to: letters and digits
  std::string file;
  std::function<void(const fs::path& file)> happen;
};

void Truncate(const fs::path& file) { fs::resize_file(file, fs::file_size(file) / 2 + 1); }
void Empty(const fs::path& file) { fs::resize_file(file, 0); }
void Remove(const fs::path& file) { fs::remove(file); }

void OverwriteTheMiddle(const fs::path& file) {
  const auto size = static_cast<std::streamsize>(fs::file_size(file));
  std::fstream out(file, std::ios::binary | std::ios::in | std::ios::out);
  out.seekp(size / 4);
  const std::string noise = std::string("\xff\x00\x7f!", 4);
  for (std::streamsize at = 0; at < size / 2; at += 4) out << noise;
  ASSERT_TRUE(out.flush()) << file;
}

void ReplaceByADirectory(const fs::path& file) {
  fs::remove(file);
  fs::create_directory(file);
}

// Every damage to every file that must be there.
std::vector<Damage> EveryDamage() {
  std::vector<Damage> all;
  for (const std::string file :
       {"docdata.glass", "postlist.glass", "termlist.glass", kVersionFile}) {
    const std::string name = file.substr(0, file.find('.'));
    all.push_back({name + "truncated", file, Truncate});
    all.push_back({name + "emptied", file, Empty});
    all.push_back({name + "overwritten", file, OverwriteTheMiddle});
    all.push_back({name + "removed", file, Remove});
    all.push_back({name + "directory", file, ReplaceByADirectory});
  }
  all.push_back({"markerremoved", kMarker, Remove});
  return all;
}

class SearchdDamage : public SearchdTest {
 protected:
  // An index with enough in it to have a middle.
  void FillLarge(const std::string& name) const {
    Create(name);
    for (int i = 0; i < 60; ++i) {
      const std::string id = "files" + std::to_string(i);
      Upsert(name, Document(id, "File Station " + id, std::string(400, 'd'), "folder share " + id));
    }
    Commit(name);
  }

  void Happen(const Damage& damage) const { damage.happen(IndexFile(damage.name, damage.file)); }

  void ExpectDamaged(const Json::Value& reply, const Damage& damage) const {
    EXPECT_EQ(CodeOf(reply), 605) << damage.name << ": " << reply;
    EXPECT_NE(MessageOf(reply).find(kIndexes + damage.name), std::string::npos) << reply;
    EXPECT_NE(MessageOf(reply).find("/" + damage.file), std::string::npos)
        << damage.name << ": " << reply;
  }

  void ExpectUsableAgain(const std::string& name) const {
    Delete(name);
    Fill(name);
    EXPECT_EQ(Find(name, "file"), "files") << name;
  }
};

TEST_F(SearchdDamage, FoundAtTheStartIsAnsweredWith605UntilTheIndexIsMadeAnew) {
  Start();
  for (const Damage& damage : EveryDamage()) FillLarge(damage.name);
  Fill("whole");
  daemon_->Stop(SIGTERM);
  for (const Damage& damage : EveryDamage()) Happen(damage);
  Start();
  for (const Damage& damage : EveryDamage()) {
    ExpectDamaged(Ask(SearchRequest("appindex_" + damage.name, "file")), damage);
    const Json::Value upsert = UpsertRequest("appindex_" + damage.name, Document("a", "A"));
    ExpectDamaged(Ask(upsert), damage);
    ExpectDamaged(Ask(IdRequest("commit", "appindex_" + damage.name)), damage);
  }
  EXPECT_EQ(Find("whole", "file"), "files");
  for (const Damage& damage : EveryDamage()) ExpectUsableAgain(damage.name);
}

TEST_F(SearchdDamage, FoundBySearchesAndCommitsWhileTheDaemonRuns) {
  Start();
  for (const Damage& damage : EveryDamage()) {
    FillLarge(damage.name);
    EXPECT_NE(Find(damage.name, "file"), "");
  }
  Fill("whole");
  for (const Damage& damage : EveryDamage()) Happen(damage);
  for (const Damage& damage : EveryDamage()) {
    ExpectDamaged(Ask(SearchRequest("appindex_" + damage.name, "file")), damage);
    ExpectDamaged(Ask(IdRequest("commit", "appindex_" + damage.name)), damage);
  }
  EXPECT_EQ(Find("whole", "file"), "files");
  for (const Damage& damage : EveryDamage()) ExpectUsableAgain(damage.name);
  EXPECT_EQ(daemon_->Stop(SIGTERM).status, 0);
}

TEST_F(SearchdDamage, OfAWholeDirectoryIsFoundToo) {
  Start();
  for (const std::string name : {"gone", "file", "link", "other"}) Fill(name);
  fs::remove_all(IndexFile("gone"));
  fs::remove_all(IndexFile("file"));
  WriteFileOf(Outside(kIndexes + std::string("file")), "mine");
  fs::rename(Outside(kIndexes + std::string("link")), root_ / "etc/link");
  fs::create_directory_symlink("/etc/link", Outside(kIndexes + std::string("link")));
  for (const std::string name : {"gone", "file", "link"}) {
    EXPECT_EQ(Find(name, "file"), "605") << name;
    const Json::Value commit = Ask(IdRequest("commit", "appindex_" + name));
    EXPECT_EQ(CodeOf(commit), 605) << name;
    EXPECT_NE(MessageOf(commit).find(kIndexes + name), std::string::npos) << commit;
    Delete(name);
  }
  EXPECT_EQ(Find("other", "file"), "files");
  Fill("gone");
  EXPECT_EQ(Find("gone", "file"), "files");
  EXPECT_EQ(ReadFileOf(Outside(kIndexes + std::string("file"))), "mine");
  EXPECT_TRUE(fs::exists(root_ / "etc/link/iamglass"))
      << "what a link leads to is not the daemon's";
}

}  // namespace
}  // namespace test
