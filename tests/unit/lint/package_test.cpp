// Which packages a path names, and that their files are found as the library finds them.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <stdexcept>
#include <string>
#include <vector>

#include "appindex/index_mgr_internal.h"
#include "appindex/string_pool_internal.h"
#include "tests/unit/lint/lint_test.h"
#include "tool/lint/package.h"

namespace tool::lint {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

TEST(Package, DirectoryIsAPackage) {
  const TempDir dir;
  const std::string conf = dir.Write("target/ui/index.conf", "{}");
  dir.Write("target/ui/texts/enu/strings", "");
  const auto packages = FindPackages(dir.Path(), "");
  ASSERT_EQ(packages.size(), 1U);
  EXPECT_EQ(packages[0].dir, dir.Path() + "/");
  EXPECT_EQ(packages[0].texts, dir / "target/ui/texts/");
  EXPECT_THAT(packages[0].checked, ElementsAre(conf));
  EXPECT_FALSE(packages[0].is_guessed);
}

TEST(Package, PartOfAnInstalledPackageMeansThePackage) {
  const TempDir dir;
  const std::string conf = dir.Write("var/packages/One/target/ui/index.conf", "{}");
  dir.Write("var/packages/One/share/texts/enu/strings", "");
  for (const std::string& path :
       {conf, dir / "var/packages/One/target", dir / "var/packages/One"}) {
    const auto packages = FindPackages(path, "");
    ASSERT_EQ(packages.size(), 1U) << path;
    EXPECT_EQ(packages[0].dir, dir / "var/packages/One/") << path;
    EXPECT_EQ(packages[0].texts, dir / "var/packages/One/share/texts/") << path;
    EXPECT_THAT(packages[0].checked, ElementsAre(conf)) << path;
  }
}

TEST(Package, TreeOfInstalledPackagesMeansAllThatHaveADescriptor) {
  const TempDir dir;
  const std::string one = dir.Write("var/packages/One/index.conf", "{}");
  const std::string two = dir.Write("var/packages/Two/ui/index.conf", "{}");
  dir.Write("var/packages/Three/readme", "");
  const std::string module = dir.Write("usr/tovo/tovoman/webman/modules/M/index.conf", "{}");
  dir.Write("usr/tovo/tovoman/webman/texts/enu/strings", "");
  const auto packages = FindPackages(dir.Path(), "");
  ASSERT_EQ(packages.size(), 3U);
  EXPECT_THAT(packages[0].checked, ElementsAre(one));
  EXPECT_THAT(packages[1].checked, ElementsAre(two));
  EXPECT_THAT(packages[2].checked, ElementsAre(module));
  EXPECT_EQ(packages[2].texts, dir / "usr/tovo/tovoman/webman/texts/");
  EXPECT_EQ(FindPackages(dir / "var/packages", "").size(), 2U);
  EXPECT_EQ(FindPackages(dir / "usr/tovo/tovoman/webman/modules", "").size(), 1U);
}

TEST(Package, DescriptorElsewhereBelongsToTheNearestDirectoryWithTexts) {
  const TempDir dir;
  const std::string conf = dir.Write("pkg/target/ui/index.conf", "{}");
  EXPECT_EQ(FindPackages(conf, "")[0].dir, dir / "pkg/target/ui/");
  dir.Write("pkg/texts/enu/strings", "");
  EXPECT_EQ(FindPackages(conf, "")[0].dir, dir / "pkg/");
  EXPECT_TRUE(FindPackages(conf, "")[0].is_guessed);
  const auto said = FindPackages(conf, dir.Path());
  EXPECT_EQ(said[0].dir, dir.Path() + "/");
  EXPECT_FALSE(said[0].is_guessed);
}

TEST(Package, FilesAmongInstalledPackagesAreNone) {
  const TempDir dir;
  dir.Write("var/packages/readme", "");
  const std::string file = dir.Write("var/packages/index.conf", "{}");
  dir.Write("var/packages/One/index.conf", "{}");
  ASSERT_EQ(FindPackages(dir / "var/packages", "").size(), 1U);
  const auto packages = FindPackages(file, "");  // named outright it is looked at all the same
  ASSERT_EQ(packages.size(), 1U);
  EXPECT_TRUE(packages[0].is_guessed);
  EXPECT_EQ(packages[0].dir, dir / "var/packages/");
}

TEST(Package, InstalledPackageWhoseDescriptorLiesTooDeepIsToldOf) {
  const TempDir dir;
  const std::string deep = dir.Write("var/packages/Deep/1/2/3/4/5/6/index.conf", "{}");
  const auto packages = FindPackages(dir.Path(), "");
  ASSERT_EQ(packages.size(), 1U);
  EXPECT_THAT(packages[0].checked, IsEmpty());
  EXPECT_THAT(packages[0].deep_descriptors, ElementsAre(deep));
}

TEST(Package, PartOfAPackageMeansTheDescriptorsInIt) {
  const TempDir dir;
  const std::string one = dir.Write("var/packages/One/a/index.conf", "{}");
  const std::string two = dir.Write("var/packages/One/b/index.conf", "{}");
  dir.Write("var/packages/One/c/readme", "");
  EXPECT_THAT(FindPackages(dir / "var/packages/One/a/", "")[0].checked, ElementsAre(one));
  EXPECT_THAT(FindPackages(dir / "var/packages/One/c", "")[0].checked, ElementsAre(one, two));
}

TEST(Package, BuiltInModuleOfADeviceWithoutTextsHasNone) {
  const TempDir dir;
  const std::string conf = dir.Write("usr/tovo/tovoman/webman/modules/M/index.conf", "{}");
  const auto packages = FindPackages(conf, "");
  ASSERT_EQ(packages.size(), 1U);
  EXPECT_TRUE(packages[0].is_built_in);
  EXPECT_EQ(packages[0].texts, "");
}

TEST(Package, FileNamedTextsIsNoDirectoryOfTexts) {
  const TempDir dir;
  dir.Write("a/texts", "");
  dir.Write("index.conf", "{}");
  EXPECT_EQ(FindPackages(dir.Path(), "")[0].texts, "");
  dir.Write("b/texts/enu/strings", "");
  EXPECT_EQ(FindPackages(dir.Path(), "")[0].texts, dir / "b/texts/");
}

TEST(Package, NothingIsLookedForFarBeyondTheReach) {
  const TempDir dir;
  std::string path;
  for (int level = 0; level < 30; ++level) path += "d/";
  dir.Write(path + "index.conf", "{}");
  const Package package = FindPackages(dir.Path(), "")[0];
  EXPECT_THAT(package.descriptors, IsEmpty());
  EXPECT_THAT(package.deep_descriptors, IsEmpty());
}

TEST(Package, DirectoryThatMayNotBeOpenedIsNamedWithTheCause) {
  const TempDir dir;
  for (const char* name : {"closed/file", "device/var/packages/file"}) dir.Write(name, "");
  ASSERT_EQ(chmod((dir / "closed").c_str(), 0), 0);
  ASSERT_EQ(chmod((dir / "device/var/packages").c_str(), 0), 0);
  ASSERT_EQ(chmod(dir.Path().c_str(), 0755), 0);
  std::vector<std::string> refusals;
  {
    const HeldBackByModes user;
    for (const char* name : {"closed", "device"}) {
      try {
        FindPackages(dir / name, "");
      } catch (const std::runtime_error& error) {
        refusals.emplace_back(error.what());
      }
    }
  }
  chmod((dir / "closed").c_str(), 0755);
  chmod((dir / "device/var/packages").c_str(), 0755);
  EXPECT_THAT(refusals,
              ElementsAre(::testing::HasSubstr("/closed: Permission denied; "),
                          ::testing::HasSubstr("/device/var/packages/: Permission denied; ")));
}

TEST(Package, FilesAreFoundAsTheLibraryFindsThem) {
  const TempDir dir;
  for (const char* name : {"1", "1/2", "1/2/3/4/5", "a/b", "1/2/3/4/5/6"}) {
    dir.Write(std::string(name) + "/index.conf", "{}");
    dir.Write(std::string(name) + "/texts/enu/strings", "");
  }
  const Package package = FindPackages(dir.Path(), "")[0];
  std::string first;
  ASSERT_TRUE(velkor::appindex::FindIndexConfByAppRoot(first, dir.Path() + "/", 0));
  EXPECT_THAT(package.descriptors, ::testing::Contains(first));
  EXPECT_THAT(package.descriptors, ::testing::SizeIs(4));
  EXPECT_THAT(package.deep_descriptors, ElementsAre(dir / "1/2/3/4/5/6/index.conf"));
  std::string texts;
  ASSERT_TRUE(velkor::appindex::FindPkgTextRoot(texts, dir.Path() + "/", 0));
  EXPECT_EQ(package.texts, texts);
  EXPECT_THAT(package.all_texts, ::testing::SizeIs(4));
  EXPECT_THAT(package.deep_texts, ElementsAre(dir / "1/2/3/4/5/6/texts/"));
}

TEST(Package, NoLinkIsFollowedForeverBeyondTheReach) {
  const TempDir dir;
  dir.Write("1/2/3/4/5/6/file", "");
  ASSERT_EQ(symlink("/", (dir / "1/2/3/4/5/6/root").c_str()), 0);
  EXPECT_THAT(FindPackages(dir.Path(), "")[0].deep_texts, IsEmpty());
}

TEST(Package, LinksThatLeadRoundAndRoundComeToAnEnd) {
  const TempDir dir;
  dir.Write("empty/file", "");
  dir.Write("full/index.conf", "{}");
  for (int i = 0; i < 60; ++i) {
    const std::string link = "/link" + std::to_string(i);
    ASSERT_EQ(symlink((dir / "empty").c_str(), (dir / ("empty" + link)).c_str()), 0);
    ASSERT_EQ(symlink((dir / "full").c_str(), (dir / ("full" + link)).c_str()), 0);
  }
  EXPECT_THAT(FindPackages(dir / "empty", "")[0].descriptors, IsEmpty());
  EXPECT_THAT(FindPackages(dir / "full", "")[0].descriptors, ::testing::SizeIs(100));
}

TEST(Package, PathThatCannotBeReadIsRefused) {
  const TempDir dir;
  EXPECT_THROW(FindPackages(dir / "nothing", ""), std::runtime_error);
  EXPECT_THROW(FindPackages(dir.Path(), dir / "nothing"), std::runtime_error);
}

TEST(Package, PathsAreShownFromTheCurrentDirectory) {
  const TempDir dir;
  dir.Write("a/file", "");
  ASSERT_EQ(chdir(dir.Path().c_str()), 0);
  EXPECT_EQ(DisplayPath(dir / "a/file"), "a/file");
  EXPECT_EQ(DisplayPath(dir.Path() + "/"), ".");
  EXPECT_EQ(DisplayPath(dir.Path() + "x/file"), dir.Path() + "x/file");
  EXPECT_EQ(FindPackages(".", "")[0].dir, dir.Path() + "/");
  ASSERT_EQ(chdir("/"), 0);
  EXPECT_EQ(DisplayPath("/a/file"), "/a/file");
}

}  // namespace
}  // namespace tool::lint
