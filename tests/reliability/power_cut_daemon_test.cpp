// A power cut while the search daemon works: it comes up again, and what it had answered as
// committed is there.
#include <gtest/gtest.h>

#include <csignal>
#include <cstdio>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "tests/reliability/environment.h"
#include "tests/reliability/power_cut.h"
#include "tests/support/searchd_test.h"

namespace {

namespace fs = std::filesystem;

constexpr std::size_t kNever = static_cast<std::size_t>(-1);

class PowerCutDaemon : public test::SearchdTest {
 protected:
  // Something that was asked for: what searches may find from when on, and what they must find if
  // nothing else was asked for since.
  struct Step {
    std::size_t begun;
    std::size_t done;  // kNever: nothing that a power cut must not undo
    std::set<std::string> answers;
  };

  void SetUp() override {
    SearchdTest::SetUp();
    cut_ = std::make_unique<test::PowerCut>(root_);
    daemon_ = Launch({}, [this] { cut_->RecordThisProcess(); });
    ASSERT_TRUE(daemon_->IsReady());
  }

  // An index that is made or deleted is durable with a commit only; until then it may be missing,
  // empty or damaged, as it was or as it is to be.
  template <typename Ask>
  void ChangeIndex(const std::string& language, const Ask& ask) {
    const std::size_t begun = cut_->Now();
    ask();
    documents_[language].clear();
    steps_[language].push_back({begun, kNever, {"", "601", "605"}});
  }

  void MakeIndex(const std::string& language) {
    ChangeIndex(language, [&] { Create(language); });
  }
  void DeleteIndex(const std::string& language) {
    ChangeIndex(language, [&] { Delete(language); });
  }

  void Put(const std::string& language, const std::string& id) {
    // Long enough that a few of them fill more than a block of the database.
    std::string desc = "everything";
    for (int word = 0; word < 200; ++word) desc += " word" + id + std::to_string(word);
    Upsert(language, test::Document(id, "Title " + id, desc));
    documents_[language].insert(id);
  }

  void Remove(const std::string& language, const std::string& id) {
    ASSERT_EQ(test::CodeOf(Ask(test::RemovalRequest("appindex_" + language, id))), 0);
    documents_[language].erase(id);
  }

  void CommitAll(const std::string& language) {
    const std::size_t begun = cut_->Now();
    Commit(language);
    std::string ids;
    for (const std::string& id : documents_[language]) ids += (ids.empty() ? "" : " ") + id;
    ASSERT_EQ(Find(language, "everything"), ids);
    steps_[language].push_back({begun, cut_->Now(), {ids}});
  }

  // What searches may find when the power was cut at `at`.
  std::set<std::string> Allowed(const std::string& language, std::size_t at) {
    std::set<std::string> allowed = {"601"};
    for (const Step& step : steps_[language]) {
      if (step.done <= at) allowed.clear();
      if (step.begun <= at) allowed.insert(step.answers.begin(), step.answers.end());
    }
    return allowed;
  }

  // Everything that a daemon does with two indexes.
  void Work() {
    MakeIndex("enu");
    for (const char* id : {"a", "b"}) Put("enu", id);
    CommitAll("enu");
    MakeIndex("ger");
    Put("ger", "c");
    CommitAll("ger");
    for (const char* id : {"d", "e", "f"}) Put("enu", id);
    CommitAll("enu");
    Remove("enu", "a");
    Put("enu", "b");
    CommitAll("enu");
    DeleteIndex("ger");
    MakeIndex("ger");
    Put("ger", "g");
    CommitAll("ger");
    Put("enu", "h");
    daemon_->Stop(SIGTERM);
    daemon_.reset();
  }

  // The daemon on the disk as the power cut has left it.
  void Reopen(const fs::path& disk, std::size_t at) {
    const fs::path root = std::exchange(root_, disk);
    Start();
    for (const auto& [language, steps] : steps_) {
      const std::string found = HasFailure() ? "" : Find(language, "everything");
      const std::set<std::string> allowed = Allowed(language, at);
      EXPECT_EQ(allowed.count(found), 1U) << language << " has \"" << found << "\" and not \""
                                          << *allowed.rbegin() << "\", cut at " << at;
      if (found == "605") Delete(language);
      if (found == "605" || found == "601") Create(language);
    }
    daemon_.reset();
    root_ = root;
  }

  std::unique_ptr<test::PowerCut> cut_;
  std::map<std::string, std::set<std::string>> documents_;  // by language
  std::map<std::string, std::vector<Step>> steps_;          // in their order
};

TEST_F(PowerCutDaemon, LosesNothingThatWasAnsweredAsCommitted) {
  Work();
  ASSERT_FALSE(HasFailure());
  cut_->EndRecording();
  const unsigned seed = test::Seed();
  const std::size_t states = test::NumberFrom("TEISEIGATRO_POWER_CUT_STATES", 10);
  const std::size_t different = cut_->Cut(states, seed, [&](const fs::path& disk, std::size_t at) {
    Reopen(disk, at);
    return !HasFailure();
  });
  std::printf("power cut, the daemon: seed %u, %zu acts recorded, %zu different states\n", seed,
              cut_->Acts(), different);
  EXPECT_EQ(different, states);
}

}  // namespace
