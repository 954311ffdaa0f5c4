// What a disk may hold after a power cut.
//
// The model: what was written to a file, and its size and mode, are on disk once the file was
// synced. What came after that is there wholly, in part (a part of its bytes, or some of its blocks
// of 512) or not at all, each act apart from the others. The entries of a directory, made, renamed
// and removed, are on disk once the directory was synced. Those after that are there up to some
// point, in the order in which they were done in that directory, and in each directory apart from
// the others. A rename is done or not, never half. Nothing else is promised: syncing a file keeps
// neither its entry nor its directory.
#pragma once

#include <cstdint>
#include <filesystem>
#include <map>
#include <random>
#include <string>
#include <vector>

#include "tests/reliability/disk_record.h"

namespace test {

// Decides what is left to chance.
class Chance {
 public:
  virtual ~Chance() = default;
  virtual std::size_t Below(std::size_t n) = 0;
};

class Luck : public Chance {
 public:
  explicit Luck(unsigned seed) : random_(seed) {}
  std::size_t Below(std::size_t n) override { return random_() % n; }

 private:
  std::mt19937 random_;
};

// Everything that may happen, one thing after the other: what asks it is done again and again, for
// as long as Next returns true, and must ask the same after the same answers.
class EveryChance : public Chance {
 public:
  std::size_t Below(std::size_t n) override;
  bool Next();

 private:
  struct Answer {
    std::size_t given;
    std::size_t below;
  };
  std::vector<Answer> answers_;
  std::size_t asked_ = 0;
};

struct DiskAct {
  DiskRecord record;
  std::string name;
  std::string text;
};

// The acts that a recorder wrote to the file, in order, and behind which of its bytes each ends.
std::vector<DiskAct> ReadDiskActs(const std::string& file);
std::size_t BytesOf(const DiskAct& act);

class Disk {
 public:
  // The directory tree as it is, all of it durable: regular files and directories.
  explicit Disk(const std::filesystem::path& root);

  // Throws std::runtime_error for an act that the model does not know.
  void Apply(const DiskAct& act);

  // Everything that was done is on disk.
  void SyncAll();

  // The power is cut: of what is not durable some is there and some is not, as `chance` has it.
  void CutPower(Chance& chance);

  // Writes what is on disk below a directory that is not there yet.
  void WriteTo(const std::filesystem::path& root) const;

  // A text of all that is on disk: paths, modes and contents.
  std::string Describe() const;

 private:
  struct Node {
    bool directory = false;
    std::uint64_t mode = 0;
    std::string content;
    std::map<std::string, std::size_t> entries;  // by name, of nodes_
    std::vector<DiskAct> pending;                // since the last sync, of it or of its entries
    std::vector<std::size_t> made;               // for each of pending: the node of a new entry
  };

  std::size_t Load(const std::filesystem::path& path);
  void Defer(std::uint64_t inode, const DiskAct& act, std::size_t made = 0);
  static void CarryOut(Node& node, const DiskAct& act, std::size_t made);
  static void Commit(Node& node, std::size_t acts);
  static void CommitSome(Node& node, Chance& chance);
  void WriteNode(std::size_t node, const std::filesystem::path& path) const;
  void DescribeNode(std::size_t node, const std::string& path, std::string& text) const;

  std::vector<Node> nodes_;  // the root is the first
  std::map<std::uint64_t, std::size_t> by_inode_;
};

}  // namespace test
