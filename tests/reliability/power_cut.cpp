#include "tests/reliability/power_cut.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <stdexcept>

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

std::size_t PowerCut::BehindRemovalOf(const std::string& name) const {
  std::size_t at = 0;
  for (const DiskAct& act : acts_) {
    at += BytesOf(act);
    if (act.record.kind == DiskRecord::kRemove && act.name == name) return at;
  }
  throw std::runtime_error("nobody has removed " + name);
}

std::size_t PowerCut::Cut(
    unsigned states, unsigned seed,
    const std::function<bool(const fs::path& root, std::size_t at)>& reopen) const {
  std::mt19937 random(seed);
  std::set<std::size_t> different;
  const fs::path root = place_.Path() / "root";
  for (unsigned state = 0; state < states; ++state) {
    Disk disk = before_;
    std::size_t at = 0;
    const std::size_t acts = random() % (acts_.size() + 1);
    for (std::size_t i = 0; i < acts; ++i) {
      disk.Apply(acts_[i]);
      at += BytesOf(acts_[i]);
    }
    disk.CutPower(random);
    different.insert(std::hash<std::string>()(disk.Describe()));
    disk.WriteTo(root);
    const bool go_on = reopen(root, at);
    fs::remove_all(root);
    if (!go_on) break;
  }
  return different.size();
}

}  // namespace test
