#include "tests/unit/tool/recorded_calls.h"

#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <utility>

namespace test {
namespace {

thread_local std::vector<std::string>* recorded = nullptr;
thread_local const std::vector<std::string>* failing_calls = nullptr;

bool IsOf(int fd, mode_t type) {
  struct stat info {};
  return fstat(fd, &info) == 0 && (info.st_mode & S_IFMT) == type;
}

// Whether the call is to fail.
bool Fails(const std::string& call) {
  if (recorded == nullptr) return false;
  recorded->push_back(call);
  const auto begins = [&](const std::string& text) {
    return call.compare(0, text.size(), text) == 0;
  };
  const bool fails = std::any_of(failing_calls->begin(), failing_calls->end(), begins);
  if (fails) errno = EIO;
  return fails;
}

}  // namespace

RecordedCalls::RecordedCalls(std::vector<std::string>& calls, std::vector<std::string> failing)
    : failing_(std::move(failing)) {
  failing_calls = &failing_;
  recorded = &calls;
}

RecordedCalls::~RecordedCalls() { recorded = nullptr; }

}  // namespace test

// Bound to from everywhere in the program, before the C library's.
#define VISIBLE __attribute__((visibility("default")))

extern "C" {

VISIBLE ssize_t write(int fd, const void* data, size_t size) {
  if (test::recorded != nullptr && test::IsOf(fd, S_IFREG) &&
      test::Fails("write " + std::to_string(size) + " to a file")) {
    return -1;
  }
  return syscall(SYS_write, fd, data, size);
}

VISIBLE int fsync(int fd) {
  if (test::recorded != nullptr &&
      test::Fails(test::IsOf(fd, S_IFDIR) ? "fsync of a directory" : "fsync of a file")) {
    return -1;
  }
  return static_cast<int>(syscall(SYS_fsync, fd));
}

VISIBLE int ftruncate(int fd, off_t size) noexcept {
  if (test::recorded != nullptr && test::Fails("ftruncate to " + std::to_string(size))) return -1;
  return static_cast<int>(syscall(SYS_ftruncate, fd, size));
}

}  // extern "C"
