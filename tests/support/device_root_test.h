// A device root of a test's own: the test runs with a fresh temporary directory as "/".
//
// The root holds what every device has: /dev/log, /tmp, /etc with passwd, group, tovoinfo.conf and
// os-release, /var/run, /var/packages/Velkor/etc, and the empty directories of built-in modules and
// texts. The library keeps what it learnt about a device for the life of the process, so each test
// runs in a process of its own; ctest does that.
#pragma once

#include <gtest/gtest.h>
#include <sys/types.h>

#include <memory>
#include <string>
#include <vector>

#include "tests/support/system_log.h"

namespace test {

// The identity that the root's tovoinfo.conf gives.
constexpr char kPlatform[] = "helios";
constexpr char kModel[] = "M420_plus";
// What the root's os-release gives.
constexpr char kVersion[] = "marovanos-7.2-64570";

class DeviceRootTest : public ::testing::Test {
 protected:
  // Throws when the root cannot be entered, which fails the test.
  DeviceRootTest();
  ~DeviceRootTest() override;

  // The lines that the library logged since the last call.
  std::vector<std::string> TakeLog() { return log_->Take(); }

  // The directory's path outside the root, for processes that are started with it.
  const std::string& OutsidePath() const { return outside_path_; }

  // An open descriptor of the directory that was "/" before; for starting programs from there.
  int OutsideRootFd() const { return outside_fd_; }

 private:
  std::string outside_path_;
  int outside_fd_;
  std::unique_ptr<SystemLog> log_;
};

// True for root outside any user namespace of its own: the one who may become other users. Call it
// before switching. A test that needs it says so aloud:
//   if (!IsTrueRoot()) GTEST_SKIP() << "needs root: switches to another user";
bool IsTrueRoot();

// Files of the root. Directories on the way are made.
void WriteFile(const std::string& path, const std::string& content, mode_t mode = 0644);
std::string ReadFile(const std::string& path);  // empty when it cannot be read
void MakeDirs(const std::string& path);
bool Exists(const std::string& path);
mode_t ModeOf(const std::string& path);  // the permission bits

// "MODULE:LINE (PID, EUID) (FUNCTION) TEXT", as this process would log it now.
std::string FailureLine(const std::string& module, int line, const std::string& function,
                        const std::string& text);

}  // namespace test
