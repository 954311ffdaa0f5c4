// What the search daemon holds on to, however long it runs.
#include <fstream>
#include <string>
#include <vector>

#include "tests/support/searchd_test.h"

namespace test {
namespace {

const std::vector<std::string> kLanguages = {"enu", "ger", "jpn", "tha"};

class SearchdMemory : public SearchdTest {
 protected:
  void Rebuild(int times) const {
    for (int i = 0; i < times; ++i) {
      for (const std::string& language : kLanguages) {
        if (Find(language, "file") != "601") Delete(language);
        Create(language);
      }
      for (int document = 0; document < 20; ++document) {
        const std::string id = std::to_string(document);
        for (const std::string& language : kLanguages) {
          Upsert(language, Document(id, "File ファイル管理 ไฟล์ " + id, std::string(200, 'd')));
        }
      }
      for (const std::string& language : kLanguages) Commit(language);
    }
  }

  // The daemon's own memory in KiB.
  long Memory() const {
    std::ifstream status("/proc/" + std::to_string(daemon_->Pid()) + "/status");
    for (std::string line; std::getline(status, line);) {
      if (line.rfind("RssAnon:", 0) == 0) return std::stol(line.substr(8));
    }
    ADD_FAILURE() << "no RssAnon";
    return 0;
  }
};

TEST_F(SearchdMemory, StaysTheSameHoweverOftenTheIndexesAreRebuilt) {
  Start();
  Rebuild(15);
  const long before = Memory();
  Rebuild(20);
  // The heap takes a while to find its size. What is lost with each index would be several times
  // it.
  EXPECT_LE(Memory(), before + before / 4) << "before: " << before;
}

}  // namespace
}  // namespace test
