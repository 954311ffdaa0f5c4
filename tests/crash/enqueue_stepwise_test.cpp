// Leaving requests in the queue, killed before each system call in turn and done again; and the
// same while each of them fails, once and for good. No request of another is lost or torn, and one
// whose writing is said to have succeeded is there.
#include <gtest/gtest.h>

#include <filesystem>
#include <sstream>

#include "appindex/index_queue_internal.h"
#include "tests/crash/stepwise.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tool/failure.h"
#include "tool/queue_writer.h"

namespace tool {
namespace {

// What other writers have left: a request, and a line that one of them has not finished.
constexpr char kOthers[] = "{\"op\":1,\"path\":\"/other/index.conf\"}\n{\"op\":1,\"pa";

constexpr char kOwn[] =
    "{\"op\":1,\"path\":\"/new/index.conf\"}\n{\"op\":2,\"path\":\"/old/index.conf\"}\n";

class EnqueueStepwise : public test::DeviceRootTest {
 protected:
  void SetUp() override {
    const std::string refusal = test::Stepper::Refusal();
    if (!refusal.empty()) GTEST_SKIP() << refusal;
  }

  static void Act() {
    try {
      AppendToQueue({QueueRequest(1, "/new/index.conf"), QueueRequest(2, "/old/index.conf")});
    } catch (const Failure& failure) {
      throw velkor::Error(velkor::Error::kGeneralError, failure.what());
    }
  }

  // What the requests come to, and that there are no other files.
  static std::string Result() {
    std::ostringstream result;
    for (const auto& [path, op] : velkor::appindex::ReadBatch(test::kQueue)) {
      result << op << " " << path << "\n";
    }
    const std::filesystem::path queue = test::kQueue;
    for (const auto& entry : std::filesystem::directory_iterator(queue.parent_path())) {
      result << entry.path() << "\n";
    }
    return result.str();
  }

  void Run(const std::string& name, const std::string& before) {
    test::Subject subject;
    subject.name = name;
    subject.prepare = [=] {
      unlink(test::kQueue);
      if (!before.empty()) test::WriteFile(test::kQueue, before);
    };
    subject.act = Act;
    subject.again = Act;
    subject.result = Result;
    subject.wrong = [=]() -> std::string {
      const std::string queue = test::ReadFile(test::kQueue);
      const std::string begun = before + (before.empty() ? "" : "\n");
      return queue == before || queue == begun + kOwn ? "" : "the queue is " + queue;
    };
    subject.done_when_it_returns = true;
    subject.excuse = [](const test::Fault&, long, const std::vector<std::string>&) {
      return test::Excuse{};
    };
    test::Stepwise(subject, OutsideRootFd(), test::Runs::FromEnvironment({})).Run();
  }
};

TEST_F(EnqueueStepwise, First) { Run("enqueue_first", ""); }

TEST_F(EnqueueStepwise, AfterOthers) { Run("enqueue_after_others", kOthers); }

}  // namespace
}  // namespace tool
