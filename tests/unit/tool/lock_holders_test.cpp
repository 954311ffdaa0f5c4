// Who holds a lock.
#include "tool/lock_holders.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/file.h>
#include <sys/sysmacros.h>
#include <unistd.h>

#include <cstdlib>

#include "common/unique_fd.h"

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

TEST(LockHolders, WithoutFileOrListThereAreNone) {
  const velkor::UniqueFd proc(open("/proc", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  EXPECT_THAT(LockHolders(proc.Get(), "/no/such/file"), IsEmpty());
  EXPECT_THAT(LockHolders(-1, "/"), IsEmpty());
}

}  // namespace
}  // namespace tool
