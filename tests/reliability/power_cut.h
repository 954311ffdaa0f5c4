// Recording what programs do to a device root, and building what its disk may hold after a power
// cut in the middle of it.
#pragma once

#include <filesystem>
#include <functional>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "tests/reliability/disk_model.h"

namespace test {

// A directory of its own, gone with the object.
class TemporaryDirectory {
 public:
  TemporaryDirectory();
  ~TemporaryDirectory();
  TemporaryDirectory(const TemporaryDirectory&) = delete;
  TemporaryDirectory& operator=(const TemporaryDirectory&) = delete;
  const std::filesystem::path& Path() const { return path_; }

 private:
  std::filesystem::path path_;
};

class PowerCut {
 public:
  // What is below `root` now is taken for durable.
  explicit PowerCut(const std::filesystem::path& root);
  ~PowerCut();
  PowerCut(const PowerCut&) = delete;
  PowerCut& operator=(const PowerCut&) = delete;

  // Makes the process that calls it, and the program that takes it over, record what it does.
  // Between fork and exec.
  void RecordThisProcess() const;

  // How far the record has come: everything done so far lies before it.
  std::size_t Now() const;

  // Ends the recording. Throws std::runtime_error when the record does not lead to what is below
  // the root now.
  void EndRecording();

  std::size_t Acts() const { return acts_.size(); }

  // How far the record had come when the first entry of that name had been removed.
  std::size_t BehindRemovalOf(const std::string& name) const;

  // Cuts the power `states` times, each time after a part of what was recorded, and writes what is
  // then on disk below a directory, with which `reopen` is called, along with how far the record
  // had come at the cut. Returns how many of the states differed from each other. Everything that
  // is left to chance follows from the seed. Ends early when `reopen` returns false.
  std::size_t Cut(
      unsigned states, unsigned seed,
      const std::function<bool(const std::filesystem::path& root, std::size_t at)>& reopen) const;

 private:
  const std::filesystem::path root_;
  const TemporaryDirectory place_;
  const Disk before_;
  int record_ = -1;
  std::vector<DiskAct> acts_;
};

}  // namespace test
