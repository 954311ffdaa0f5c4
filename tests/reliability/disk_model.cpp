#include "tests/reliability/disk_model.h"

#include <sys/stat.h>

#include <algorithm>
#include <cstring>
#include <fstream>
#include <iterator>
#include <stdexcept>

namespace test {
namespace {

namespace fs = std::filesystem;

constexpr std::size_t kBlock = 512;

std::string Content(const fs::path& file) {
  std::ifstream in(file, std::ios::binary);
  return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

void Overwrite(std::string& content, std::size_t offset, const std::string& text) {
  if (text.empty()) return;
  if (content.size() < offset + text.size()) content.resize(offset + text.size(), '\0');
  content.replace(offset, text.size(), text);
}

// A part of what was written: its beginning, or some of its blocks.
void OverwriteSome(std::string& content, std::size_t offset, const std::string& text,
                   Chance& chance) {
  if (chance.Below(2) == 0) {
    Overwrite(content, offset, text.substr(0, chance.Below(text.size() + 1)));
    return;
  }
  for (std::size_t at = 0; at < text.size(); at += kBlock) {
    if (chance.Below(2) == 0) Overwrite(content, offset + at, text.substr(at, kBlock));
  }
}

}  // namespace

std::size_t EveryChance::Below(std::size_t n) {
  if (asked_ == answers_.size()) answers_.push_back({0, n});
  return answers_[asked_++].given;
}

bool EveryChance::Next() {
  asked_ = 0;
  while (!answers_.empty() && ++answers_.back().given == answers_.back().below) {
    answers_.pop_back();
  }
  return !answers_.empty();
}

std::vector<DiskAct> ReadDiskActs(const std::string& file) {
  const std::string bytes = Content(file);
  std::vector<DiskAct> acts;
  for (std::size_t at = 0; at < bytes.size();) {
    DiskAct act{};
    std::memcpy(&act.record, bytes.data() + at, sizeof(act.record));
    at += sizeof(act.record);
    act.name = bytes.substr(at, act.record.name_size);
    at += act.record.name_size;
    act.text = bytes.substr(at, act.record.text_size);
    at += act.record.text_size;
    acts.push_back(std::move(act));
  }
  return acts;
}

std::size_t BytesOf(const DiskAct& act) {
  return sizeof(act.record) + act.name.size() + act.text.size();
}

Disk::Disk(const fs::path& root) { Load(root); }

std::size_t Disk::Load(const fs::path& path) {
  struct stat status {};
  if (lstat(path.c_str(), &status) != 0) throw std::runtime_error("no " + path.string());
  const std::size_t node = nodes_.size();
  nodes_.emplace_back();
  nodes_[node].directory = S_ISDIR(status.st_mode);
  nodes_[node].mode = status.st_mode & 07777U;
  by_inode_[status.st_ino] = node;
  if (S_ISREG(status.st_mode)) nodes_[node].content = Content(path);
  if (!S_ISDIR(status.st_mode)) return node;
  for (const auto& entry : fs::directory_iterator(path)) {
    if (!entry.is_directory() && !entry.is_regular_file()) continue;
    const std::size_t child = Load(entry.path());
    nodes_[node].entries[entry.path().filename()] = child;
  }
  return node;
}

void Disk::Defer(std::uint64_t inode, const DiskAct& act, std::size_t made) {
  const auto found = by_inode_.find(inode);
  if (found == by_inode_.end()) throw std::runtime_error("an act on a file that nobody has made");
  nodes_[found->second].pending.push_back(act);
  nodes_[found->second].made.push_back(made);
}

void Disk::Apply(const DiskAct& act) {
  const DiskRecord& record = act.record;
  switch (record.kind) {
    case DiskRecord::kMakeFile:
    case DiskRecord::kMakeDirectory:
      // The number may have been that of a file that is gone.
      by_inode_[record.file] = nodes_.size();
      nodes_.emplace_back();
      nodes_.back().directory = record.kind == DiskRecord::kMakeDirectory;
      nodes_.back().mode = record.value;
      return Defer(record.directory, act, nodes_.size() - 1);
    case DiskRecord::kWrite:
    case DiskRecord::kTruncate:
    case DiskRecord::kMode:
      return Defer(record.file, act);
    case DiskRecord::kRename:
    case DiskRecord::kRemove:
      return Defer(record.directory, act);
    case DiskRecord::kSync: {
      const auto found = by_inode_.find(record.file);
      if (found == by_inode_.end()) throw std::runtime_error("a sync of what nobody has made");
      Node& node = nodes_[found->second];
      return Commit(node, node.pending.size());
    }
    case DiskRecord::kNotModelled:
      throw std::runtime_error("not in the model: " + act.text);
  }
}

// Brings an act to the disk. `made` is the node of the entry that it makes.
void Disk::CarryOut(Node& node, const DiskAct& act, std::size_t made) {
  switch (act.record.kind) {
    case DiskRecord::kMakeFile:
    case DiskRecord::kMakeDirectory:
      node.entries[act.name] = made;
      return;
    case DiskRecord::kRename:
      if (node.entries.count(act.name) == 0) throw std::runtime_error("no entry " + act.name);
      node.entries[act.text] = node.entries[act.name];
      node.entries.erase(act.name);
      return;
    case DiskRecord::kRemove:
      node.entries.erase(act.name);
      return;
    case DiskRecord::kWrite:
      return Overwrite(node.content, act.record.value, act.text);
    case DiskRecord::kTruncate:
      return node.content.resize(act.record.value, '\0');
    case DiskRecord::kMode:
      node.mode = act.record.value;
      return;
    case DiskRecord::kSync:
    case DiskRecord::kNotModelled:
      return;  // never deferred
  }
}

// Brings the first so many of the pending acts to the disk, and forgets the others.
void Disk::Commit(Node& node, std::size_t acts) {
  for (std::size_t i = 0; i < acts; ++i) CarryOut(node, node.pending[i], node.made[i]);
  node.pending.clear();
  node.made.clear();
}

// The mode of a directory keeps its place among the entries.
void Disk::CommitSome(Node& node, Chance& chance) {
  if (node.directory) return Commit(node, chance.Below(node.pending.size() + 1));
  for (const DiskAct& act : node.pending) {
    const std::size_t luck = chance.Below(3);
    if (luck == 1 && act.record.kind == DiskRecord::kWrite) {
      OverwriteSome(node.content, act.record.value, act.text, chance);
    } else if (luck != 0) {
      CarryOut(node, act, 0);
    }
  }
  Commit(node, 0);
}

void Disk::SyncAll() {
  for (Node& node : nodes_) Commit(node, node.pending.size());
}

void Disk::CutPower(Chance& chance) {
  constexpr unsigned kEverything = 0;
  constexpr unsigned kNothing = 1;
  const std::size_t luck = chance.Below(4);
  for (Node& node : nodes_) {
    if (luck == kEverything) {
      Commit(node, node.pending.size());
    } else if (luck == kNothing) {
      Commit(node, 0);
    } else {
      CommitSome(node, chance);
    }
  }
}

void Disk::WriteTo(const fs::path& root) const { WriteNode(0, root); }

void Disk::WriteNode(std::size_t node, const fs::path& path) const {
  const Node& written = nodes_[node];
  if (written.directory) {
    fs::create_directory(path);
    for (const auto& [name, child] : written.entries) WriteNode(child, path / name);
  } else {
    std::ofstream out(path, std::ios::binary);
    out << written.content;
    if (!out.flush()) throw std::runtime_error("cannot write " + path.string());
  }
  fs::permissions(path, static_cast<fs::perms>(written.mode));
}

std::string Disk::Describe() const {
  std::string text;
  DescribeNode(0, "", text);
  return text;
}

void Disk::DescribeNode(std::size_t node, const std::string& path, std::string& text) const {
  const Node& described = nodes_[node];
  text += path + " " + std::to_string(described.mode) + " " +
          std::to_string(described.content.size()) + " " + described.content + "\n";
  for (const auto& [name, child] : described.entries) DescribeNode(child, path + "/" + name, text);
}

}  // namespace test
