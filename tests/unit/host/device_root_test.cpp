#include "host/device_root.h"

#include <gmock/gmock.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <future>
#include <stdexcept>
#include <string>
#include <thread>

#include "tests/unit/host/child.h"
#include "tests/unit/host/faults.h"
#include "tests/unit/host/temp_dir.h"

namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;

std::string ErrorOfEntering(const std::string& dir) {
  try {
    host::EnterDeviceRoot(dir);
  } catch (const std::runtime_error& error) {
    return error.what();
  }
  return "";
}

TEST(DeviceRootTest, AbsolutePathsMeanFilesBelowIt) {
  const TempDir root;
  root.Write("etc/name", "the device's");
  RunInRoot(root, [] { EXPECT_EQ(ReadFile("/etc/name"), "the device's"); });
}

TEST(DeviceRootTest, NothingOutsideIsSeenAnyMore) {
  const TempDir outside;
  const std::string file = outside.Write("file", "");
  const TempDir root;
  RunInRoot(root, [&] {
    EXPECT_FALSE(std::filesystem::exists(file));
    EXPECT_FALSE(std::filesystem::exists("../.." + file));
  });
}

TEST(DeviceRootTest, TheProcessIsInTheNewRoot) {
  const TempDir root;
  RunInRoot(root, [] { EXPECT_EQ(std::filesystem::current_path(), "/"); });
}

TEST(DeviceRootTest, ARelativeDirectoryIsTakenFromWhereTheProcessIs) {
  const TempDir above;
  above.Write("device/etc/name", "device");
  RunInChild([&] {
    SkipChildUnlessARootMayBeEntered();
    std::filesystem::current_path(above.Path());
    host::EnterDeviceRoot("device");
    EXPECT_EQ(ReadFile("/etc/name"), "device");
  });
}

TEST(DeviceRootTest, AnOrdinaryUserIsRootInIt) {
  const TempDir root;
  RunInRootAsOrdinaryUser(root, [] {
    EXPECT_EQ(geteuid(), 0U);
    EXPECT_EQ(getegid(), 0U);
    std::filesystem::create_directory("/var");
    EXPECT_TRUE(std::filesystem::is_directory("/var"));
  });
}

TEST(DeviceRootTest, RootStaysTheRealRoot) {
  if (!IsRoot()) GTEST_SKIP() << "needs root";
  const TempDir root;
  RunInRoot(root, [] {
    // In a private user namespace no other user could be had.
    EXPECT_EQ(seteuid(kOrdinaryId), 0);
    EXPECT_EQ(geteuid(), kOrdinaryId);
  });
}

TEST(DeviceRootTest, HoldsForThreadsThatRunAlready) {
  if (!IsRoot()) GTEST_SKIP() << "needs root: a user namespace is for a process of one thread";
  const TempDir root;
  root.Write("inside", "");
  RunInChild([&] {
    SkipChildUnlessARootMayBeEntered();
    std::promise<void> entered;
    bool seen = false;
    std::thread thread([&] {
      entered.get_future().wait();
      seen = std::filesystem::exists("/inside");
    });
    const std::string error = ErrorOfEntering(root.Path());
    entered.set_value();
    thread.join();
    EXPECT_EQ(error, "");
    EXPECT_TRUE(seen);
  });
}

TEST(DeviceRootTest, TheErrorNamesTheDirectoryTheStepAndTheReason) {
  const TempDir dir;
  RunInChild([&] {
    SkipChildUnlessARootMayBeEntered();
    const std::string error = ErrorOfEntering(dir / "absent");
    EXPECT_THAT(error, AllOf(HasSubstr(dir / "absent"), HasSubstr("chroot"),
                             HasSubstr("No such file or directory")));
  });
}

TEST(DeviceRootTest, AFileIsNoDeviceRoot) {
  const TempDir dir;
  const std::string file = dir.Write("file", "");
  RunInChild([&] {
    SkipChildUnlessARootMayBeEntered();
    EXPECT_THAT(ErrorOfEntering(file), HasSubstr("Not a directory"));
  });
}

TEST(DeviceRootTest, AnOrdinaryUserWithASecondThreadIsToldWhy) {
  const TempDir root;
  RunInChild([&] {
    BecomeOrdinaryUser();
    std::promise<void> done;
    std::thread thread([&] { done.get_future().wait(); });
    const std::string error = ErrorOfEntering(root.Path());
    done.set_value();
    thread.join();
    EXPECT_THAT(error, AllOf(HasSubstr(root.Path()), HasSubstr("unshare"), HasSubstr("thread")));
  });
}

TEST(DeviceRootTest, AnOrdinaryUserIsToldWhichStepTheSystemRefuses) {
  struct Refused {
    Fault Faults::*call;
    int spared;
    const char* step;
  };
  const TempDir root;
  if (IsRoot()) {
    ASSERT_EQ(chown(root.Path().c_str(), kOrdinaryId, kOrdinaryId), 0);
  }
  for (const Refused& refused : {Refused{&Faults::unshare, 0, "unshare"},
                                 Refused{&Faults::open, 0, "open /proc/self/setgroups"},
                                 Refused{&Faults::write, 1, "write /proc/self/uid_map"},
                                 Refused{&Faults::chdir, 0, "chdir"}}) {
    RunInChild([&] {
      BecomeOrdinaryUser();
      SkipChildUnlessARootMayBeEntered();
      (faults.*refused.call).Arm(EPERM, refused.spared);
      EXPECT_THAT(ErrorOfEntering(root.Path()),
                  AllOf(HasSubstr(root.Path()), HasSubstr(refused.step),
                        HasSubstr(std::strerror(EPERM)), Not(HasSubstr("thread"))));
    });
  }
}

}  // namespace
