#include "tests/reliability/power_cut.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <set>
#include <stdexcept>
#include <utility>

namespace test {

namespace fs = std::filesystem;

TemporaryDirectory::TemporaryDirectory() {
  std::string name = (fs::temp_directory_path() / "power-cut-XXXXXX").string();
  if (mkdtemp(name.data()) == nullptr) throw std::runtime_error("cannot make " + name);
  path_ = name;
}

TemporaryDirectory::~TemporaryDirectory() {
  std::error_code ignored;
  fs::remove_all(path_, ignored);
}

PowerCut::PowerCut(const fs::path& root) : root_(root), before_(root) {
  record_ = open((place_.Path() / "record").c_str(), O_RDWR | O_CREAT | O_APPEND | O_CLOEXEC, 0600);
  if (record_ < 0) throw std::runtime_error("cannot make a record");
}

PowerCut::~PowerCut() { close(record_); }

void PowerCut::RecordThisProcess() const {
  dup2(record_, kDiskRecordFd);
  setenv("LD_PRELOAD", DISK_RECORDER, 1);
  struct stat status {};
  stat(root_.c_str(), &status);
  setenv(kRecordedDisk, std::to_string(status.st_dev).c_str(), 1);
}

std::size_t PowerCut::Now() const {
  struct stat status {};
  fstat(record_, &status);
  return static_cast<std::size_t>(status.st_size);
}

void PowerCut::EndRecording() {
  acts_ = ReadDiskActs(place_.Path() / "record");
  Disk replayed = before_;
  for (const DiskAct& act : acts_) replayed.Apply(act);
  replayed.SyncAll();
  if (replayed.Describe() != Disk(root_).Describe()) {
    throw std::runtime_error("something was done to the files that was not recorded");
  }
}

std::size_t PowerCut::BehindRemovalOf(const std::string& name, int times) const {
  std::size_t at = 0;
  for (const DiskAct& act : acts_) {
    at += BytesOf(act);
    const bool removed = act.record.kind == DiskRecord::kRemove && act.name == name;
    if (removed && --times == 0) return at;
  }
  throw std::runtime_error("nobody has so often removed " + name);
}

class PowerCut::States {
 public:
  explicit States(fs::path root) : root_(std::move(root)) {}

  bool Reopened(const Disk& disk, std::size_t at, const Reopen& reopen) {
    const std::size_t content = std::hash<std::string>()(disk.Describe());
    contents_.insert(content);
    if (!seen_.insert({content, at}).second) return true;
    disk.WriteTo(root_);
    const bool go_on = reopen(root_, at);
    fs::remove_all(root_);
    return go_on;
  }

  std::size_t Different() const { return contents_.size(); }

 private:
  const fs::path root_;
  std::set<std::size_t> contents_;
  std::set<std::pair<std::size_t, std::size_t>> seen_;
};

void PowerCut::ForEach(const std::function<bool(const Disk& disk, std::size_t at)>& look) const {
  Disk done = before_;
  std::size_t at = 0;
  for (std::size_t acts = 0;; ++acts) {
    EveryChance chance;
    do {
      Disk disk = done;
      disk.CutPower(chance);
      if (!look(disk, at)) return;
    } while (chance.Next());
    if (acts == acts_.size()) return;
    done.Apply(acts_[acts]);
    at += BytesOf(acts_[acts]);
  }
}

std::size_t PowerCut::CountStates(std::size_t at_most) const {
  std::set<std::string> contents;
  ForEach([&](const Disk& disk, std::size_t) {
    contents.insert(disk.Describe());
    return contents.size() < at_most;
  });
  return contents.size();
}

std::size_t PowerCut::CutEverywhere(const Reopen& reopen) const {
  States states(place_.Path() / "root");
  ForEach([&](const Disk& disk, std::size_t at) { return states.Reopened(disk, at, reopen); });
  return states.Different();
}

std::size_t PowerCut::Cut(std::size_t states, unsigned seed, const Reopen& reopen) const {
  constexpr std::size_t kCutsForEach = 1000;
  Luck luck(seed);
  States reopened(place_.Path() / "root");
  for (std::size_t cut = 0; cut < states * kCutsForEach && reopened.Different() < states; ++cut) {
    Disk disk = before_;
    std::size_t at = 0;
    const std::size_t acts = luck.Below(acts_.size() + 1);
    for (std::size_t i = 0; i < acts; ++i) {
      disk.Apply(acts_[i]);
      at += BytesOf(acts_[i]);
    }
    disk.CutPower(luck);
    if (!reopened.Reopened(disk, at, reopen)) break;
  }
  return reopened.Different();
}

}  // namespace test
