// A queue line whose members cannot be read for another reason than their shape: out of memory.
#include <gmock/gmock.h>

#include <cerrno>
#include <cstdlib>
#include <new>
#include <string>

#include "appindex/index_mgr.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"

namespace {

// The next request for exactly this many bytes fails; 0 for none.
std::size_t g_failing_size = 0;

}  // namespace

void* operator new(std::size_t size) {
  if (size == g_failing_size) {
    g_failing_size = 0;
    throw std::bad_alloc();
  }
  void* memory = std::malloc(size);
  if (memory == nullptr) throw std::bad_alloc();
  return memory;
}
void operator delete(void* memory) noexcept { std::free(memory); }
void operator delete(void* memory, std::size_t) noexcept { std::free(memory); }

namespace velkor::appindex {
namespace {

constexpr std::size_t kPathLength = 5000;

class IndexQueueMemory : public test::DeviceRootTest {
 protected:
  IndexQueueMemory() {
    // Each character is written as an escape, so that of all texts on the way only the path, read
    // as a string, has its length.
    line_ = R"({"op":3,"path":")";
    for (std::size_t i = 0; i < kPathLength; ++i) line_ += "\\u0070";
    line_ += "\"}";
    test::WriteFile(test::kSocket, "");
  }

  std::string Line(const std::string& ending) const {
    return test::FailureLine("index_mgr", 353, "ProcessQueue",
                             "ProcessQueue failed, cmd: " + line_ + ending);
  }

  static void ProcessWithFailure() {
    g_failing_size = kPathLength + 1;
    ProcessQueue();
    EXPECT_EQ(g_failing_size, 0U) << "nothing has failed";
    g_failing_size = 0;
  }

  std::string line_;
};

TEST_F(IndexQueueMemory, OtherExceptionIsLoggedWithTheLineAndReadingGoesOn) {
  test::WriteFile(test::kBatch, line_ + "\n{}\n");
  test::WriteFile(test::kQueue, "");  // both files there: nothing has set errno
  errno = 0;
  ProcessWithFailure();
  const std::vector<std::string> log = TakeLog();
  ASSERT_EQ(log.size(), 2U);
  EXPECT_EQ(log[0], Line(""));
  EXPECT_THAT(log[1], ::testing::HasSubstr("ProcessQueue failed, cmd: {}, reason: "));
  EXPECT_FALSE(test::Exists(test::kBatch));
}

TEST_F(IndexQueueMemory, OtherExceptionShowsAStaleErrno) {
  test::Enqueue(line_);  // that there is no leftover batch will be in errno
  ProcessWithFailure();
  EXPECT_THAT(TakeLog(), ::testing::ElementsAre(Line(" [err: No such file or directory]")));
}

}  // namespace
}  // namespace velkor::appindex
