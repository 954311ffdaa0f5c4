// Recording what programs do to a device root, and building what its disk may hold after a power
// cut in the middle of it.
#pragma once

#include <filesystem>
#include <functional>
#include <memory>
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

  // How far the record had come when an entry of that name had been removed so many times.
  std::size_t BehindRemovalOf(const std::string& name, int times) const;

  // Called with a directory that holds what is on disk after a power cut, and how far the record
  // had come at the cut. Returns whether to go on.
  using Reopen = std::function<bool(const std::filesystem::path& root, std::size_t at)>;

  // How many states of the disk there can be that differ from each other; `at_most` when they are
  // as many or more.
  std::size_t CountStates(std::size_t at_most) const;

  // Cuts the power behind each act of the record in every way there is, and reopens everything that
  // can then be on disk. Returns how many states that were. Where they are few: acts that nothing
  // makes durable multiply them.
  std::size_t CutEverywhere(const Reopen& reopen) const;

  // Cuts the power here and there until `states` states that differ from each other have been
  // reopened, and returns how many they were: fewer when `reopen` ends it, or when a thousand times
  // as many cuts do not bring forth as many. Everything that is left to chance follows from the
  // seed.
  std::size_t Cut(std::size_t states, unsigned seed, const Reopen& reopen) const;

 private:
  // Tells them apart by what is on disk. The same one is reopened for each moment of the cut, as
  // more may be asked of a later one.
  class States;

  void ForEach(const std::function<bool(const Disk& disk, std::size_t at)>& look) const;

  const std::filesystem::path root_;
  const TemporaryDirectory place_;
  const Disk before_;
  int record_ = -1;
  std::vector<DiskAct> acts_;
};

}  // namespace test
