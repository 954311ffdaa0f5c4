#include "bench/speed/process.h"

#include <appindex/utilities/json_helpers.h>
#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <sstream>
#include <stdexcept>
#include <string>

namespace bench {
namespace {

constexpr double kKilobytesPerMegabyte = 1024;

std::string ReadAll(int fd) {
  std::string text;
  char buffer[65536];
  for (ssize_t n = 0; (n = read(fd, buffer, sizeof(buffer))) > 0;) {
    text.append(buffer, static_cast<std::size_t>(n));
  }
  return text;
}

bool WriteAll(int fd, const std::string& text) {
  for (std::size_t at = 0; at < text.size();) {
    const ssize_t n = write(fd, text.data() + at, text.size() - at);
    if (n < 0) return false;
    at += static_cast<std::size_t>(n);
  }
  return true;
}

Json::Value ResultOf(const std::function<Json::Value()>& work) {
  Json::Value reply(Json::objectValue);
  try {
    reply["result"] = work();
  } catch (const std::exception& e) {
    reply["error"] = e.what();
  }
  return reply;
}

}  // namespace

ProcessList::ProcessList() : proc_(open("/proc", O_RDONLY | O_DIRECTORY | O_CLOEXEC)) {
  if (!proc_.IsOpen()) throw std::runtime_error("cannot open /proc");
}

Memory ProcessList::MemoryOf(pid_t process) const {
  const std::string name = std::to_string(process) + "/status";
  const host::sdk::UniqueFd status(openat(proc_.Get(), name.c_str(), O_RDONLY | O_CLOEXEC));
  if (!status.IsOpen()) throw std::runtime_error("no process " + std::to_string(process));
  Memory memory;
  std::istringstream lines(ReadAll(status.Get()));
  for (std::string line; std::getline(lines, line);) {
    std::istringstream words(line);
    std::string key;
    double kilobytes = 0;
    if (!(words >> key >> kilobytes)) continue;
    const double megabytes = kilobytes / kKilobytesPerMegabyte;
    if (key == "RssAnon:") memory.own = megabytes;
    if (key == "RssFile:" || key == "RssShmem:") memory.files += megabytes;
    if (key == "VmHWM:") memory.peak = megabytes;
  }
  return memory;
}

Json::Value InOwnProcess(const std::function<Json::Value()>& work) {
  int ends[2];
  if (pipe2(ends, O_CLOEXEC) != 0) throw std::runtime_error("no pipe");
  host::sdk::UniqueFd read_end(ends[0]);
  std::fflush(nullptr);
  const pid_t child = fork();
  if (child < 0) throw std::runtime_error("no process");
  if (child == 0) {
    const bool written = WriteAll(ends[1], velkor::toString(ResultOf(work)));
    _exit(written ? 0 : 1);
  }
  close(ends[1]);
  const std::string text = ReadAll(read_end.Get());
  int status = 0;
  waitpid(child, &status, 0);
  Json::Value reply;
  if (status != 0 || !velkor::fromString(reply, text)) {
    throw std::runtime_error("a process ended without its result");
  }
  if (reply.isMember("error")) throw std::runtime_error(reply["error"].asString());
  return reply["result"];
}

}  // namespace bench
