// The shipped library and a search daemon that has lost an index, at every request, truly or not,
// once or for ever.
#include <gmock/gmock.h>
#include <json/value.h>
#include <pthread.h>

#include <filesystem>
#include <functional>
#include <string>
#include <vector>

#include "appindex/index_mgr.h"
#include "tests/crash/index_model.h"
#include "tests/integration/hostile_scale.h"
#include "tests/support/controlled_time.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"
#include "tests/unit/appindex/error_of.h"

namespace velkor::appindex {
namespace {

using test::ConfOf;
using test::ErrorOf;
using test::IndexModel;
using test::ScriptedDaemon;
using ::testing::AnyOf;
using ::testing::StartsWith;

enum class Loss {
  kTrue,   // the index is gone from then on
  kFalse,  // it is there, and only said to be missing
};

// A daemon whose n-th request, from 1, meets a loss.
class LossyDaemon {
 public:
  LossyDaemon(IndexModel& model, Loss loss, int n)
      : model_(model),
        loss_(loss),
        n_(n),
        daemon_([this](const Json::Value& request) { return React(request); }) {}

  int Requests() { return daemon_.Connections(); }

 private:
  test::Reaction React(const Json::Value& request) {
    if (++count_ != n_) return model_.React(request);
    if (loss_ == Loss::kFalse) return test::Failure(601, "no such index");
    Json::Value removal;
    removal["command"] = "index_delete";
    removal["data"]["id"] = request["data"]["id"];
    model_.React(removal);
    return model_.React(request);
  }

  IndexModel& model_;
  const Loss loss_;
  const int n_;
  int count_ = 0;
  ScriptedDaemon daemon_;
};

class LostIndex : public test::DeviceRootTest {
 protected:
  LostIndex() {
    test::Install("Kept");
    RunWith(Reindex);
    before_ = model_.Committed();
    test::Install("New");
    test::WriteFile(ConfOf("New"),
                    R"({"app":"New","title":"New","modules":[{"params":"p","title":"M"}]})");
    RunWith(Reindex);
    after_ = model_.Committed();
  }

  void RunWith(const std::function<void()>& call) {
    LossyDaemon daemon(model_, Loss::kTrue, 0);
    call();
  }

  // Makes `call` meet the loss at each of its requests in turn, or every day at some of them. It
  // succeeds, or ends in one of the daemon's errors; then the same call succeeds. Either way the
  // indexes are `expected`. Returns how many requests the undisturbed call makes.
  int LoseAtEachRequest(Loss loss, const std::function<void()>& prepare,
                        const std::function<void()>& call, const IndexModel::Indexes& expected) {
    constexpr int kAllOfTheFirst = 6;
    for (int n = 1;; n += n < kAllOfTheFirst ? 1 : test::Scaled(29, 1)) {
      SCOPED_TRACE("request " + std::to_string(n));
      model_.Set(before_);
      prepare();
      int requests = 0;
      std::string error;
      {
        LossyDaemon daemon(model_, loss, n);
        error = ErrorOf(call);
        requests = daemon.Requests();
      }
      if (error != "nothing") {
        EXPECT_THAT(error, AnyOf(StartsWith("601: "), StartsWith("602: ")));
        RunWith(call);
      }
      EXPECT_TRUE(model_.Committed() == expected);
      TakeLog();
      if (requests < n || HasFailure()) return requests;
    }
  }

  static void Nothing() {}

  IndexModel model_;
  IndexModel::Indexes before_;  // with "Kept"
  IndexModel::Indexes after_;   // with "New" and its module too
};

TEST_F(LostIndex, DuringAnAddIsRecovered) {
  const auto add = [] { Add(ConfOf("New"), true); };
  EXPECT_EQ(LoseAtEachRequest(Loss::kTrue, Nothing, add, after_), 21 * 3);
  EXPECT_EQ(LoseAtEachRequest(Loss::kFalse, Nothing, add, after_), 21 * 3);
}

TEST_F(LostIndex, DuringARebuildIsRecoveredAtTheLatestByTheNextOne) {
  EXPECT_EQ(LoseAtEachRequest(Loss::kTrue, Nothing, Reindex, after_), 21 * 6);
  EXPECT_EQ(LoseAtEachRequest(Loss::kFalse, Nothing, Reindex, after_), 21 * 6);
}

TEST_F(LostIndex, DuringABatchKeepsTheBatchUntilAllIsThere) {
  const auto enqueue = [] {
    std::filesystem::remove(test::kBatch);
    test::Enqueue(test::Request(1, ConfOf("New")));
    test::Enqueue(R"({"op":3})");
  };
  EXPECT_EQ(LoseAtEachRequest(Loss::kTrue, enqueue, ProcessQueue, after_), 21 * (6 + 3));
  EXPECT_EQ(LoseAtEachRequest(Loss::kFalse, enqueue, ProcessQueue, after_), 21 * (6 + 3));
}

// A deletion does not recover: the next rebuild does.
TEST_F(LostIndex, DuringADeletionIsItsError) {
  const auto del = [] { Del(ConfOf("New"), true); };
  for (int n = 1; n <= 21 * 3; ++n) {
    model_.Set(after_);
    LossyDaemon daemon(model_, Loss::kTrue, n);
    EXPECT_THAT(ErrorOf(del), StartsWith("601: ")) << n;
    EXPECT_EQ(daemon.Requests(), n);
  }
}

// For ever: no call may recurse until the stack ends, even on a small one.

std::string OnASmallStack(const std::function<void()>& call) {
#ifdef WITHOUT_SANITIZER
  constexpr std::size_t kStackBytes = std::size_t{128} * 1024;
#else  // which makes stack frames larger
  constexpr std::size_t kStackBytes = std::size_t{256} * 1024;
#endif
  struct Work {
    const std::function<void()>& call;
    std::string error;
  } work{call, ""};
  pthread_attr_t attributes;
  pthread_attr_init(&attributes);
  pthread_attr_setstacksize(&attributes, kStackBytes);
  pthread_t thread;
  const auto run = [](void* argument) -> void* {
    auto* const its = static_cast<Work*>(argument);
    its->error = ErrorOf(its->call);
    return nullptr;
  };
  EXPECT_EQ(pthread_create(&thread, &attributes, run, &work), 0);
  pthread_join(thread, nullptr);
  pthread_attr_destroy(&attributes);
  return work.error;
}

class NoIndexEver : public test::DeviceRootTest {
 protected:
  NoIndexEver() {
    for (const char* name : {"A", "B", "C"}) test::Install(name);
  }

  // 601 for requests with this command; "" for all.
  static ScriptedDaemon::React Missing(const std::string& command) {
    return [command](const Json::Value& request) {
      return command.empty() || request["command"] == command ? test::Failure(601, "no such index")
                                                              : test::Success();
    };
  }
};

TEST_F(NoIndexEver, EndsEveryCallInTheDaemonsError) {
  for (const std::string command : {"", "index_create", "document_upsert_by_id", "commit"}) {
    SCOPED_TRACE(command);
    ScriptedDaemon daemon(Missing(command));
    EXPECT_THAT(OnASmallStack(Reindex), StartsWith("601: Request failed, msg=no such index"));
    const std::string error = OnASmallStack([] { Add(ConfOf("A"), true); });
    EXPECT_THAT(error, StartsWith(command == "index_create" ? "nothing" : "601: "));
    TakeLog();
  }
}

TEST_F(NoIndexEver, NestsEightRebuildsAndKeepsTheBatch) {
  test::Enqueue(test::Request(1, ConfOf("A")));
  ScriptedDaemon daemon(Missing("document_upsert_by_id"));
  for (int again = 0; again < 2; ++again) {
    const std::size_t before = daemon.Requests().size();
    EXPECT_THAT(OnASmallStack(ProcessQueue), StartsWith("601: "));
    constexpr std::size_t kRebuilds = 8;
    EXPECT_EQ(daemon.Requests().size() - before, 1 + kRebuilds * (21 * 2 + 1));
    EXPECT_EQ(test::ReadFile(test::kBatch), test::Request(1, ConfOf("A")) + "\n");
  }
}

// Deletions of an index that is missing are no failure, so a daemon that has lost them all is
// rebuilt.
TEST_F(NoIndexEver, ForDeletionsAloneIsTheUsualFirstRebuild) {
  ScriptedDaemon daemon(Missing("index_delete"));
  EXPECT_EQ(OnASmallStack(Reindex), "nothing");
}

}  // namespace
}  // namespace velkor::appindex
