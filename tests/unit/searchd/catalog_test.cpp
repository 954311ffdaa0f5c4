#include "host/searchd/catalog.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <functional>
#include <string>

#include "host/searchd/json_text.h"
#include "host/searchd/request_error.h"
#include "tests/support/device_root_test.h"

namespace searchd {
namespace {

using test::Exists;
using test::ReadFile;
using test::WriteFile;

constexpr char kRegistryFile[] = "/var/lib/tovoelasticd/indexes.json";
constexpr char kPath[] = "/var/packages/Velkor/etc/indexes/enu";
constexpr char kMarker[] = "/var/packages/Velkor/etc/indexes/enu/tovoelasticd.index";

IndexDefinition Definition(const std::string& id, const std::string& path = kPath) {
  return {id, path, ParseJson(R"({"property_id":"id"})")};
}

class CatalogTest : public test::DeviceRootTest {
 protected:
  CatalogTest() { test::MakeDirs("/var/lib/tovoelasticd"); }

  CheckProcess checks_{STDERR_FILENO};

  static bool IsRegistered(const std::string& id) {
    return ReadFile(kRegistryFile).find("\"" + id + "\"") != std::string::npos;
  }

  static Code FailureOf(const std::function<void()>& call) {
    try {
      call();
    } catch (const RequestError& e) {
      return e.GetCode();
    }
    ADD_FAILURE() << "nothing failed";
    return Code::kStorage;
  }
};

TEST_F(CatalogTest, KnowsAnIndexAtOnceAndAfterARestartOnceItIsSaved) {
  Catalog catalog(kRegistryFile, checks_);
  EXPECT_FALSE(catalog.NeedsSave());
  catalog.Create(Definition("a"));
  EXPECT_EQ(catalog.Find("a")->Definition().path, kPath);
  EXPECT_TRUE(catalog.NeedsSave());
  EXPECT_FALSE(Exists(kRegistryFile));

  catalog.Save();
  EXPECT_FALSE(catalog.NeedsSave());
  EXPECT_EQ(Catalog(kRegistryFile, checks_).Find("a")->Definition().path, kPath);
}

TEST_F(CatalogTest, KeepsTheFilesOfADeletedIndexUntilThatIsSaved) {
  Catalog catalog(kRegistryFile, checks_);
  catalog.Create(Definition("a"));
  catalog.Save();
  catalog.Delete("a");
  EXPECT_EQ(FailureOf([&] { catalog.Find("a"); }), Code::kNoSuchIndex);
  EXPECT_TRUE(Exists(kMarker));
  EXPECT_TRUE(IsRegistered("a"));

  catalog.SaveIfNeeded();
  EXPECT_FALSE(Exists(kPath));
  EXPECT_FALSE(IsRegistered("a"));
}

TEST_F(CatalogTest, MakesAnIndexAnewWhereItWasDeleted) {
  Catalog catalog(kRegistryFile, checks_);
  catalog.Create(Definition("a"));
  catalog.Save();
  catalog.Delete("a");
  catalog.Create(Definition("a"));
  catalog.Save();
  EXPECT_TRUE(Exists(kMarker));
  EXPECT_TRUE(IsRegistered("a"));
}

TEST_F(CatalogTest, ForgetsAnIndexForGoodBeforeAnotherTakesItsDirectory) {
  Catalog catalog(kRegistryFile, checks_);
  catalog.Create(Definition("a"));
  catalog.Save();
  catalog.Delete("a");
  catalog.Create(Definition("b"));
  EXPECT_FALSE(IsRegistered("a"));
  EXPECT_TRUE(Exists(kMarker));

  catalog.Delete("b");
  catalog.Create(Definition("c", std::string(kPath) + "/inside"));
  catalog.Save();
  EXPECT_FALSE(Exists(kMarker));
  EXPECT_TRUE(IsRegistered("c"));
}

TEST_F(CatalogTest, ReportsARegistryThatCannotBeWrittenAndTriesAgain) {
  Catalog catalog(kRegistryFile, checks_);
  catalog.Create(Definition("a"));
  test::MakeDirs(std::string(kRegistryFile) + ".tmp");
  catalog.SaveIfNeeded();
  EXPECT_FALSE(catalog.NeedsSave()) << "it must not be tried again without end";
  EXPECT_EQ(FailureOf([&] { catalog.Save(); }), Code::kStorage);
  EXPECT_EQ(catalog.Find("a")->Definition().path, kPath);

  rmdir((std::string(kRegistryFile) + ".tmp").c_str());
  catalog.Save();
  EXPECT_TRUE(IsRegistered("a"));
}

TEST_F(CatalogTest, SaysWhichIndexesADamagedRegistryHasLost) {
  WriteFile(kRegistryFile, "{\"format\":1,");
  Catalog catalog(kRegistryFile, checks_);
  EXPECT_EQ(FailureOf([&] { catalog.Find("a"); }), Code::kStorage);
  EXPECT_EQ(FailureOf([&] { catalog.Find("b"); }), Code::kStorage);

  catalog.Delete("a");
  EXPECT_EQ(FailureOf([&] { catalog.Find("a"); }), Code::kNoSuchIndex);
  EXPECT_EQ(FailureOf([&] { catalog.Delete("a"); }), Code::kNoSuchIndex);
  EXPECT_EQ(FailureOf([&] { catalog.Find("b"); }), Code::kStorage);

  catalog.Create(Definition("b"));
  EXPECT_EQ(catalog.Find("b")->Definition().path, kPath);
  catalog.Delete("b");
  EXPECT_EQ(FailureOf([&] { catalog.Find("b"); }), Code::kNoSuchIndex);
}

}  // namespace
}  // namespace searchd
