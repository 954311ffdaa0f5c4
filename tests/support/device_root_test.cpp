#include "tests/support/device_root_test.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>

#include "host/device_root.h"

namespace test {
namespace {

namespace fs = std::filesystem;

constexpr mode_t kSharedDirMode = 01777;

void MakeSkeleton(const std::string& root) {
  for (const char* dir : {"/dev", "/tmp", "/etc", "/var/run", "/var/packages/Velkor/etc",
                          "/usr/tovo/tovoman/webman/modules", "/usr/tovo/tovoman/webman/texts"}) {
    MakeDirs(root + dir);
  }
  chmod(root.c_str(), 0755);
  chmod((root + "/tmp").c_str(), kSharedDirMode);
  WriteFile(root + "/etc/passwd",
            "root:x:0:0::/root:/bin/sh\n"
            "Velkor:x:510:510::/var/packages/Velkor:/bin/sh\n"
            "anna:x:1001:100::/home/anna:/bin/sh\n"
            "boss:x:1002:100::/home/boss:/bin/sh\n");
  WriteFile(root + "/etc/group",
            "root:x:0:\nusers:x:100:\nVelkor:x:510:\nadministrators:x:101:boss\n");
  WriteFile(root + "/etc/tovoinfo.conf",
            std::string("unique=\"marovant_") + kPlatform + "_" + kModel + "\"\n");
  WriteFile(root + "/etc/os-release", "ID=marovanos\nVERSION_ID=\"7.2\"\nBUILD_ID=\"64570\"\n");
}

}  // namespace

DeviceRootTest::DeviceRootTest() : outside_fd_(open("/", O_RDONLY | O_DIRECTORY | O_CLOEXEC)) {
  std::string name = (fs::temp_directory_path() / "device-XXXXXX").string();
  if (mkdtemp(name.data()) == nullptr) throw std::runtime_error("cannot make " + name);
  outside_path_ = name;
  MakeSkeleton(outside_path_);
  log_ = std::make_unique<SystemLog>(outside_path_ + "/dev/log");
  host::EnterDeviceRoot(outside_path_);
  log_->Start();
  errno = 0;
}

DeviceRootTest::~DeviceRootTest() {
  closelog();
  if (geteuid() != 0 && (seteuid(0) != 0 || setegid(0) != 0)) {
    ADD_FAILURE() << "cannot become root again to leave the device root";
  }
  log_.reset();
  if (fchdir(outside_fd_) != 0 || chroot(".") != 0) {
    ADD_FAILURE() << "cannot leave the device root " << outside_path_;
  } else {
    std::error_code ignored;
    fs::remove_all(outside_path_, ignored);
  }
  close(outside_fd_);
}

bool IsTrueRoot() {
  if (geteuid() != 0) return false;
  const pid_t child = fork();
  if (child == 0) _exit(seteuid(1001) == 0 ? 0 : 1);
  int status = 0;
  return waitpid(child, &status, 0) == child && status == 0;
}

void WriteFile(const std::string& path, const std::string& content, mode_t mode) {
  if (fs::path(path).has_parent_path()) MakeDirs(fs::path(path).parent_path());
  std::ofstream(path, std::ios::binary) << content;
  if (chmod(path.c_str(), mode) != 0) throw std::runtime_error("cannot write " + path);
}

std::string ReadFile(const std::string& path) {
  std::ostringstream content;
  content << std::ifstream(path, std::ios::binary).rdbuf();
  return content.str();
}

void MakeDirs(const std::string& path) { fs::create_directories(path); }

bool Exists(const std::string& path) {
  struct stat info {};
  return lstat(path.c_str(), &info) == 0;
}

mode_t ModeOf(const std::string& path) {
  struct stat info {};
  if (lstat(path.c_str(), &info) != 0) throw std::runtime_error("no " + path);
  return info.st_mode & 07777U;
}

std::string FailureLine(const std::string& module, int line, const std::string& function,
                        const std::string& text) {
  std::ostringstream out;
  out << module << ":" << line << " (" << getpid() << ", " << geteuid() << ") (" << function << ") "
      << text;
  return out.str();
}

}  // namespace test
