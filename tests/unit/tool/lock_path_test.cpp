// What a lock finds at its path: told beforehand, and then tried.
#include "tool/lock_path.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstring>
#include <string>

#include "common/unique_fd.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"

namespace tool {
namespace {

using ::testing::Contains;
using ::testing::HasSubstr;

constexpr char kPath[] = "/locks/work.lck";
constexpr uid_t kAnna = 1001;
constexpr mode_t kSticky = 01777;

void MakeDir(mode_t mode) {
  test::MakeDirs("/locks");
  ASSERT_EQ(chmod("/locks", mode), 0);
}

void MakeFile(mode_t mode) { test::WriteFile(kPath, "", mode); }

void MakeLink(const char* target) {
  MakeDir(kSticky);
  ASSERT_EQ(symlink(target, kPath), 0);
}

void MakeSocket() {
  MakeDir(kSticky);
  const velkor::UniqueFd fd(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strcpy(address.sun_path, kPath);
  ASSERT_EQ(bind(fd.Get(), reinterpret_cast<sockaddr*>(&address), sizeof(address)), 0);
}

// Of Anna, in a directory such as /tmp.
void MakeForeign() {
  MakeDir(kSticky);
  MakeFile(0644);
  ASSERT_EQ(chown(kPath, kAnna, 100), 0);
}

struct Place {
  const char* name;
  void (*make)();
  uid_t user = 0;
  bool needs_root = false;
  friend void PrintTo(const Place& place, std::ostream* out) { *out << place.name; }
};

class LockPathTest : public test::DeviceRootTest {
 protected:
  Protection Ours() const {
    const velkor::UniqueFd proc(
        openat(OutsideRootFd(), "proc", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    return ReadProtection(proc.Get());
  }
};

class LookedAt : public LockPathTest, public testing::WithParamInterface<Place> {};

TEST_P(LookedAt, IsAsTheLockThenFindsIt) {
  if (GetParam().needs_root && !test::IsTrueRoot()) GTEST_SKIP() << "needs root: is two users";
  GetParam().make();
  ASSERT_EQ(seteuid(GetParam().user), 0);
  const bool was_there = test::Exists(kPath);
  const LockPath found = LookAtLock(kPath, Ours());
  EXPECT_EQ(test::Exists(kPath), was_there);
  ASSERT_NE(found.state, LockPath::kWaits);
  if (found.state == LockPath::kOpens) {
    EXPECT_EQ(WhyNotOpened(found), "");
    EXPECT_NO_THROW(velkor::LockFile(kPath, true));
  } else {
    const velkor::Error error = test::ThrownBy([] { velkor::LockFile(kPath, true); });
    EXPECT_EQ(error.code, velkor::Error::kLockFileError);
    EXPECT_NE(WhyNotOpened(found), "");
    EXPECT_THAT(TakeLog(), Contains(HasSubstr(std::strerror(found.error))));
  }
  ASSERT_EQ(seteuid(0), 0);
}

INSTANTIATE_TEST_SUITE_P(
    , LookedAt,
    testing::Values(Place{"Nothing", [] { MakeDir(kSticky); }},  //
                    Place{"NotEvenItsDirectory", [] {}},         //
                    Place{"FileInPlaceOfItsDirectory", [] { test::WriteFile("/locks", ""); }},
                    Place{"File", [] { MakeFile(0644); }},
                    Place{"Directory", [] { test::MakeDirs(kPath); }},  //
                    Place{"Socket", MakeSocket},                        //
                    Place{"LinkToAFile",
                          [] {
                            MakeLink("../file");
                            test::WriteFile("/file", "");
                          }},
                    Place{"LinkToWhatIsMade", [] { MakeLink("../tmp/made"); }},
                    Place{"LinkToALinkToNowhere",
                          [] {
                            MakeLink("/link");
                            ASSERT_EQ(symlink("/no/where", "/link"), 0);
                          }},
                    Place{"AsManyLinksAsMayBe",
                          [] {
                            MakeLink("/link39");
                            for (int i = 39; i > 0; --i) {
                              const std::string target = i > 1 ? "/link" + std::to_string(i - 1)
                                                               : std::string("/tmp/made");
                              const std::string link = "/link" + std::to_string(i);
                              ASSERT_EQ(symlink(target.c_str(), link.c_str()), 0);
                            }
                          }},
                    Place{"LinkToItself", [] { MakeLink("work.lck"); }},
                    Place{"FileOfAnother", MakeForeign, 0, true},
                    Place{"FileOfOnesOwn", MakeForeign, kAnna, true},
                    Place{"FileThatOneMayNotRead", [] { MakeFile(0600); }, kAnna, true},
                    Place{"NothingWhereOneMayNotWrite", [] { MakeDir(0755); }, kAnna, true}),
    [](const auto& place) { return std::string(place.param.name); });

TEST_F(LockPathTest, FifoIsWaitedFor) {
  MakeDir(kSticky);
  ASSERT_EQ(mkfifo(kPath, 0600), 0);
  const LockPath found = LookAtLock(kPath, {2, 2});
  EXPECT_EQ(found.state, LockPath::kWaits) << "one's own is not protected";
  EXPECT_EQ(WhyNotOpened(found), "it is a FIFO");
}

// What the kernel documents of fs.protected_regular and fs.protected_fifos, which are those of the
// whole machine: no test sets them.

struct Case {
  mode_t dir;
  bool fifo;
  Protection protection;
  bool is_protected;
};

TEST_F(LockPathTest, KernelsProtectionIsThatOfItsSettings) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: gives files away";
  for (const Case& one : {Case{01777, false, {0, 0}, false}, Case{01777, false, {1, 0}, true},
                          Case{01777, false, {0, 2}, false}, Case{01777, true, {0, 1}, true},
                          Case{01777, true, {2, 0}, false}, Case{01775, false, {1, 1}, false},
                          Case{01775, false, {2, 0}, true}, Case{01775, true, {0, 2}, true},
                          Case{01755, false, {2, 2}, false}, Case{0777, false, {2, 2}, false}}) {
    MakeDir(one.dir);
    ASSERT_EQ(mknod(kPath, (one.fifo ? S_IFIFO : S_IFREG) | 0644U, 0), 0);
    ASSERT_EQ(chown(kPath, kAnna, 100), 0);
    const LockPath found = LookAtLock(kPath, one.protection);
    EXPECT_EQ(found.state == LockPath::kProtected, one.is_protected)
        << std::oct << one.dir << " " << one.fifo << " " << one.protection.regular
        << one.protection.fifos;
    EXPECT_EQ(found.owner, one.is_protected ? kAnna : 0);
    unlink(kPath);
  }
}

TEST_F(LockPathTest, FilesOfTheDirectorysOwnerAreNotProtected) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: gives files away";
  MakeForeign();
  ASSERT_EQ(chown("/locks", kAnna, 100), 0);
  EXPECT_EQ(LookAtLock(kPath, {2, 2}).state, LockPath::kOpens);
}

TEST_F(LockPathTest, FilesOfOnesOwnAreNotProtected) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: becomes another user";
  MakeForeign();
  ASSERT_EQ(seteuid(kAnna), 0);
  EXPECT_EQ(LookAtLock(kPath, {2, 2}).state, LockPath::kOpens);
  ASSERT_EQ(seteuid(0), 0);
}

TEST_F(LockPathTest, SettingsAreReadAndWithoutThemThereAreNone) {
  test::WriteFile("/proc/sys/fs/protected_regular", "2\n");
  test::WriteFile("/proc/sys/fs/protected_fifos", "1\n");
  const velkor::UniqueFd proc(open("/proc", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  EXPECT_EQ(ReadProtection(proc.Get()).regular, 2);
  EXPECT_EQ(ReadProtection(proc.Get()).fifos, 1);
  EXPECT_EQ(ReadProtection(-1).regular, 0);
  test::MakeDirs("/elsewhere/sys/fs/protected_regular");
  const velkor::UniqueFd elsewhere(open("/elsewhere", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  EXPECT_EQ(ReadProtection(elsewhere.Get()).regular, 0);
}

}  // namespace
}  // namespace tool
