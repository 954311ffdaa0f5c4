// What doc/protocol.md promises, tried out: its examples, in their order, on a daemon that has done
// nothing before.
#include "tests/support/protocol_doc.h"

#include <fcntl.h>
#include <unistd.h>

#include <cmath>
#include <filesystem>
#include <memory>
#include <set>
#include <string>

#include "tests/support/searchd_test.h"

namespace test {
namespace {

namespace fs = std::filesystem;

// Scores are printed with one digit after the point; the rest of a reply must be the same.
constexpr double kScoreTolerance = 0.05;

bool IsSame(const Json::Value& documented, const Json::Value& real, bool is_score = false) {
  if (documented.isNumeric() && real.isNumeric()) {
    const double difference = std::abs(documented.asDouble() - real.asDouble());
    return difference <= (is_score ? kScoreTolerance : 0);
  }
  if (documented.isArray() && real.isArray() && documented.size() == real.size()) {
    for (Json::ArrayIndex i = 0; i < real.size(); ++i) {
      if (!IsSame(documented[i], real[i])) return false;
    }
    return true;
  }
  if (documented.isObject() && real.isObject() &&
      documented.getMemberNames() == real.getMemberNames()) {
    for (const std::string& name : real.getMemberNames()) {
      if (!IsSame(documented[name], real[name], name == "score")) return false;
    }
    return true;
  }
  return documented == real;
}

void CollectMembers(const Json::Value& value, std::set<std::string>& members) {
  if (value.isObject()) {
    for (const std::string& name : value.getMemberNames()) members.insert(name);
  }
  if (!value.isObject() && !value.isArray()) return;
  for (const Json::Value& part : value) CollectMembers(part, members);
}

// Holds a file as a process that writes the index does.
Fd Hold(const fs::path& file) {
  Fd fd(open(file.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600));
  struct flock lock {};
  lock.l_type = F_WRLCK;
  lock.l_len = 1;
  EXPECT_EQ(fcntl(fd.Get(), F_OFD_SETLK, &lock), 0) << file;
  return fd;
}

class SearchdProtocolDoc : public SearchdTest {
 protected:
  Json::Value Try(const ProtocolExample& example) {
    if (example.held_file) held_ = std::make_unique<Fd>(Hold(Outside(*example.held_file)));
    if (example.let_go) held_.reset();
    if (example.removed_file) {
      EXPECT_TRUE(fs::remove(Outside(*example.removed_file))) << *example.removed_file;
    }
    return Ask(example.request);
  }

  std::unique_ptr<Fd> held_;
  const ProtocolDoc doc_ = ReadProtocolDoc(PROTOCOL_DOC_PATH);
};

TEST_F(SearchdProtocolDoc, EveryExampleIsTrue) {
  Start();
  for (const ProtocolExample& example : doc_.examples) {
    const Json::Value reply = Try(example);
    if (example.reply) {
      EXPECT_TRUE(IsSame(*example.reply, reply))
          << "line " << example.line << ": the daemon answers " << reply;
    } else {
      EXPECT_EQ(CodeOf(reply), 0) << "line " << example.line << ": " << reply;
    }
  }
}

TEST_F(SearchdProtocolDoc, HasAnExampleOfEachCommandInItsPlace) {
  EXPECT_GE(doc_.commands.size(), 7U);
  EXPECT_GE(doc_.examples.size(), doc_.commands.size());
  std::set<std::string> shown;
  for (const ProtocolExample& example : doc_.examples) {
    if (example.request["command"] == example.heading && example.reply) {
      shown.insert(example.heading);
    }
  }
  for (const std::string& command : doc_.commands) EXPECT_EQ(shown.count(command), 1U) << command;
}

TEST_F(SearchdProtocolDoc, HasAnExampleOfEachCode) {
  EXPECT_GE(doc_.codes.size(), 8U);
  std::set<int> shown = {607};  // which, as it says, is never given
  for (const ProtocolExample& example : doc_.examples) {
    if (example.reply) shown.insert(CodeOf(*example.reply));
  }
  for (const int code : doc_.codes) EXPECT_EQ(shown.count(code), 1U) << code;
}

TEST_F(SearchdProtocolDoc, HasAnExampleOfEachMember) {
  EXPECT_GE(doc_.members.size(), 20U);
  std::set<std::string> shown;
  for (const ProtocolExample& example : doc_.examples) {
    CollectMembers(example.request, shown);
    if (example.reply) CollectMembers(*example.reply, shown);
  }
  for (const std::string& member : doc_.members) EXPECT_EQ(shown.count(member), 1U) << member;
}

}  // namespace
}  // namespace test
