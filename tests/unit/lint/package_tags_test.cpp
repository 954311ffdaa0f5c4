// The findings about where a package keeps its descriptor.
#include <sys/stat.h>

#include "tests/unit/lint/lint_test.h"

namespace tool::lint {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

constexpr char kLiteral[] = R"({"app": "A", "title": "Literal", "desc": "d"})";

TEST_F(LintTest, DescriptorMissing) {
  dir_.Write("empty/ui/Index.conf", kLiteral);
  const auto found = FindIn(dir_ / "empty");
  ASSERT_THAT(found, ElementsAre(Is("descriptor-missing", "")));
  EXPECT_EQ(found[0].file, dir_ / "empty/");
}

TEST_F(LintTest, DescriptorSecondIsTheOneThatIsNotMetFirst) {
  const std::string one =
      dir_.Write("two/a/index.conf", R"({"app": "A", "title": "T", "desc": "d"})");
  const std::string two =
      dir_.Write("two/b/index.conf", R"({"app": "B", "title": "T", "desc": "d"})");
  const auto found = FindIn(dir_ / "two");
  ASSERT_THAT(found, ElementsAre(Is("descriptor-second", "")));
  const std::string other = found[0].file == one ? two : one;
  EXPECT_THAT(found[0].message, HasSubstr(other));
}

TEST_F(LintTest, DescriptorSecondIsToldOfOneWhenTheFirstIsNotKnown) {
  const std::string one =
      dir_.Write("two/a/index.conf", R"({"app": "A", "title": "T", "desc": "d"})");
  const std::string two =
      dir_.Write("two/b/index.conf", R"({"app": "B", "title": "T", "desc": "d"})");
  // Whatever order the file system has, some of these are met first.
  const std::vector<std::string> closed = {"two/0", "two/m", "two/zz"};
  for (const std::string& name : closed) {
    dir_.Write(name + "/file", "");
    ASSERT_EQ(chmod((dir_ / name).c_str(), 0), 0);
  }
  ASSERT_EQ(chmod(dir_.Path().c_str(), 0755), 0);
  std::vector<Finding> found;
  {
    const HeldBackByModes user;
    found = FindIn(dir_ / "two", "descriptor-second");
  }
  for (const std::string& name : closed) chmod((dir_ / name).c_str(), 0755);
  ASSERT_THAT(found, ElementsAre(Is("descriptor-second", "")));
  EXPECT_THAT(found[0].message, HasSubstr(DisplayPath(found[0].file == one ? two : one)));
}

TEST_F(LintTest, DescriptorBeyondReach) {
  const std::string deep = dir_.Write("deep/1/2/3/4/5/6/index.conf", kLiteral);
  const auto found = FindIn(dir_ / "deep");
  ASSERT_THAT(found, ElementsAre(Is("descriptor-beyond-reach", "")));
  EXPECT_EQ(found[0].file, deep);
}

TEST_F(LintTest, DescriptorWithinReach) {
  dir_.Write("near/1/2/3/4/5/index.conf", kLiteral);
  EXPECT_THAT(FindIn(dir_ / "near"), IsEmpty());
}

TEST_F(LintTest, DescriptorName) {
  const std::string file = dir_.Write("pkg/ui/Index.conf", kLiteral);
  EXPECT_THAT(FindIn(file, "descriptor-name"), ElementsAre(Is("descriptor-name", "")));
  EXPECT_THAT(FindIn(dir_ / "pkg/ui/index.conf", "descriptor-name"), IsEmpty());
}

TEST_F(LintTest, PackageDocuvault) {
  dir_.Write("Docuvault/index.conf", kLiteral);
  EXPECT_THAT(FindIn(dir_ / "Docuvault"), ElementsAre(Is("package-docuvault", "")));
  dir_.Write("docuvault/index.conf", kLiteral);
  EXPECT_THAT(FindIn(dir_ / "docuvault"), IsEmpty());
}

TEST_F(LintTest, PackageUnknownUnlessItIsSaid) {
  const std::string file = dir_ / "pkg/ui/index.conf";
  EXPECT_THAT(FindIn(file), ElementsAre(Is("package-unknown", "")));
  options_.package_dir = dir_ / "pkg";
  EXPECT_THAT(FindIn(file), IsEmpty());
}

}  // namespace
}  // namespace tool::lint
