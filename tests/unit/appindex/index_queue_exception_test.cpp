// A queue line whose members cannot be read for another reason than their shape, such as memory
// that has run out.
#include <gmock/gmock.h>
#include <json/value.h>

#include <cerrno>
#include <new>
#include <string>

#include "appindex/index_mgr.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"

namespace {

bool g_next_text_fails = false;

}  // namespace

// The JSON library's making of a text, which fails when a test says so.
std::string Json::Value::asString() const {
  if (g_next_text_fails) {
    g_next_text_fails = false;
    throw std::bad_alloc();
  }
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
    g_next_text_fails = true;
    ProcessQueue();
    EXPECT_FALSE(g_next_text_fails) << "nothing has failed";
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

}  // namespace
}  // namespace velkor::appindex
