// Who holds a lock.
#include "tool/lock_holders.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/file.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iterator>
#include <sstream>
#include <string>

#include "common/unique_fd.h"
#include "tests/support/device_root_test.h"
#include "tests/unit/host/temp_dir.h"

namespace tool {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr char kLocks[] =
    "1: POSIX  ADVISORY  READ 11 08:01:77 128 128\n"
    "2: FLOCK  ADVISORY  WRITE 12 08:01:77 0 EOF\n"
    "2: -> FLOCK  ADVISORY  WRITE 13 08:01:77 0 EOF\n"
    "3: FLOCK  ADVISORY  READ 14 08:01:78 0 EOF\n"
    "4: FLOCK  ADVISORY  READ 15 fd:1f:77 0 EOF\n"
    "5: nonsense\n"
    "6: FLOCK  ADVISORY  READ 16 fd:1f:77 0 EOF\n";

TEST(HoldersIn, FindsThoseOfTheFileAndNotThoseWhoWait) {
  EXPECT_THAT(HoldersIn(kLocks, makedev(8, 1), 77), ElementsAre(12));
  EXPECT_THAT(HoldersIn(kLocks, makedev(8, 1), 78), ElementsAre(14));
  EXPECT_THAT(HoldersIn(kLocks, makedev(0xfd, 0x1f), 77), ElementsAre(15, 16));
  EXPECT_THAT(HoldersIn(kLocks, makedev(8, 2), 77), IsEmpty());
  EXPECT_THAT(HoldersIn("", makedev(8, 1), 77), IsEmpty());
}

TEST(LockHolders, NamesTheProcess) {
  char path[] = "/tmp/lock-holders-XXXXXX";
  const velkor::UniqueFd file(mkstemp(path));
  const velkor::UniqueFd proc(open("/proc", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  EXPECT_THAT(LockHolders(proc.Get(), path), IsEmpty());
  ASSERT_EQ(flock(file.Get(), LOCK_EX), 0);
  const std::vector<LockHolder> holders = LockHolders(proc.Get(), path);
  unlink(path);
  ASSERT_EQ(holders.size(), 1U);
  EXPECT_EQ(holders[0].pid, getpid());
  EXPECT_EQ(holders[0].program, "tool_test");
}

TEST(WaitersIn, FindsThoseWhoWait) {
  EXPECT_THAT(WaitersIn(kLocks, makedev(8, 1), 77), ElementsAre(13));
  EXPECT_THAT(WaitersIn(kLocks, makedev(8, 1), 78), IsEmpty());
}

// A lock that a process has taken which has ended since, as the program flock of a shell.
class HeldByAnHeir : public ::testing::Test {
 protected:
  HeldByAnHeir() {
    const pid_t taker = fork();
    if (taker == 0) _exit(flock(file_.Get(), LOCK_EX));
    waitpid(taker, nullptr, 0);
    taker_ = taker;
  }
  ~HeldByAnHeir() override { unlink(path_); }

  char path_[32] = "/tmp/lock-holders-XXXXXX";
  velkor::UniqueFd file_{mkostemp(path_, O_CLOEXEC)};
  velkor::UniqueFd proc_{open("/proc", O_RDONLY | O_DIRECTORY | O_CLOEXEC)};
  pid_t taker_ = 0;
};

TEST_F(HeldByAnHeir, TheOneThatHasTheFileOpenIsNamed) {
  const std::vector<LockHolder> holders = LockHolders(proc_.Get(), path_);
  ASSERT_EQ(holders.size(), 1U);
  EXPECT_EQ(holders[0].pid, getpid());
  EXPECT_EQ(holders[0].program, "tool_test");
  EXPECT_FALSE(holders[0].has_ended);
}

TEST_F(HeldByAnHeir, TheOneThatWaitsIsNot) {
  const pid_t waiter = fork();
  if (waiter == 0) {
    const int own = open(path_, O_RDONLY | O_CLOEXEC);
    file_.Close();
    _exit(flock(own, LOCK_EX));
  }
  struct stat file {};
  ASSERT_EQ(fstat(file_.Get(), &file), 0);
  std::string locks;
  do {
    std::ifstream stream("/proc/locks");
    locks.assign(std::istreambuf_iterator<char>(stream), std::istreambuf_iterator<char>());
  } while (WaitersIn(locks, file.st_dev, file.st_ino).empty());
  const std::vector<LockHolder> holders = LockHolders(proc_.Get(), path_);
  file_.Close();
  waitpid(waiter, nullptr, 0);
  ASSERT_EQ(holders.size(), 1U);
  EXPECT_EQ(holders[0].pid, getpid());
}

TEST_F(HeldByAnHeir, WithoutOneToBeSeenTheTakerIsSaidToHaveEnded) {
  // Open nowhere but on its way through a socket.
  int ends[2];
  ASSERT_EQ(socketpair(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0, ends), 0);
  const velkor::UniqueFd sender(ends[0]);
  const velkor::UniqueFd receiver(ends[1]);
  char byte = 0;
  iovec data = {&byte, 1};
  alignas(cmsghdr) char control[CMSG_SPACE(sizeof(int))] = {};
  msghdr message{};
  message.msg_iov = &data;
  message.msg_iovlen = 1;
  message.msg_control = control;
  message.msg_controllen = sizeof(control);
  cmsghdr* header = CMSG_FIRSTHDR(&message);
  header->cmsg_level = SOL_SOCKET;
  header->cmsg_type = SCM_RIGHTS;
  header->cmsg_len = CMSG_LEN(sizeof(int));
  const int fd = file_.Get();
  std::memcpy(CMSG_DATA(header), &fd, sizeof(fd));
  ASSERT_EQ(sendmsg(sender.Get(), &message, 0), 1);
  file_.Close();
  const std::vector<LockHolder> holders = LockHolders(proc_.Get(), path_);
  ASSERT_EQ(holders.size(), 1U);
  EXPECT_EQ(holders[0].pid, taker_);
  EXPECT_TRUE(holders[0].has_ended);
}

MATCHER_P3(IsHolder, pid, program, has_ended, "") {
  return arg.pid == pid && arg.program == program && arg.has_ended == has_ended;
}

// A /proc as the kernel shows it to others than root, and in the moment in which a process ends.
class MadeUpProc : public ::testing::Test {
 protected:
  MadeUpProc() {
    dir_.Write("lock", "");
    stat(Lock().c_str(), &file_);
  }

  std::string Lock() const { return dir_ / "lock"; }

  // The line of a process that has taken the lock.
  std::string Line(pid_t pid) const {
    std::ostringstream line;
    line << "1: FLOCK  ADVISORY  WRITE " << pid << " " << std::hex << major(file_.st_dev) << ":"
         << minor(file_.st_dev) << ":" << std::dec << file_.st_ino << " 0 EOF\n";
    return line.str();
  }

  std::vector<LockHolder> Holders(const std::string& locks) {
    dir_.Write("proc/locks", locks);
    const velkor::UniqueFd proc(open((dir_ / "proc").c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    return LockHolders(proc.Get(), Lock());
  }

  TempDir dir_;
  struct stat file_ {};
};

TEST_F(MadeUpProc, TheTakerIsNamedThatDoesNotShowItsFiles) {
  dir_.Write("proc/12/comm", "package-manager\n");
  dir_.Write("proc/12/fd", "");  // is no directory that may be read
  EXPECT_THAT(Holders(Line(12)), ElementsAre(IsHolder(12, "package-manager", false)));
  dir_.Write("proc/12/comm", "without-a-line-feed");
  EXPECT_THAT(Holders(Line(12)), ElementsAre(IsHolder(12, "without-a-line-feed", false)));
}

TEST_F(MadeUpProc, OthersThatDoNotShowTheirFilesAreNotTakenForHolders) {
  dir_.Write("proc/13/fd", "");
  EXPECT_THAT(Holders(Line(12)), ElementsAre(IsHolder(12, "", true)));
}

TEST_F(MadeUpProc, ProcessThatEndsMeanwhileHasNoName) {
  test::MakeDirs(dir_ / "proc/12/fd");
  ASSERT_EQ(symlink(Lock().c_str(), (dir_ / "proc/12/fd/3").c_str()), 0);
  EXPECT_THAT(Holders(Line(12)), ElementsAre(IsHolder(12, "", false)));
}

TEST_F(MadeUpProc, LinesOfAnotherFormNameNobody) {
  EXPECT_THAT(Holders("1: FLOCK  ADVISORY  WRITE 12 here 0 EOF\n"), IsEmpty());
  EXPECT_THAT(Holders("1: FLOCK  ADVISORY  WRITE nobody 08:01:77 0 EOF\n"), IsEmpty());
}

TEST(LockHolders, WithoutFileOrListThereAreNone) {
  const velkor::UniqueFd proc(open("/proc", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  EXPECT_THAT(LockHolders(proc.Get(), "/no/such/file"), IsEmpty());
  EXPECT_THAT(LockHolders(-1, "/"), IsEmpty());
}

}  // namespace
}  // namespace tool
