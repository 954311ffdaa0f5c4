// What may stand in a package in place of a descriptor or a file of texts.
#pragma once

#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <sys/un.h>
#include <unistd.h>

#include <functional>
#include <string>
#include <vector>

#include "tests/support/device_root_test.h"
#include "tests/support/searchd_process.h"

namespace test {

// None of them holds a descriptor or texts.
struct HostileFile {
  const char* name;
  // Puts it at a path where nothing is; false where the system does not allow it.
  std::function<bool(const std::string& path)> make;
};

inline bool MakeLink(const std::string& target, const std::string& path) {
  return symlink(target.c_str(), path.c_str()) == 0;
}

inline bool MakeContent(const std::string& content, const std::string& path) {
  WriteFile(path, content);
  return true;
}

inline bool MakeSocket(const std::string& path) {
  const Fd fd(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  const sockaddr_un address = SocketAddress(path);
  return bind(fd.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof(address)) == 0;
}

// A file of zeros that takes no room.
inline bool MakeHole(const std::string& path, off_t bytes) {
  WriteFile(path, "");
  return truncate(path.c_str(), bytes) == 0;
}

inline std::vector<HostileFile> HostileFiles() {
  using Path = const std::string&;
  const auto device = [](unsigned minor_number) {
    return [minor_number](Path path) {
      return mknod(path.c_str(), S_IFCHR | 0666, makedev(1, minor_number)) == 0;
    };
  };
  const auto content = [](std::string text) {
    return [text = std::move(text)](Path path) { return MakeContent(text, path); };
  };
  constexpr off_t kHundredMegabytes = 100'000'000;
  return {
      {"AFifo", [](Path path) { return mkfifo(path.c_str(), 0666) == 0; }},
      {"ASocket", MakeSocket},
      {"ADirectory", [](Path path) { return mkdir(path.c_str(), 0755) == 0; }},
      {"ADeviceWithoutContent", device(3)},
      {"ADeviceWithoutEnd", device(5)},
      {"ALinkToItself", [](Path path) { return MakeLink(path, path); }},
      {"ALoopOfLinks",
       [](Path path) { return MakeLink(path, path + ".to") && MakeLink(path + ".to", path); }},
      {"ALinkToNowhere", [](Path path) { return MakeLink("/gone", path); }},
      {"ALinkToADirectory", [](Path path) { return MakeLink("/etc", path); }},
      {"ALinkToAFifo",
       [](Path path) {
         return mkfifo((path + ".to").c_str(), 0666) == 0 && MakeLink(path + ".to", path);
       }},
      {"ALinkToTheLogsSocket", [](Path path) { return MakeLink("/dev/log", path); }},
      {"ALinkOutOfThePackage", [](Path path) { return MakeLink("/etc/passwd", path); }},
      {"NoBytes", content("")},
      {"ZeroBytes", content(std::string(1000, '\0'))},
      {"WrongBytes", content("\xFF\xFE\xC3\x28\xED\xA0\x80")},
      {"ByteOrderMarkAlone", content("\xEF\xBB\xBF")},
      {"TextOfSixteenBits", content(std::string("{\0\"\0a\0p\0p\0", 10))},
      {"DeepLists", content(std::string(1'000'000, '['))},
      {"DeepObjects",
       [](Path path) {
         std::string text;
         for (int i = 0; i < 200'000; ++i) text += "{\"a\":";
         return MakeContent(text, path);
       }},
      {"HundredMegabytes", [](Path path) { return MakeHole(path, kHundredMegabytes); }},
  };
}

// Calls `test` with each of them, and its number. Returns the names of those that the system does
// not allow, which the test is to skip aloud.
inline std::string ForEachHostileFile(
    const std::function<bool(const HostileFile& file, int number)>& test) {
  std::string refused;
  int number = 0;
  for (const HostileFile& file : HostileFiles()) {
    SCOPED_TRACE(file.name);
    if (!test(file, ++number)) refused += std::string(refused.empty() ? "" : ", ") + file.name;
  }
  return refused;
}

}  // namespace test
