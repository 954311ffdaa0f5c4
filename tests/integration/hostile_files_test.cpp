// The shipped library and files of a package that are not what they should be.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/inotify.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <map>
#include <string>
#include <vector>

#include "appindex/index_mgr.h"
#include "appindex/utilities/json_helpers.h"
#include "tests/integration/hostile_files.h"
#include "tests/support/controlled_time.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"

namespace velkor::appindex {
namespace {

using test::ConfOf;
using test::HostileFile;
using test::PerLang;
using test::ReindexCommands;
using test::ScriptedDaemon;

const std::string kGood = "Zgood";  // behind all others

class HostileFiles : public test::DeviceRootTest {
 protected:
  static std::string NameOf(int number) { return "Bad" + std::to_string(number); }
};

TEST_F(HostileFiles, InPlaceOfDescriptorsGiveNothingAndKeepNobodyElseOut) {
  test::Install(kGood);
  int count = 0;
  const std::string refused = test::ForEachHostileFile([&](const HostileFile& file, int number) {
    count = number;
    test::MakeDirs("/var/packages/" + NameOf(number) + "/target/ui");
    return file.make(ConfOf(NameOf(number)));
  });
  {
    ScriptedDaemon daemon;
    Reindex();
    EXPECT_EQ(daemon.Commands(), ReindexCommands({kGood}));
  }
  const std::vector<std::string> commits = PerLang({"commit appindex_LANG"});
  for (int number = 1; number <= count; ++number) {
    ScriptedDaemon daemon;
    Add(ConfOf(NameOf(number)), true);
    Del(ConfOf(NameOf(number)), true);
    EXPECT_EQ(daemon.Commands(), test::Joined({commits, commits})) << number;
    test::Enqueue(test::Request(1, ConfOf(NameOf(number))));
  }
  test::Enqueue(test::Request(1, ConfOf(kGood)));
  ScriptedDaemon daemon;
  ProcessQueue();
  EXPECT_EQ(daemon.Commands().size(), 21U * (static_cast<unsigned>(count) + 2));
  EXPECT_THAT(daemon.Commands(), testing::Contains("document_upsert_by_id appindex_trk " + kGood));
  EXPECT_FALSE(test::Exists(test::kBatch));
  if (!refused.empty()) GTEST_SKIP() << "the system does not allow " << refused;
}

TEST_F(HostileFiles, ThatComeBetweenTwoLanguagesEndWhatADescriptorGives) {
  const std::string refused = test::ForEachHostileFile([](const HostileFile& file, int number) {
    const std::string name = NameOf(number);
    test::Install(name);
    bool made = true;
    test::Time().usleeps.clear();
    test::Time().on_usleep = [&](unsigned) {
      if (test::Time().usleeps.size() != 3) return;
      std::filesystem::remove(ConfOf(name));
      made = file.make(ConfOf(name));
    };
    ScriptedDaemon daemon;
    Add(ConfOf(name), false);
    EXPECT_THAT(daemon.Commands(),
                testing::ElementsAre("document_upsert_by_id appindex_chs " + name,
                                     "document_upsert_by_id appindex_cht " + name,
                                     "document_upsert_by_id appindex_csy " + name));
    return made;
  });
  if (!refused.empty()) GTEST_SKIP() << "the system does not allow " << refused;
}

// Texts.

std::string TextsOf(const std::string& package, const std::string& lang) {
  return "/var/packages/" + package + "/target/ui/texts/" + lang + "/strings";
}

// The titles that the daemon was sent, by language.
std::map<std::string, std::string> TitlesIn(ScriptedDaemon& daemon) {
  std::map<std::string, std::string> titles;
  for (const Json::Value& request : daemon.Requests()) {
    if (request["command"] != "document_upsert_by_id") continue;
    const std::string id = request["data"]["id"].asString();
    titles[id.substr(id.size() - 3)] = request["data"]["data"]["title"].asString();
  }
  EXPECT_EQ(titles.size(), test::LangsInOrder().size());
  return titles;
}

class HostileTexts : public HostileFiles {
 protected:
  // A package with texts in French and in one more language, which the file is for.
  static bool InstallWith(const HostileFile& file, const std::string& name,
                          const std::string& lang) {
    test::WriteFile(ConfOf(name), R"({"app":"App","title":"app:title"})");
    for (const std::string& other : {std::string("enu"), std::string("fre")}) {
      test::WriteFile(TextsOf(name, other), "[app]\ntitle=\"Title " + other + "\"\n");
    }
    test::MakeDirs(std::filesystem::path(TextsOf(name, lang)).parent_path());
    std::filesystem::remove(TextsOf(name, lang));
    return file.make(TextsOf(name, lang));
  }

  static std::map<std::string, std::string> TitlesOf(const std::string& name) {
    ScriptedDaemon daemon;
    Add(ConfOf(name), false);
    return TitlesIn(daemon);
  }
};

TEST_F(HostileTexts, OfALanguageLeaveItTheEnglishOnes) {
  const std::string refused = test::ForEachHostileFile([](const HostileFile& file, int number) {
    const bool made = InstallWith(file, NameOf(number), "ger");
    auto titles = TitlesOf(NameOf(number));
    EXPECT_EQ(titles["ger"], "Title enu");
    EXPECT_EQ(titles["fre"], "Title fre");
    EXPECT_EQ(titles["enu"], "Title enu");
    return made;
  });
  if (!refused.empty()) GTEST_SKIP() << "the system does not allow " << refused;
}

TEST_F(HostileTexts, OfEnglishLeaveTheReferencesThemselves) {
  const std::string refused = test::ForEachHostileFile([](const HostileFile& file, int number) {
    const bool made = InstallWith(file, NameOf(number), "enu");
    auto titles = TitlesOf(NameOf(number));
    EXPECT_EQ(titles["fre"], "Title fre");
    EXPECT_EQ(titles["enu"], "app:title");
    EXPECT_EQ(titles["ger"], "app:title");
    return made;
  });
  if (!refused.empty()) GTEST_SKIP() << "the system does not allow " << refused;
}

constexpr char kTexts[] = "/var/packages/App/target/ui/texts/";

class ChangingFiles : public test::DeviceRootTest {};

// The texts of all languages are read with the first reference, and kept.
TEST_F(ChangingFiles, TextsThatVanishOrChangeBetweenTwoLanguagesAreThoseOfTheBeginning) {
  for (const char* lang : {"enu", "ger", "trk"}) {
    test::WriteFile(kTexts + std::string(lang) + "/strings",
                    "[app]\ntitle=\"Title " + std::string(lang) + "\"\n");
  }
  test::WriteFile(ConfOf("App"), R"({"app":"App","title":"app:title"})");
  test::Time().on_usleep = [](unsigned) {
    test::WriteFile(kTexts + std::string("ger/strings"), "[app]\ntitle=\"Changed\"\n");
    std::filesystem::remove_all(kTexts + std::string("trk"));
  };
  ScriptedDaemon daemon;
  Add(ConfOf("App"), false);
  const auto requests = daemon.Requests();
  EXPECT_EQ(requests[6]["data"]["data"]["title"].asString(), "Title ger");
  EXPECT_EQ(requests[20]["data"]["data"]["title"].asString(), "Title trk");
}

// A descriptor is read anew for each language.
TEST_F(ChangingFiles, DescriptorThatIsAnotherValidOneBetweenTwoLanguagesGivesThatFromThenOn) {
  test::WriteFile(ConfOf("App"), R"({"app":"Old","title":"Old title"})");
  test::Time().usleeps.clear();
  test::Time().on_usleep = [](unsigned) {
    if (test::Time().usleeps.size() != 3) return;
    test::WriteFile(ConfOf("App"), R"({"app":"New","title":"New title","modules":[]})");
  };
  ScriptedDaemon daemon;
  Add(ConfOf("App"), false);
  std::vector<std::string> expected;
  for (const std::string& lang : test::LangsInOrder()) {
    const bool before = expected.size() < 3;
    expected.push_back("document_upsert_by_id appindex_" + lang + (before ? " Old" : " New"));
  }
  EXPECT_EQ(daemon.Commands(), expected);
  std::map<std::string, std::string> titles = TitlesIn(daemon);
  EXPECT_EQ(titles["csy"], "Old title");
  EXPECT_EQ(titles["dan"], "New title");
}

TEST_F(ChangingFiles, DescriptorThatVanishesBetweenTwoLanguagesEndsItsDeletionToo) {
  test::Install("App");
  int commits = 0;
  ScriptedDaemon daemon([&](const Json::Value& request) {
    if (request["command"] == "commit" && ++commits == 2) unlink(ConfOf("App").c_str());
    return test::Success();
  });
  Del(ConfOf("App"), true);
  EXPECT_THAT(daemon.Commands(), testing::Contains("document_del_by_id appindex_cht App"));
  EXPECT_THAT(daemon.Commands(),
              testing::Not(testing::Contains("document_del_by_id appindex_csy App")));
}

TEST_F(ChangingFiles, PackageThatVanishesDuringARebuildIsPassedOver) {
  test::Install("A");
  test::Install("B");
  test::Install("C");
  test::Time().on_usleep = [](unsigned) { std::filesystem::remove_all("/var/packages/B"); };
  ScriptedDaemon daemon;
  Reindex();
  EXPECT_EQ(daemon.Commands(), ReindexCommands({"A", "C"}));
}

TEST_F(ChangingFiles, ThoseThatMayNotBeReadGiveNothing) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: switches to another user";
  test::WriteFile(ConfOf("App"), R"({"app":"App","title":"app:title"})", 0);
  ScriptedDaemon daemon;
  ASSERT_EQ(chmod(test::kSocket, 0666), 0);
  ASSERT_EQ(seteuid(1001), 0);
  Add(ConfOf("App"), true);
  ASSERT_EQ(seteuid(0), 0);
  EXPECT_EQ(daemon.Commands(), PerLang({"commit appindex_LANG"}));
}

// The texts are read as whoever calls: a language that may not be read has the English ones.
TEST_F(ChangingFiles, TextsThatMayNotBeReadLeaveTheEnglishOnes) {
  if (!test::IsTrueRoot()) GTEST_SKIP() << "needs root: switches to another user";
  for (const char* lang : {"enu", "fre", "ger"}) {
    test::WriteFile(kTexts + std::string(lang) + "/strings",
                    "[app]\ntitle=\"Title " + std::string(lang) + "\"\n",
                    lang == std::string("ger") ? 0 : 0644);
  }
  test::WriteFile(ConfOf("App"), R"({"app":"App","title":"app:title"})");
  ScriptedDaemon daemon;
  ASSERT_EQ(chmod(test::kSocket, 0666), 0);
  ASSERT_EQ(seteuid(1001), 0);
  Add(ConfOf("App"), true);
  ASSERT_EQ(seteuid(0), 0);
  std::map<std::string, std::string> titles = TitlesIn(daemon);
  EXPECT_EQ(titles["fre"], "Title fre");
  EXPECT_EQ(titles["ger"], "Title enu");
  EXPECT_EQ(titles["trk"], "Title enu");
}

// What is looked at is not acted upon.

class ReadOnly : public test::DeviceRootTest {
 protected:
  // How often files of the directory were opened or changed while `call` ran.
  static int Touched(const std::string& path, std::uint32_t events,
                     const std::function<void()>& call) {
    const int fd = inotify_init1(IN_NONBLOCK | IN_CLOEXEC);
    EXPECT_GE(inotify_add_watch(fd, path.c_str(), events), 0);
    call();
    alignas(inotify_event) char buffer[4096];
    const ssize_t size = read(fd, buffer, sizeof(buffer));
    close(fd);
    return size > 0 ? 1 : 0;
  }

  static void AddBoth() {
    ScriptedDaemon daemon;
    Add(ConfOf("App"), false);
    Del(ConfOf("App"), false);
  }
};

TEST_F(ReadOnly, WhatIsNoRegularFileIsNotEvenOpened) {
  test::MakeDirs("/var/packages/App/target/ui");
  ASSERT_EQ(mkfifo("/tmp/fifo", 0666), 0);
  ASSERT_EQ(symlink("/tmp/fifo", ConfOf("App").c_str()), 0);
  EXPECT_EQ(Touched("/tmp/fifo", IN_OPEN, AddBoth), 0);
  unlink(ConfOf("App").c_str());

  test::WriteFile(ConfOf("App"), R"({"app":"App","title":"app:title"})");
  test::MakeDirs(kTexts + std::string("ger"));
  ASSERT_EQ(symlink("/tmp/fifo", (kTexts + std::string("ger/strings")).c_str()), 0);
  EXPECT_EQ(Touched("/tmp/fifo", IN_OPEN, AddBoth), 0);
  test::WriteFile("/tmp/seen", "{}");
  EXPECT_EQ(Touched("/tmp/seen", IN_OPEN, [] { test::ReadFile("/tmp/seen"); }), 1);
}

TEST_F(ReadOnly, FilesThatLinksLeadOutToAreReadAndNothingElse) {
  const std::string secret = R"({"app":"Secret","title":"app:title"})";
  test::WriteFile("/etc/secret", secret, 0600);
  test::WriteFile("/etc/texts/ger/strings", "[app]\ntitle=\"Titel\"\n", 0600);
  test::MakeDirs("/var/packages/App/target/ui");
  ASSERT_EQ(symlink("/etc/secret", ConfOf("App").c_str()), 0);
  ASSERT_EQ(symlink("/etc/texts", "/var/packages/App/target/texts"), 0);
  constexpr std::uint32_t kChanges =
      IN_MODIFY | IN_ATTRIB | IN_CLOSE_WRITE | IN_CREATE | IN_DELETE | IN_MOVE;
  EXPECT_EQ(Touched("/etc", kChanges, AddBoth), 0);
  EXPECT_EQ(Touched("/etc/texts/ger", kChanges, AddBoth), 0);
  ScriptedDaemon daemon;
  Add(ConfOf("App"), false);
  const Json::Value document = daemon.Requests()[6]["data"]["data"];
  EXPECT_EQ(document["id"].asString() + document["title"].asString(), "SecretTitel");
  EXPECT_EQ(test::ReadFile("/etc/secret"), secret);
  EXPECT_EQ(test::ModeOf("/etc/secret"), 0600U);
}

// A process without a terminal must not get one by reading what a link leads to.
TEST(Terminal, ThatIsReadDoesNotBecomeTheProcesssOwn) {
  const pid_t child = fork();
  if (child == 0) {
    setsid();
    const int master = posix_openpt(O_RDWR | O_NOCTTY);
    if (master < 0 || grantpt(master) != 0 || unlockpt(master) != 0) _exit(77);
    Json::Value value;
    const bool read = fromFile(value, ptsname(master));
    _exit(!read && open("/dev/tty", O_RDWR) < 0 ? 0 : 1);
  }
  int status = 0;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  if (WEXITSTATUS(status) == 77) GTEST_SKIP() << "the system has no terminals to give";
  EXPECT_EQ(status, 0);
}

}  // namespace
}  // namespace velkor::appindex
