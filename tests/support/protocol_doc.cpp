#include "tests/support/protocol_doc.h"

#include <fstream>
#include <regex>
#include <stdexcept>

#include "tests/support/searchd_requests.h"

namespace test {
namespace {

class Reader {
 public:
  explicit Reader(const std::string& file) : in_(file) {
    if (!in_) throw std::runtime_error("cannot read " + file);
  }

  ProtocolDoc Read() {
    while (NextLine()) {
      if (text_ == "```json") {
        TakeBlock();
      } else if (text_.rfind('#', 0) == 0) {
        TakeHeading();
      } else if (text_.rfind('|', 0) == 0) {
        TakeRow();
      } else {
        TakeProse();
      }
    }
    return std::move(doc_);
  }

 private:
  bool NextLine() {
    ++line_;
    return static_cast<bool>(std::getline(in_, text_));
  }

  void TakeBlock() {
    const int begin = line_;
    std::string block;
    while (NextLine() && text_ != "```") block += text_ + "\n";
    try {
      TakeValue(FromText(block), begin);
    } catch (const std::exception& e) {
      throw std::runtime_error("line " + std::to_string(begin) + ": " + e.what());
    }
  }

  void TakeValue(const Json::Value& value, int line) {
    if (value.isMember("command")) {
      ProtocolExample example;
      example.heading = heading_;
      example.line = line;
      example.request = value;
      example.removed_file = FileIn("After `([^`]+)` has been removed:");
      example.held_file = FileIn("While another process holds `([^`]+)`:");
      example.let_go = prose_.find("When it has let go of it:") != std::string::npos;
      doc_.examples.push_back(example);
    } else if (value.isMember("success")) {
      TakeReply(value);
    }
    prose_.clear();
  }

  void TakeReply(const Json::Value& reply) {
    if (doc_.examples.empty() || doc_.examples.back().reply) {
      throw std::runtime_error("line " + std::to_string(line_) + ": a reply without a request");
    }
    doc_.examples.back().reply = reply;
  }

  std::optional<std::string> FileIn(const std::string& sentence) const {
    std::smatch match;
    if (!std::regex_search(prose_, match, std::regex(sentence))) return std::nullopt;
    return match[1].str();
  }

  void TakeHeading() {
    heading_ = text_.substr(text_.find(' ') + 1);
    if (text_.rfind("## ", 0) == 0) chapter_ = heading_;
    if (text_.rfind("### ", 0) == 0 && chapter_ == "Commands") doc_.commands.push_back(heading_);
    table_.clear();
    prose_.clear();
  }

  void TakeRow() {
    static const std::regex two_cells("\\| ([^|]*) \\|([^|]*)\\|.*");
    std::smatch match;
    if (!std::regex_match(text_, match, two_cells)) return;
    const std::string first = match[1];
    if (table_.empty()) {
      table_ = first.substr(0, first.find(' '));
    } else if (table_ == "code") {
      doc_.codes.insert(std::stoi(first));
    } else if (table_ == "member") {
      doc_.members.insert(first.substr(1, first.size() - 2));
    } else if (table_ == "what") {
      doc_.limits[first] = SizeIn(match[2]);
    }
  }

  static std::size_t SizeIn(const std::string& cell) {
    std::smatch match;
    if (!std::regex_search(cell, match, std::regex("([0-9]+)( MiB)?"))) return 0;
    return std::stoul(match[1]) * (match[2].matched ? 1024 * 1024 : 1);
  }

  void TakeProse() {
    table_.clear();
    static const std::regex inline_reply("Reply: `(\\{.*\\})`.*");
    std::smatch match;
    if (std::regex_match(text_, match, inline_reply)) TakeReply(FromText(match[1]));
    prose_ += (prose_.empty() ? "" : " ") + text_;
  }

  std::ifstream in_;
  std::string text_;
  int line_ = 0;
  std::string chapter_;
  std::string heading_;
  std::string table_;  // the first word of the header of the table at hand
  std::string prose_;  // since the last heading or block
  ProtocolDoc doc_;
};

}  // namespace

ProtocolDoc ReadProtocolDoc(const std::string& file) { return Reader(file).Read(); }

}  // namespace test
