// What waits in the queue.
#include "tool/queue_state.h"

#include <gmock/gmock.h>
#include <utime.h>

#include <cerrno>
#include <ctime>

#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/unit/tool/recorded_calls.h"

namespace tool {
namespace {

using test::ConfOf;
using test::kBatch;
using test::kQueue;
using test::Request;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

class QueueStateTest : public test::DeviceRootTest {};

TEST_F(QueueStateTest, MissingFile) {
  const RequestFile file = ReadRequestFile(kQueue);
  EXPECT_EQ(file.state, RequestFile::kMissing);
  EXPECT_EQ(file.path, kQueue);
}

TEST_F(QueueStateTest, CountsLinesAndWhatTheyComeTo) {
  test::WriteFile(kQueue, Request(1, "/b") + "\n\nnot json\n" + Request(2, "/b") + "\n[1]\n" +
                              Request(1, "/a") + "\n{\"op\":1,\"pa");
  const RequestFile file = ReadRequestFile(kQueue);
  EXPECT_EQ(file.state, RequestFile::kReadable);
  EXPECT_EQ(file.lines, 6U);
  EXPECT_EQ(file.requests, (velkor::appindex::Batch{{"/a", 1}, {"/b", 2}}));
  EXPECT_THAT(TakeLog(), IsEmpty()) << "looking must not be logged as working";
}

TEST_F(QueueStateTest, AgeIsThatOfTheLastLine) {
  test::WriteFile(kQueue, Request(1, "/b") + "\n");
  const utimbuf hour_ago = {0, std::time(nullptr) - 3600};
  ASSERT_EQ(utime(kQueue, &hour_ago), 0);
  EXPECT_GE(ReadRequestFile(kQueue).age, 3600);
  EXPECT_EQ(ReadRequestFile(kQueue).written, hour_ago.modtime);
  const utimbuf later = {0, std::time(nullptr) + 3600};
  ASSERT_EQ(utime(kQueue, &later), 0);
  EXPECT_EQ(ReadRequestFile(kQueue).age, 0);
}

TEST_F(QueueStateTest, UnreadableFileIsNotAMissingOne) {
  test::MakeDirs(kQueue);
  const RequestFile file = ReadRequestFile(kQueue);
  EXPECT_EQ(file.state, RequestFile::kUnreadable);
  EXPECT_EQ(file.cause, "Is a directory");
}

// The queue's worker moves it, and is done with it, at any moment.
TEST_F(QueueStateTest, FileThatIsGoneBeforeItsRequestsAreReadIsAMissingOne) {
  test::WriteFile(kQueue, Request(1, "/b") + "\n");
  const test::FailingCall open("open", ENOENT, 1);
  const RequestFile file = ReadRequestFile(kQueue);
  EXPECT_TRUE(open.HasFailed());
  EXPECT_EQ(file.state, RequestFile::kMissing);
  EXPECT_EQ(file.path, kQueue);
  EXPECT_EQ(file.lines, 0U);
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(QueueStateTest, FileThatIsGoneBeforeItsTimeIsReadIsNew) {
  test::WriteFile(kQueue, Request(1, "/b") + "\n");
  const utimbuf hour_ago = {0, std::time(nullptr) - 3600};
  ASSERT_EQ(utime(kQueue, &hour_ago), 0);
  const test::FailingCall stat("stat", ENOENT, 1);
  EXPECT_EQ(ReadRequestFile(kQueue).age, 0);
  EXPECT_TRUE(stat.HasFailed());
}

TEST_F(QueueStateTest, OrderIsBatchThenQueueEachByPath) {
  test::Install("App");
  test::WriteFile(kBatch, Request(1, ConfOf("App")) + "\n");
  test::WriteFile(kQueue,
                  Request(1, ConfOf("Gone")) + "\n{\"op\":3}\n{\"op\":9,\"path\":\"/x\"}\n");
  const RequestFile batch = ReadRequestFile(kBatch);
  const RequestFile queue = ReadRequestFile(kQueue);
  std::vector<std::string> steps;
  for (const Step& step : Order(batch, queue)) {
    steps.push_back(std::string(step.from == &batch ? "batch " : "queue ") +
                    NameOfOperation(step.op) + " " + step.path + " " + step.problem.line);
  }
  EXPECT_THAT(steps, testing::ElementsAre("batch add " + ConfOf("App") + " ", "queue reindex  ",
                                          "queue add " + ConfOf("Gone") +
                                              " cannot be read: No such file or directory",
                                          "queue none /x "));
}

}  // namespace
}  // namespace tool
