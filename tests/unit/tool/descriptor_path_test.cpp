// The descriptor that an argument means.
#include "tool/descriptor_path.h"

#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tool/failure.h"

namespace tool {
namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::StartsWith;

class DescriptorPathTest : public test::DeviceRootTest {
 protected:
  static std::string Refusal(const std::string& argument) {
    try {
      return "found " + DescriptorPath(argument);
    } catch (const Failure& failure) {
      return failure.what();
    }
  }
};

TEST_F(DescriptorPathTest, DescriptorIsTakenAsItIs) {
  const std::string conf = test::Install("App");
  EXPECT_EQ(DescriptorPath(conf), conf);
  EXPECT_EQ(DescriptorPath("/var//packages/./App/target/../target/ui/index.conf"), conf);
}

TEST_F(DescriptorPathTest, RelativePathBeginsInTheCurrentDirectory) {
  const std::string conf = test::Install("App");
  ASSERT_EQ(chdir("/var/packages/App"), 0);
  EXPECT_EQ(DescriptorPath("target/ui/index.conf"), conf);
  EXPECT_EQ(DescriptorPath("."), conf);
}

TEST_F(DescriptorPathTest, DirectoryIsSearchedAsTheLibraryDoes) {
  const std::string conf = test::Install("App");
  EXPECT_EQ(DescriptorPath("/var/packages/App/"), conf);
  EXPECT_EQ(DescriptorPath("/var/packages/App/target"), conf);
  test::WriteFile("/var/packages/Deep/1/2/3/4/5/6/index.conf", "{}");
  EXPECT_THAT(Refusal("/var/packages/Deep"), HasSubstr("no index.conf in it"));
  EXPECT_THAT(TakeLog(), IsEmpty());
}

TEST_F(DescriptorPathTest, BuiltInModulesAreApplicationsToo) {
  const std::string conf = "/usr/tovo/tovoman/webman/modules/Files/index.conf";
  test::WriteFile(conf, "{}");
  EXPECT_EQ(DescriptorPath("/usr/tovo/tovoman/webman/modules/Files"), conf);
}

TEST_F(DescriptorPathTest, LinksAreNotReplaced) {
  test::WriteFile("/volume1/App/index.conf", "{}");
  ASSERT_EQ(symlink("/volume1/App", "/var/packages/App"), 0);
  EXPECT_EQ(DescriptorPath("/var/packages/App"), "/var/packages/App/index.conf");
}

TEST_F(DescriptorPathTest, OthersAreRefusedWithTheReason) {
  test::WriteFile("/etc/index.conf", "{}");
  test::WriteFile("/var/packages/index.conf", "{}");
  test::WriteFile("/var/packages/App/index.conf.bak", "{}");
  test::MakeDirs("/var/packages/Empty");
  ASSERT_EQ(mkfifo("/var/packages/App/index.conf", 0600), 0);
  const auto expect_refusal = [](const std::string& path, const std::string& cause,
                                 const std::string& advice) {
    EXPECT_THAT(Refusal(path), AllOf(StartsWith(path + ": "), HasSubstr(cause), HasSubstr("; "),
                                     HasSubstr(advice)));
  };
  expect_refusal("/etc/index.conf", "where applications are", "; install it there");
  expect_refusal("/var/packages/index.conf", "where applications are", "; install it there");
  expect_refusal("/var/packages/App/index.conf.bak", "others than index.conf", "rename it");
  expect_refusal("/var/packages/App/index.conf", "not a regular file", "; put a regular file");
  expect_refusal("/var/packages/Empty", "there is no index.conf in it", "; name a descriptor");
}

TEST_F(DescriptorPathTest, RootIsSearchedAsAnyDirectory) {
  EXPECT_EQ(Refusal("/"),
            "/: there is no index.conf in it, nor up to five levels below; name a descriptor, or a "
            "directory that holds one");
  const std::string conf = test::Install("App");
  EXPECT_EQ(Refusal("/"), "found " + conf);
  EXPECT_EQ(Refusal("/var/.."), "found " + conf);
}

TEST_F(DescriptorPathTest, WhatIsNotThereIsNamedAsSuch) {
  ASSERT_EQ(symlink("/volume9/App", "/var/packages/Dangling"), 0);
  for (const std::string path :
       {"/var/packages/App/index.conf", "/var/packages/Gone", "/var/packages/Dangling"}) {
    EXPECT_EQ(Refusal(path), path + ": No such file or directory; see whether the path is right");
  }
}

TEST_F(DescriptorPathTest, UnreadableFilesAreTold) {
  test::WriteFile("/var/packages/App/index.conf", "{,}");
  EXPECT_THAT(WhyUnreadable("/var/packages/App/index.conf"), HasSubstr("not strict JSON"));
  EXPECT_EQ(WhyUnreadable("/var/packages/Gone/index.conf"),
            "cannot be read: No such file or directory");
  EXPECT_EQ(WhyUnreadable(test::Install("Good")), "");
}

TEST_F(DescriptorPathTest, ReadableOnesAreRequiredWithTheFileTheCauseAndWhatToDo) {
  const auto refusal = [](const std::string& path) -> std::string {
    try {
      RequireReadable(path);
      return "";
    } catch (const Failure& failure) {
      return failure.what();
    }
  };
  const std::string conf = "/var/packages/App/index.conf";
  test::WriteFile(conf, "{,}");
  EXPECT_EQ(refusal(conf), conf + ": not strict JSON; `appindex lint` shows where");
  ASSERT_EQ(truncate(conf.c_str(), 20 * 1024 * 1024), 0);
  EXPECT_EQ(refusal(conf), conf + ": cannot be read: longer than 16 MiB; make it smaller");
  ASSERT_EQ(unlink(conf.c_str()), 0);
  ASSERT_EQ(mkfifo(conf.c_str(), 0600), 0);
  EXPECT_EQ(refusal(conf),
            conf + ": cannot be read: not a regular file; put a regular file in its place");
  EXPECT_EQ(refusal(test::Install("Good")), "");
}

}  // namespace
}  // namespace tool
