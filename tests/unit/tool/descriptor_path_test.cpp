// The descriptor that an argument means.
#include "tool/descriptor_path.h"

#include <gmock/gmock.h>
#include <unistd.h>

#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tool/failure.h"

namespace tool {
namespace {

using ::testing::HasSubstr;
using ::testing::IsEmpty;

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
  EXPECT_THAT(Refusal("/etc/index.conf"), HasSubstr("where applications are"));
  EXPECT_THAT(Refusal("/var/packages/index.conf"), HasSubstr("where applications are"));
  EXPECT_THAT(Refusal("/var/packages/App/index.conf.bak"), HasSubstr("is named index.conf"));
  EXPECT_THAT(Refusal("/var/packages/App/index.conf"), HasSubstr("no such file"));
}

TEST_F(DescriptorPathTest, UnreadableFilesAreTold) {
  test::WriteFile("/var/packages/App/index.conf", "{,}");
  EXPECT_THAT(WhyUnreadable("/var/packages/App/index.conf"), HasSubstr("not strict JSON"));
  EXPECT_EQ(WhyUnreadable("/var/packages/Gone/index.conf"),
            "cannot be read: No such file or directory");
  EXPECT_EQ(WhyUnreadable(test::Install("Good")), "");
}

}  // namespace
}  // namespace tool
