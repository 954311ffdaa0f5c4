#include "host/searchd/registry.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>

#include "host/searchd/json_text.h"
#include "host/searchd/request_error.h"

namespace searchd {
namespace {

namespace fs = std::filesystem;

class RegistryTest : public testing::Test {
 protected:
  void SetUp() override {
    std::string name = testing::TempDir() + "/registry.XXXXXX";
    ASSERT_NE(mkdtemp(name.data()), nullptr);
    dir_ = name;
  }
  void TearDown() override { fs::remove_all(dir_); }

  std::string File() const { return dir_ / "indexes.json"; }
  void Write(const std::string& text) const { std::ofstream(File(), std::ios::binary) << text; }
  static std::string Read(const std::string& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
  }

  fs::path dir_;
  std::string damage_;
};

IndexDefinition Definition(const std::string& id) {
  return {id, "/var/packages/x/" + id, ParseJson(R"({"property_id":"id"})")};
}

TEST_F(RegistryTest, IsEmptyBeforeThereIsAFile) {
  EXPECT_TRUE(Registry(File()).Load(damage_).empty());
  EXPECT_EQ(damage_, "");
}

TEST_F(RegistryTest, GivesBackWhatWasSaved) {
  const Registry registry(File());
  registry.Save({RegistryEntry(Definition("a")), RegistryEntry(Definition("b"))});
  const std::vector<IndexDefinition> loaded = registry.Load(damage_);
  ASSERT_EQ(loaded.size(), 2U);
  EXPECT_EQ(loaded[1].id, "b");
  EXPECT_EQ(loaded[1].path, "/var/packages/x/b");
  EXPECT_EQ(loaded[1].mappings["property_id"], "id");

  registry.Save({});
  EXPECT_TRUE(registry.Load(damage_).empty());
  EXPECT_EQ(damage_, "");
}

TEST_F(RegistryTest, IsPrivateAndLeavesNoTemporaryFile) {
  Registry(File()).Save({});
  struct stat status {};
  ASSERT_EQ(stat(File().c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777U, 0600U);
  EXPECT_EQ(std::distance(fs::directory_iterator(dir_), {}), 1);
}

TEST_F(RegistryTest, ReplacesATornTemporaryFile) {
  std::ofstream(File() + ".tmp") << "{\"form";
  const Registry registry(File());
  EXPECT_TRUE(registry.Load(damage_).empty());
  registry.Save({RegistryEntry(Definition("a"))});
  EXPECT_EQ(registry.Load(damage_).size(), 1U);
}

TEST_F(RegistryTest, SetsADamagedFileAside) {
  const Registry registry(File());
  for (const std::string text :
       {"", "{", "[]", "{}", "{\"format\":2,\"indexes\":[]}", "{\"format\":1,\"indexes\":{}}",
        "{\"format\":1,\"indexes\":[{}]}", "{\"format\":1,\"indexes\":[{\"id\":\"a\"}]}",
        "{\"format\":1,\"indexes\":[{\"id\":\"a\",\"path\":\"/etc\",\"mappings\":{}}]}",
        "{\"format\":1,\"indexes\":[{\"id\":\"a\",\"path\":\"/var/packages/"
        "a\",\"mappings\":{}}]}"}) {
    Write(text);
    EXPECT_TRUE(registry.Load(damage_).empty()) << text;
    EXPECT_NE(damage_.find(File()), std::string::npos) << damage_;
    EXPECT_FALSE(fs::exists(File()));
    EXPECT_EQ(Read(File() + ".damaged"), text);
    fs::remove(File() + ".damaged");
  }
}

TEST_F(RegistryTest, SetsAsideWhateverIsInItsPlace) {
  const Registry registry(File());
  const auto expect_set_aside = [&](const std::string& cause) {
    EXPECT_TRUE(registry.Load(damage_).empty());
    EXPECT_NE(damage_.find(File()), std::string::npos) << damage_;
    EXPECT_NE(damage_.find(cause), std::string::npos) << damage_;
    EXPECT_FALSE(fs::exists(fs::symlink_status(File())));
    registry.Save({});
    EXPECT_TRUE(registry.Load(damage_).empty());
    EXPECT_EQ(damage_, "");
    fs::remove(File());
  };
  fs::create_directory(File());
  expect_set_aside("cannot be read");
  ASSERT_EQ(mkfifo(File().c_str(), 0600), 0);
  expect_set_aside("cannot be read");
  fs::create_symlink("indexes.json", File());
  expect_set_aside("cannot be read");
}

TEST_F(RegistryTest, KeepsWhatWasSetAsideBefore) {
  const Registry registry(File());
  for (const char* text : {"{1", "{2", "{3"}) {
    Write(text);
    EXPECT_TRUE(registry.Load(damage_).empty());
  }
  EXPECT_EQ(Read(File() + ".damaged"), "{1");
  EXPECT_EQ(Read(File() + ".damaged.2"), "{2");
  EXPECT_EQ(Read(File() + ".damaged.3"), "{3");
}

TEST_F(RegistryTest, KeepsTheFileWhenItCannotBeReplaced) {
  const Registry registry(File());
  registry.Save({RegistryEntry(Definition("a"))});
  fs::create_directory(File() + ".tmp");  // where the new file would go
  EXPECT_THROW(registry.Save({}), RequestError);
  EXPECT_EQ(registry.Load(damage_).size(), 1U);
}

}  // namespace
}  // namespace searchd
