// A queue line whose members cannot be read for another reason than their shape, such as memory
// that has run out.
#include <gmock/gmock.h>
#include <json/value.h>
#include <pthread.h>

#include <cerrno>
#include <functional>
#include <new>
#include <string>
#include <utility>

#include "appindex/index_mgr.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"

namespace {

std::function<void()> g_instead_of_next_text;

}  // namespace

// The JSON library's making of a text, which fails when a test says so.
std::string Json::Value::asString() const {
  if (const auto instead = std::exchange(g_instead_of_next_text, nullptr)) instead();
  const char* begin = nullptr;
  const char* end = nullptr;
  return getString(&begin, &end) ? std::string(begin, end) : toStyledString();
}

namespace velkor::appindex {
namespace {

constexpr char kLine[] = R"({"op":3,"path":"/p"})";

class IndexQueueException : public test::DeviceRootTest {
 protected:
  IndexQueueException() { test::WriteFile(test::kSocket, ""); }

  static std::string Line(const std::string& ending) {
    return test::FailureLine("index_mgr", 353, "ProcessQueue",
                             std::string("ProcessQueue failed, cmd: ") + kLine + ending);
  }

  static void ProcessWithFailure() {
    g_instead_of_next_text = [] { throw std::bad_alloc(); };
    ProcessQueue();
    EXPECT_FALSE(g_instead_of_next_text) << "nothing has failed";
    EXPECT_FALSE(test::Exists(test::kBatch));
  }
};

TEST_F(IndexQueueException, IsLoggedWithTheLineAndTheNextIsRead) {
  test::WriteFile(test::kBatch, std::string(kLine) + "\n{}\n");
  test::WriteFile(test::kQueue, "");  // both files there: nothing has set errno
  errno = 0;
  ProcessWithFailure();
  const std::vector<std::string> log = TakeLog();
  ASSERT_EQ(log.size(), 2U);
  EXPECT_EQ(log[0], Line(""));
  EXPECT_THAT(log[1], ::testing::HasSubstr("ProcessQueue failed, cmd: {}, reason: "));
}

TEST_F(IndexQueueException, ShowsAStaleErrno) {
  test::Enqueue(kLine);  // that there is no leftover batch will be in errno
  ProcessWithFailure();
  EXPECT_THAT(TakeLog(), ::testing::ElementsAre(Line(" [err: No such file or directory]")));
}

TEST_F(IndexQueueException, OfAThreadThatIsEndedLeavesTheBatchAndNoLine) {
#ifdef __has_feature
#if __has_feature(thread_sanitizer)
  GTEST_SKIP() << "ThreadSanitizer ends the process when a thread's stack is unwound by force";
#endif
#endif
  test::WriteFile(test::kBatch, std::string(kLine) + "\n");
  g_instead_of_next_text = [] { pthread_exit(nullptr); };
  const auto process = [](void* argument) -> void* {
    ProcessQueue();
    return argument;  // not reached
  };
  int reached = 0;
  pthread_t thread{};
  ASSERT_EQ(pthread_create(&thread, nullptr, process, &reached), 0);
  void* result = &reached;
  ASSERT_EQ(pthread_join(thread, &result), 0);
  EXPECT_EQ(result, nullptr);
  EXPECT_EQ(test::ReadFile(test::kBatch), std::string(kLine) + "\n");
  EXPECT_THAT(TakeLog(), ::testing::IsEmpty());
  const LockFile lock(test::kProcessLock, true);  // let go: this throws otherwise
}

}  // namespace
}  // namespace velkor::appindex
