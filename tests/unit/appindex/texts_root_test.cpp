// Which texts root a pool finds for a descriptor. The parser here answers with the directory that
// it was asked for.
#include <dirent.h>
#include <fcntl.h>
#include <gmock/gmock.h>
#include <json/value.h>
#include <pthread.h>
#include <unistd.h>

#include <cerrno>
#include <memory>
#include <string>
#include <vector>

#include "appindex/string_pool.h"
#include "appindex/string_pool_internal.h"
#include "error_of.h"
#include "system_calls.h"
#include "tests/support/device_root_test.h"
#include "tests/support/fake_texts.h"

namespace velkor::appindex {
namespace {

using test::Calls;
using test::ErrorOf;
using test::FailureLine;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr char kBuiltIn[] = "/usr/tovo/tovoman/webman/texts/";
constexpr char kPackage[] = "/var/packages/Foo/";
constexpr char kConf[] = "/var/packages/Foo/target/ui/index.conf";

// The names in a directory, in the order in which it yields them.
std::vector<std::string> Listing(const std::string& path) {
  const std::unique_ptr<DIR, int (*)(DIR*)> dir(opendir(path.c_str()), closedir);
  std::vector<std::string> names;
  while (const dirent* entry = readdir(dir.get())) {
    const std::string name = entry->d_name;
    if (name != "." && name != "..") names.push_back(name);
  }
  return names;
}

int OpenDescriptors() {
  constexpr int kMany = 256;
  int count = 0;
  for (int fd = 0; fd < kMany; ++fd) count += fcntl(fd, F_GETFD) >= 0 ? 1 : 0;
  return count;
}

std::string OpendirLine(const std::string& dir, const std::string& tail) {
  return FailureLine("string_pool", 42, "FindPkgTextRoot",
                     "Failed [nullptr == (dir = opendir(find_dir.c_str()))], "
                     "reason: opendir failed, path=" +
                         dir + tail);
}

class TextsRootTest : public test::DeviceRootTest {
 protected:
  TextsRootTest() {
    test::Texts().parse = [](const std::string& dir) {
      Json::Value texts;
      texts["here"]["dir"] = dir;
      return texts;
    };
  }

  // The current texts root of the pool.
  std::string Root() {
    const std::string dir = pool_.GetString("enu", "here", "dir");
    EXPECT_EQ(dir.substr(dir.size() - 4), "/enu") << dir;
    return dir.substr(0, dir.size() - 3);
  }

  std::string RootFor(const std::string& conf_path) {
    pool_.SetTextsRootByConfPath(conf_path);
    return Root();
  }

  StringPool pool_;
};

TEST_F(TextsRootTest, IsThatOfTheBuiltInModulesAtFirst) { EXPECT_EQ(Root(), kBuiltIn); }

TEST_F(TextsRootTest, ABuiltInModuleGetsTheBuiltInRootWithoutALine) {
  EXPECT_EQ(RootFor("/usr/tovo/tovoman/webman/modules/X/index.conf"), kBuiltIn);
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(TextsRootTest, ABuiltInModuleAfterAPackageGetsTheBuiltInRoot) {
  test::MakeDirs("/var/packages/Foo/texts");
  EXPECT_EQ(RootFor(kConf), "/var/packages/Foo/texts/");
  EXPECT_EQ(RootFor("/usr/tovo/tovoman/webman/modules/X/index.conf"), kBuiltIn);
}

TEST_F(TextsRootTest, APackagesTextsBehindItsTargetLinkAreFound) {
  test::MakeDirs("/volume1/app/Foo/ui/texts");
  test::MakeDirs(kPackage);
  ASSERT_EQ(symlink("/volume1/app/Foo", "/var/packages/Foo/target"), 0);
  EXPECT_EQ(RootFor(kConf), "/var/packages/Foo/target/ui/texts/");
}

TEST_F(TextsRootTest, ARelativeLinkIsFollowedFromItsOwnDirectory) {
  test::MakeDirs("/var/packages/Foo/data/texts");
  test::MakeDirs("/var/packages/Bar");
  ASSERT_EQ(symlink("../Foo/data", "/var/packages/Bar/target"), 0);
  EXPECT_EQ(RootFor("/var/packages/Bar/index.conf"), "/var/packages/Bar/target/texts/");
}

TEST_F(TextsRootTest, ALinkNamedTextsToADirectoryIsAMatch) {
  test::MakeDirs("/volume1/strings");
  test::MakeDirs(kPackage);
  ASSERT_EQ(symlink("/volume1/strings", "/var/packages/Foo/texts"), 0);
  EXPECT_EQ(RootFor(kConf), "/var/packages/Foo/texts/");
}

TEST_F(TextsRootTest, LinksThatLeadInACircleEndTheSearchWithoutAFind) {
  test::MakeDirs(kPackage);
  ASSERT_EQ(symlink("/var/packages/Foo", "/var/packages/Foo/again"), 0);
  ASSERT_EQ(symlink("self", "/var/packages/Foo/self"), 0);
  EXPECT_EQ(RootFor(kConf), kBuiltIn);
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(TextsRootTest, APlainFileNamedTextsIsNoMatch) {
  test::WriteFile("/var/packages/Foo/texts", "");
  EXPECT_EQ(RootFor(kConf), kBuiltIn);
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(TextsRootTest, TheSearchGoesOnPastAPlainFileNamedTexts) {
  test::WriteFile("/var/packages/Foo/texts", "");
  test::MakeDirs("/var/packages/Foo/ui/texts");
  EXPECT_EQ(RootFor(kConf), "/var/packages/Foo/ui/texts/");
}

TEST_F(TextsRootTest, TheNameTextsIsExact) {
  for (const char* name : {"Texts", "TEXTS", "texts2", ".texts"}) {
    test::MakeDirs(kPackage + std::string(name));
  }
  EXPECT_EQ(RootFor(kConf), kBuiltIn);
}

TEST_F(TextsRootTest, TextsSixLevelsDownAreFound) {
  test::MakeDirs("/var/packages/Foo/1/2/3/4/5/texts");
  EXPECT_EQ(RootFor(kConf), "/var/packages/Foo/1/2/3/4/5/texts/");
}

TEST_F(TextsRootTest, TextsSevenLevelsDownAreNotFound) {
  test::MakeDirs("/var/packages/Foo/1/2/3/4/5/6/texts");
  EXPECT_EQ(RootFor(kConf), kBuiltIn);
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(TextsRootTest, TheFirstMatchInDirectoryOrderIsTakenUnsorted) {
  for (const char name : std::string("zyxwvutsrqponmlkjihgfedcba")) {
    test::MakeDirs(kPackage + std::string(1, name) + "/texts");
  }
  EXPECT_EQ(RootFor(kConf), kPackage + Listing(kPackage).front() + "/texts/");
}

TEST_F(TextsRootTest, TheSearchIsDepthFirst) {
  // Whichever entry comes first: the deep match below it goes before the near one of the next.
  for (const char* name : {"a", "b"}) test::MakeDirs(kPackage + std::string(name));
  const std::vector<std::string> names = Listing(kPackage);
  test::MakeDirs(kPackage + names[0] + "/1/2/3/texts");
  test::MakeDirs(kPackage + names[1] + "/texts");
  ASSERT_EQ(Listing(kPackage), names);
  EXPECT_EQ(RootFor(kConf), kPackage + names[0] + "/1/2/3/texts/");
}

TEST_F(TextsRootTest, TheSearchStartsAtThePackageDirectoryWhateverFollowsIt) {
  test::MakeDirs("/var/packages/Foo/texts");
  for (const char* conf_path : {"/var/packages/Foo", "/var/packages/Foo/index.conf",
                                "/var/packages/Foo//no such/../index.conf"}) {
    EXPECT_EQ(RootFor(conf_path), "/var/packages/Foo/texts/") << conf_path;
  }
}

TEST_F(TextsRootTest, APathThatOnlyContainsThePackagesPrefixIsNoPackages) {
  test::MakeDirs("/var/packages/Foo/texts");
  EXPECT_EQ(RootFor("/mnt/var/packages/Foo/index.conf"), kBuiltIn);
  EXPECT_EQ(RootFor("var/packages/Foo/index.conf"), kBuiltIn);
  EXPECT_EQ(RootFor("/var/packagesX/Foo/index.conf"), kBuiltIn);
  EXPECT_EQ(RootFor(""), kBuiltIn);
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(TextsRootTest, TheRegularExpressionsStartMatchesBehindALineEndToo) {
  test::MakeDirs("/var/packages/Foo/texts");
  EXPECT_EQ(RootFor("x\n/var/packages/Foo/index.conf"), "/var/packages/Foo/texts/");
}

TEST_F(TextsRootTest, AnEmptyPackageNameSearchesAllPackages) {
  test::MakeDirs("/var/packages/Foo/texts");
  EXPECT_EQ(RootFor("/var/packages//index.conf"), "/var/packages//Foo/texts/");
}

TEST_F(TextsRootTest, ThatWasFoundIsKeptForThePath) {
  test::MakeDirs("/var/packages/Foo/texts");
  EXPECT_EQ(RootFor(kConf), "/var/packages/Foo/texts/");
  ASSERT_EQ(rmdir("/var/packages/Foo/texts"), 0);
  pool_.SetTextsRootByStringSet(kConf, "strs");
  EXPECT_EQ(RootFor(kConf), "/var/packages/Foo/texts/");
}

TEST_F(TextsRootTest, TheFallbackIsKeptForThePathWithoutASecondWalk) {
  test::MakeDirs("/var/packages/Foo/ui");
  EXPECT_EQ(RootFor(kConf), kBuiltIn);
  test::MakeDirs("/var/packages/Foo/texts");
  Calls().opendir.paths.clear();
  EXPECT_EQ(RootFor(kConf), kBuiltIn);
  EXPECT_THAT(Calls().opendir.paths, IsEmpty());
}

TEST_F(TextsRootTest, AnotherPathOfThePackageIsSearchedForItself) {
  test::MakeDirs(kPackage);
  EXPECT_EQ(RootFor(kConf), kBuiltIn);
  test::MakeDirs("/var/packages/Foo/texts");
  EXPECT_EQ(RootFor("/var/packages/Foo/target/ui/other/index.conf"), "/var/packages/Foo/texts/");
}

TEST_F(TextsRootTest, AMissingPackageLogsOnceAndGetsTheBuiltInRoot) {
  errno = 0;
  EXPECT_EQ(RootFor(kConf), kBuiltIn);
  EXPECT_EQ(RootFor(kConf), kBuiltIn);
  EXPECT_THAT(TakeLog(), ElementsAre(OpendirLine(kPackage, " [err: No such file or directory]")));
}

TEST_F(TextsRootTest, AnUnreadableDirectoryAbortsTheWholeSearch) {
  for (const char* name : {"a", "b"}) test::MakeDirs(kPackage + std::string(name) + "/texts");
  const std::string first = kPackage + Listing(kPackage).front() + "/";
  Calls().opendir.fails_for = first;
  Calls().opendir.error = EACCES;
  EXPECT_EQ(RootFor(kConf), kBuiltIn);
  EXPECT_THAT(TakeLog(), ElementsAre(OpendirLine(first, " [err: Permission denied]")));
}

TEST_F(TextsRootTest, ForcedUnwindingPassesThrough) {
#ifdef __has_feature
#if __has_feature(thread_sanitizer)
  GTEST_SKIP() << "ThreadSanitizer ends the process when a thread's stack is unwound by force";
#endif
#endif
  // Cancelled where the line about the missing package is written.
  const auto set_root = [](void* pool) -> void* {
    pthread_cancel(pthread_self());
    static_cast<StringPool*>(pool)->SetTextsRootByConfPath(kConf);
    return pool;  // not reached
  };
  pthread_t thread{};
  ASSERT_EQ(pthread_create(&thread, nullptr, set_root, &pool_), 0);
  void* result = &pool_;
  ASSERT_EQ(pthread_join(thread, &result), 0);
  EXPECT_EQ(result, PTHREAD_CANCELED);
}

TEST_F(TextsRootTest, OfAStringSetIsTheDirectoryBesideTheDescriptorUnchecked) {
  pool_.SetTextsRootByStringSet("/a/b/index.conf", "strs");
  EXPECT_EQ(Root(), "/a/b/strs/");
}

TEST_F(TextsRootTest, OfAStringSetUsesThePathsAsTheyStand) {
  pool_.SetTextsRootByStringSet("/index.conf", "strs");
  EXPECT_EQ(Root(), "/strs/");
  pool_.SetTextsRootByStringSet("index.conf", "strs");
  EXPECT_EQ(Root(), "index.conf/strs/");
  pool_.SetTextsRootByStringSet("/a/index.conf", "../b/strs/");
  EXPECT_EQ(Root(), "/a/../b/strs//");
  pool_.SetTextsRootByStringSet("/a/index.conf", "");
  EXPECT_EQ(Root(), "/a//");
}

TEST_F(TextsRootTest, OfAStringSetIsNotKeptForThePath) {
  test::MakeDirs("/var/packages/Foo/texts");
  pool_.SetTextsRootByStringSet(kConf, "strs");
  EXPECT_EQ(RootFor(kConf), "/var/packages/Foo/texts/");
  pool_.SetTextsRootByStringSet(kConf, "strs");
  EXPECT_EQ(Root(), "/var/packages/Foo/target/ui/strs/");
}

class FindPkgTextRootTest : public test::DeviceRootTest {
 protected:
  static std::string ErrorWithErrno(int error) {
    Calls().opendir.fails_for = kPackage;
    return ErrorOf([error] {
      std::string out;
      errno = error;
      FindPkgTextRoot(out, kPackage, 0);
    });
  }
};

TEST_F(FindPkgTextRootTest, AFailedOpendirThrows502AndLogsThePlainLineWhenErrnoIsZero) {
  EXPECT_EQ(ErrorWithErrno(0), "502: opendir failed, path=/var/packages/Foo/");
  EXPECT_THAT(TakeLog(), ElementsAre(OpendirLine(kPackage, "")));
}

TEST_F(FindPkgTextRootTest, AFailedOpendirLogsErrnoAndClearsIt) {
  EXPECT_EQ(ErrorWithErrno(ENOENT), "502: opendir failed, path=/var/packages/Foo/");
  EXPECT_EQ(errno, 0);
  EXPECT_THAT(TakeLog(), ElementsAre(OpendirLine(kPackage, " [err: No such file or directory]")));
}

TEST_F(FindPkgTextRootTest, AFindIsStoredWithASlashAtItsEnd) {
  test::MakeDirs("/var/packages/Foo/ui/texts");
  std::string out;
  EXPECT_TRUE(FindPkgTextRoot(out, kPackage, 0));
  EXPECT_EQ(out, "/var/packages/Foo/ui/texts/");
}

TEST_F(FindPkgTextRootTest, NoFindLeavesTheOutputUntouched) {
  test::MakeDirs("/var/packages/Foo/ui");
  std::string out = "before";
  EXPECT_FALSE(FindPkgTextRoot(out, kPackage, 0));
  EXPECT_EQ(out, "before");
}

TEST_F(FindPkgTextRootTest, AtDepthFiveTextsStillMatchButOtherDirectoriesAreNotSearched) {
  test::MakeDirs("/var/packages/Foo/ui/texts");
  std::string out;
  EXPECT_FALSE(FindPkgTextRoot(out, kPackage, 5));
  EXPECT_TRUE(FindPkgTextRoot(out, "/var/packages/Foo/ui/", 5));
}

TEST_F(FindPkgTextRootTest, ClosesEveryDirectoryInEveryCase) {
  test::MakeDirs("/var/packages/Foo/1/2/texts");
  ErrorWithErrno(ENOENT);  // opens the connection to the system log, which stays
  const int before = OpenDescriptors();
  std::string out;

  Calls().opendir.fails_for = "/var/packages/Foo/1/2/";
  EXPECT_EQ(ErrorOf([&] { FindPkgTextRoot(out, kPackage, 0); }),
            "502: opendir failed, path=/var/packages/Foo/1/2/");
  Calls().opendir.fails_for = "";
  EXPECT_TRUE(FindPkgTextRoot(out, kPackage, 0));
  EXPECT_FALSE(FindPkgTextRoot(out, kPackage, 4));
  EXPECT_EQ(OpenDescriptors(), before);
}

}  // namespace
}  // namespace velkor::appindex
