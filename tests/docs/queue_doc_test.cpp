// The examples of doc/queue.md, run: each writes to the queue of a device root, from outside it.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sched.h>
#include <sys/file.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <fstream>
#include <functional>
#include <sstream>
#include <stdexcept>

#include "appindex/index_mgr.h"
#include "tests/integration/real_device.h"

namespace velkor::appindex {
namespace {

using test::ConfOf;
using test::kBatch;
using test::kQueue;
using test::Request;

constexpr char kQueueDirectory[] = "/var/packages/Velkor/etc";
constexpr int kCannotStart = 127;

// The document is read before the test enters its root.
std::string Document() {
  std::ostringstream text;
  text << std::ifstream(QUEUE_DOC_PATH).rdbuf();
  return text.str();
}

std::string BlockOf(const std::string& document, const std::string& language) {
  const std::string fence = "\n```" + language + "\n";
  const std::size_t begin = document.find(fence);
  if (begin == std::string::npos) throw std::runtime_error("no example in " + language);
  const std::size_t text = begin + fence.size();
  return document.substr(text, document.find("\n```\n", text) + 1 - text);
}

std::vector<std::string> LinesOf(const std::string& path) {
  std::vector<std::string> lines;
  std::istringstream text(test::ReadFile(path));
  for (std::string line; std::getline(text, line);) lines.push_back(line);
  return lines;
}

class QueueExample : public testing::WithParamInterface<std::string>, public test::RealDeviceTest {
 protected:
  void SetUp() override {
    std::string text = BlockOf(document_, GetParam());
    const std::string outside = OutsidePath() + kQueueDirectory;
    for (std::size_t at = text.find(kQueueDirectory); at != std::string::npos;
         at = text.find(kQueueDirectory, at + outside.size())) {
      text.replace(at, std::string(kQueueDirectory).size(), outside);
    }
    const std::string source = "/example." + GetParam();
    test::WriteFile(source, text);
    command_ = {GetParam() == "sh" ? "/bin/sh" : PYTHON_PATH, OutsidePath() + source};
    if (GetParam() != "c") return;
    command_ = {OutsidePath() + "/example"};
    ASSERT_EQ(Wait(Start({CC_PATH, "-Wall", "-Wextra", "-Werror", "-o", command_[0],
                          OutsidePath() + source})),
              0);
  }

  // Starts a program outside the root.
  pid_t Start(std::vector<std::string> command) {
    const pid_t child = fork();
    if (child != 0) return child;
    std::vector<char*> arguments;
    arguments.reserve(command.size() + 1);
    for (std::string& argument : command) arguments.push_back(argument.data());
    arguments.push_back(nullptr);
    if (fchdir(OutsideRootFd()) == 0 && chroot(".") == 0) execv(arguments[0], arguments.data());
    std::perror(arguments[0]);
    _exit(kCannotStart);
  }

  static int Wait(pid_t child) {
    int status = 0;
    EXPECT_EQ(waitpid(child, &status, 0), child);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  }

  pid_t StartExample(const std::vector<std::string>& arguments) {
    std::vector<std::string> command = command_;
    command.insert(command.end(), arguments.begin(), arguments.end());
    return Start(command);
  }

  int RunExample(const std::vector<std::string>& arguments) {
    return Wait(StartExample(arguments));
  }

  // Runs the example so that it waits for the lock of a queue that then becomes the batch, as the
  // library makes it one; `meanwhile` is called before the lock is let go.
  void RunWhileTheQueueIsTaken(const std::vector<std::string>& arguments,
                               const std::function<void()>& meanwhile) {
    const int queue = open(kQueue, O_RDONLY | O_CLOEXEC);
    ASSERT_EQ(flock(queue, LOCK_EX), 0);
    struct stat locked {};
    ASSERT_EQ(fstat(queue, &locked), 0);
    const pid_t writer = StartExample(arguments);
    WaitForWaiting(locked.st_ino);
    ASSERT_EQ(rename(kQueue, kBatch), 0);
    meanwhile();
    close(queue);
    EXPECT_EQ(Wait(writer), 0);
  }

  // Returns when a process waits for a lock on the file of this number.
  void WaitForWaiting(ino_t inode) const {
    const std::string end = ":" + std::to_string(inode) + " 0 EOF";
    for (;;) {
      const int fd = openat(OutsideRootFd(), "proc/locks", O_RDONLY | O_CLOEXEC);
      ASSERT_GE(fd, 0);
      std::string text;
      char part[4096];
      for (ssize_t size = 0; (size = read(fd, part, sizeof(part))) > 0;) {
        text.append(part, static_cast<std::size_t>(size));
      }
      close(fd);
      std::istringstream lines(text);
      for (std::string line; std::getline(lines, line);) {
        const bool waits = line.find("-> FLOCK") != std::string::npos;
        if (waits && line.find(end) != std::string::npos) return;
      }
      sched_yield();
    }
  }

 private:
  static std::string document_;
  std::vector<std::string> command_;
};

std::string QueueExample::document_ = Document();

TEST_P(QueueExample, QueuesWhatTheLibraryCarriesOut) {
  EXPECT_EQ(RunExample({"3"}), 0);
  ProcessQueue();
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Photos"}));

  InstallPackage("Mail", {{"enu", "Mail Server"}});
  EXPECT_EQ(RunExample({"1", ConfOf("Mail")}), 0);
  EXPECT_EQ(RunExample({"2", ConfOf("Photos")}), 0);
  EXPECT_EQ(test::ModeOf(kQueue), 0644U);
  ProcessQueue();
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Mail"}));
  EXPECT_FALSE(test::Exists(kQueue));
  EXPECT_FALSE(test::Exists(kBatch));
}

TEST_P(QueueExample, MakesANewQueueWhenTheOneItWaitedForHasBecomeTheBatch) {
  test::Enqueue(Request(1, ConfOf("Backup")));
  const std::string before = test::ReadFile(kQueue);
  RunWhileTheQueueIsTaken({"1", ConfOf("Photos")}, [] {});

  EXPECT_EQ(test::ReadFile(kBatch), before);
  ASSERT_EQ(LinesOf(kQueue).size(), 1U);
  EXPECT_EQ(test::Parse(LinesOf(kQueue)[0])["path"], ConfOf("Photos"));
}

TEST_P(QueueExample, WritesToTheQueueThatAnotherHasMadeMeanwhile) {
  test::Enqueue(Request(1, ConfOf("Backup")));
  const std::string before = test::ReadFile(kQueue);
  RunWhileTheQueueIsTaken({"1", ConfOf("Photos")}, [] { test::Enqueue(R"({"op":3})"); });

  EXPECT_EQ(test::ReadFile(kBatch), before);
  ASSERT_EQ(LinesOf(kQueue).size(), 2U);
  EXPECT_EQ(LinesOf(kQueue)[0], R"({"op":3})");
  EXPECT_EQ(test::Parse(LinesOf(kQueue)[1])["path"], ConfOf("Photos"));
}

TEST_P(QueueExample, LeavesNoUnfinishedLine) {
  test::Enqueue(R"({"op":3})");
  const std::string before = test::ReadFile(kQueue);
  rlimit unlimited{};
  ASSERT_EQ(getrlimit(RLIMIT_FSIZE, &unlimited), 0);
  const rlimit limit{before.size() + 5, unlimited.rlim_max};
  std::signal(SIGXFSZ, SIG_IGN);  // the system's answer is then that of a full disk
  ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &limit), 0);
  const int status = RunExample({"1", ConfOf("Photos")});
  ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &unlimited), 0);

  EXPECT_EQ(status, 1);
  EXPECT_EQ(test::ReadFile(kQueue), before);
}

TEST_P(QueueExample, WritesJsonWhateverThePathHolds) {
  const std::string path = R"(/var/packages/The "best" \ app/index.conf)";
  const int status = RunExample({"1", path});
  if (GetParam() == "c") {
    EXPECT_EQ(status, 2);  // refused
    EXPECT_FALSE(test::Exists(kQueue));
  } else {
    EXPECT_EQ(status, 0);
    ASSERT_EQ(LinesOf(kQueue).size(), 1U);
    EXPECT_EQ(test::Parse(LinesOf(kQueue)[0])["path"], path);
  }
}

INSTANTIATE_TEST_SUITE_P(Doc, QueueExample, testing::Values("c", "sh", "python"),
                         [](const auto& language) { return language.param; });

}  // namespace
}  // namespace velkor::appindex
