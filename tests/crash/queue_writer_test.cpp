// Programs that append to the queue while it is worked lose no line.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include "appindex/index_mgr.h"
#include "tests/crash/index_model.h"
#include "tests/support/controlled_time.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"

namespace velkor::appindex {
namespace {

using test::ConfOf;
using test::Request;

constexpr int kLines = 40;  // fewer than the attempts that a processor has for the lock

// Appends a line as a program without this library does: waiting for the lock, and taking it anew
// when the file it waited for has been moved aside meanwhile.
void Append(const std::string& line) {
  for (;;) {
    const int fd = open(test::kQueue, O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
    struct stat locked {};
    struct stat named {};
    if (flock(fd, LOCK_EX) == 0 && fstat(fd, &locked) == 0 && stat(test::kQueue, &named) == 0 &&
        locked.st_ino == named.st_ino) {
      const std::string text = line + "\n";
      const bool whole = write(fd, text.data(), text.size()) == static_cast<ssize_t>(text.size());
      close(fd);
      if (!whole) _exit(1);
      return;
    }
    close(fd);
  }
}

// A process that appends one line for each byte it is sent, as fast as it gets to run.
class Writer {
 public:
  Writer() {
    EXPECT_EQ(pipe2(pipe_, O_CLOEXEC), 0);
    pid_ = fork();
    if (pid_ == 0) {
      close(pipe_[1]);
      char byte = 0;
      for (int i = 0; read(pipe_[0], &byte, 1) == 1; ++i) {
        Append(Request(1, ConfOf("App" + std::to_string(i))));
      }
      _exit(0);
    }
    close(pipe_[0]);
  }

  void AppendOne() { EXPECT_EQ(write(pipe_[1], "x", 1), 1); }

  // Returns when everything is appended.
  void Finish() {
    close(pipe_[1]);
    int status = -1;
    EXPECT_EQ(waitpid(pid_, &status, 0), pid_);
    EXPECT_EQ(status, 0);
  }

 private:
  int pipe_[2] = {-1, -1};
  pid_t pid_ = -1;
};

class QueueWriter : public test::DeviceRootTest {
 protected:
  test::IndexModel model_;
  test::ScriptedDaemon daemon_{
      [this](const Json::Value& request) { return model_.React(request); }};
};

TEST_F(QueueWriter, NoLineOfAConcurrentWriterIsLost) {
  Reindex();
  for (int i = 0; i < kLines; ++i) test::Install("App" + std::to_string(i));
  test::Enqueue(Request(1, test::Install("First")));
  Writer writer;
  int appended = 0;
  test::Time().on_usleep = [&](unsigned pause) {
    if (pause != 0) {  // before a document
      if (appended < kLines && ++appended > 0) writer.AppendOne();
      return;
    }
    // The queue is locked: wait until its writer is done, instead of some time.
    const int fd = open(test::kQueue, O_RDONLY | O_CLOEXEC);
    flock(fd, LOCK_EX);
    close(fd);
  };
  ProcessQueue();
  writer.Finish();
  ProcessQueue();
  test::Time().on_usleep = nullptr;

  EXPECT_EQ(appended, kLines);
  const auto indexes = model_.Committed();
  EXPECT_EQ(indexes.size(), 21U);
  for (const auto& [id, index] : indexes) EXPECT_EQ(index.size(), kLines + 1U) << id;
  EXPECT_FALSE(test::Exists(test::kQueue));
  EXPECT_FALSE(test::Exists(test::kBatch));
}

}  // namespace
}  // namespace velkor::appindex
