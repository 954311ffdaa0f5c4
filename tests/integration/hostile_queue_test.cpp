// The shipped library and queues of every content and size.
#include <gmock/gmock.h>
#include <json/value.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <string>
#include <vector>

#include "appindex/index_mgr.h"
#include "tests/integration/hostile_files.h"
#include "tests/integration/hostile_scale.h"
#include "tests/support/controlled_time.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"

namespace velkor::appindex {
namespace {

using test::AddCommands;
using test::ConfOf;
using test::kBatch;
using test::kQueue;
using test::Request;
using test::ScriptedDaemon;
using ::testing::IsEmpty;

class HostileQueue : public test::DeviceRootTest {
 protected:
  // Works a queue with this text, and expects that all of it is done with.
  static std::vector<std::string> CommandsOf(const std::string& text) {
    test::WriteFile(kQueue, text);
    ScriptedDaemon daemon;
    ProcessQueue();
    EXPECT_FALSE(test::Exists(kQueue));
    EXPECT_FALSE(test::Exists(kBatch));
    return daemon.Commands();
  }
};

TEST_F(HostileQueue, LinesThatAreNoRequestsHoldUpNobody) {
  const std::string good = Request(1, test::Install("App")) + "\n";
  for (const std::string& bad :
       {std::string(100, '\0'), std::string(1'000'000, '['), std::string(1'000'000, ' '),
        std::string("\xEF\xBB\xBF") + R"({"op":3})", std::string("\xFF\xFE\xC3"),
        std::string(R"({"op":3)"), std::string(R"({"op":3}{"op":3})"), std::string(R"({"op":3},)"),
        std::string(R"({"op":3,"op":3})"), std::string(R"({"op":"\ud800"})"), std::string("\r"),
        std::string(R"({"op":3} // rebuild)"), std::string("{\"op\":3\0}", 9)}) {
    EXPECT_EQ(CommandsOf(bad + "\n" + good + bad + "\n"), AddCommands("App")) << bad.substr(0, 40);
    EXPECT_EQ(CommandsOf(good + bad), AddCommands("App")) << bad.substr(0, 40) << " at the end";
  }
}

TEST_F(HostileQueue, MembersOfAnyTypeAreARequestOrALogLine) {
  const std::string good = Request(1, test::Install("App")) + "\n";
  for (const std::string value :
       {"null", "true", "0", "-1", "7", "4294967296", "18446744073709551615", "1.5", "1e300",
        "\"1\"", "[]", "[1]", "{}"}) {
    TakeLog();
    EXPECT_EQ(CommandsOf(R"({"op":)" + value + "}\n" + good), AddCommands("App")) << value;
    const bool is_int = value == "0" || value == "-1" || value == "7";
    EXPECT_EQ(TakeLog().size(), is_int ? 1U : 2U) << value;
    EXPECT_EQ(CommandsOf(R"({"op":1,"path":)" + value + "}\n" + good), AddCommands("App")) << value;
  }
}

TEST_F(HostileQueue, PathsOfAnyContentNameADescriptorOrNothing) {
  const std::string good = Request(1, test::Install("App")) + "\n";
  for (const std::string path :
       {"", "/", "index.conf/", "/index.conf.bak", "%s%n", "\\u0000", "\\ud83d\\ude00", "\\\\"}) {
    EXPECT_EQ(CommandsOf(Request(1, path) + "\n" + Request(2, path) + "\n" + good),
              AddCommands("App"))
        << path;
  }
  // Those with the right name are asked for, found missing, and committed.
  const std::vector<std::string> commits = test::PerLang({"commit appindex_LANG"});
  for (const std::string path : {"index.conf", "/index.conf", "/\\u0000/index.conf",
                                 "/gone\\n/index.conf", "/dev/null/index.conf"}) {
    EXPECT_EQ(CommandsOf(Request(1, path) + "\n"), commits) << path;
  }
}

TEST_F(HostileQueue, WithoutALastLineEndIsRead) {
  EXPECT_EQ(CommandsOf(Request(1, test::Install("App"))), AddCommands("App"));
  EXPECT_THAT(CommandsOf(R"({"op":1,"path":")" + ConfOf("App")), IsEmpty());
}

// Requests are folded as they are read.
TEST_F(HostileQueue, OfManyLinesComesToWhatTheLastOnesSay) {
  test::Install("App");
  const int lines = test::Scaled(20'000, 1'000'000);
  std::string text;
  for (int i = 0; i < lines; ++i) {
    text += Request(i % 2 == 0 ? 7 : 9, "/p" + std::to_string(i)) + "\n";
    if (i % 10 == 0) text += Request(2 - i / 10 % 2, ConfOf("App")) + "\n";
  }
  text += Request(1, ConfOf("App")) + "\n";
  EXPECT_EQ(CommandsOf(text), AddCommands("App"));
  EXPECT_EQ(TakeLog().size(), 1U);
}

TEST_F(HostileQueue, LongLineIsARequestLikeAnother) {
  const auto size = test::Scaled<std::size_t>(1'000'000, 100'000'000);
  const std::string good = Request(1, test::Install("App")) + "\n";
  const std::string name(size, 'n');
  // One that means nothing, one that is no JSON, one whose path no file has, and one that says
  // much beside what counts.
  EXPECT_EQ(CommandsOf(Request(1, "/" + name) + "\n" + good), AddCommands("App"));
  EXPECT_EQ(CommandsOf(name + "\n" + good), AddCommands("App"));
  EXPECT_EQ(CommandsOf(R"({"op":1,"path":")" + ConfOf("App") + R"(","why":")" + name + "\"}\n"),
            AddCommands("App"));
  EXPECT_EQ(CommandsOf(Request(1, "/" + name + "/index.conf") + "\n"),
            test::PerLang({"commit appindex_LANG"}));
}

TEST_F(HostileQueue, HugeFileWithoutALineIsRead) {
  test::Install("App");
  ASSERT_TRUE(test::MakeHole(kQueue, test::Scaled<off_t>(10'000'000, 300'000'000)));
  ScriptedDaemon daemon;
  ProcessQueue();
  EXPECT_FALSE(test::Exists(kBatch));
  EXPECT_THAT(daemon.Commands(), IsEmpty());
}

// What is no regular file is no queue: nothing is read, moved or lost.
TEST_F(HostileQueue, WhatIsNoFileInItsPlaceIsLeftAlone) {
  ScriptedDaemon daemon;
  const std::string refused = test::ForEachHostileFile([](const test::HostileFile& file, int) {
    std::filesystem::remove_all("/var/packages/Velkor/etc");
    test::MakeDirs("/var/packages/Velkor/etc");
    if (!file.make(kQueue)) return false;
    struct stat before {};
    EXPECT_EQ(lstat(kQueue, &before), 0);
    ProcessQueue();
    EXPECT_EQ(test::Exists(kQueue), !S_ISREG(before.st_mode));
    EXPECT_FALSE(test::Exists(kBatch));
    return true;
  });
  EXPECT_THAT(daemon.Commands(), IsEmpty());
  if (!refused.empty()) GTEST_SKIP() << "the system does not allow " << refused;
}

}  // namespace
}  // namespace velkor::appindex
