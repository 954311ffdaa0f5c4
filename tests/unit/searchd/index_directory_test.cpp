// The directories of indexes where the system refuses what is done to them.
#include "host/searchd/index_directory.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <cstring>
#include <functional>
#include <ostream>
#include <string>

#include "host/searchd/request_error.h"
#include "tests/support/device_root_test.h"
#include "tests/unit/searchd/failing_calls.h"

namespace searchd {
namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;

constexpr char kPath[] = "/var/packages/Velkor/etc/index";

void Prepare() { PrepareIndexDirectory(kPath, true); }
void Remove() { RemoveIndexDirectory(kPath); }
void SyncWithParents() { SyncIndexDirectory(kPath, true); }

// What is done, and the call that is refused on the way.
struct Refused {
  const char* name;
  void (*action)();
  FailingCall call;
};

void PrintTo(const Refused& refused, std::ostream* out) { *out << refused.name; }

class RefusedDirectoryTest : public test::DeviceRootTest,
                             public ::testing::WithParamInterface<Refused> {
 protected:
  ~RefusedDirectoryTest() override { failing_call = {}; }

  static void ExpectUsable() {
    EXPECT_FALSE(HoldsDatabase(kPath));
    EXPECT_TRUE(TableFiles(kPath).empty());
  }
};

TEST_P(RefusedDirectoryTest, IsAFailureOfStorageThatCanBeMadeUpFor) {
  const bool makes_it = std::string(GetParam().name).find("New") != std::string::npos;
  if (!makes_it) Prepare();
  failing_call = GetParam().call;
  try {
    GetParam().action();
    ADD_FAILURE() << "nothing failed";
  } catch (const RequestError& e) {
    EXPECT_EQ(e.GetCode(), Code::kStorage);
    EXPECT_THAT(e.what(), AllOf(HasSubstr("/var/packages/"),
                                HasSubstr(std::strerror(GetParam().call.error))));
  }
  EXPECT_EQ(failing_call.name, "") << "it was not called";
  GetParam().action();
  Prepare();
  ExpectUsable();
}

INSTANTIATE_TEST_SUITE_P(
    , RefusedDirectoryTest,
    ::testing::Values(Refused{"NewPackages", Prepare, {"open", EMFILE, 0}},
                      Refused{"NewParent", Prepare, {"openat", EMFILE, 0}},
                      Refused{"NewDirectory", Prepare, {"mkdirat", ENOSPC, 0}},
                      Refused{"NewDirectoryOpened", Prepare, {"openat", EMFILE, 3}},
                      Refused{"NewMarker", Prepare, {"openat", ENOSPC, 5}},
                      Refused{"Listing", Prepare, {"openat", EMFILE, 3}},
                      Refused{"ListingStream", Prepare, {"fdopendir", ENOMEM, 0}},
                      Refused{"Emptying", Prepare, {"unlinkat", EROFS, 0}},
                      Refused{"Removal", Remove, {"unlinkat", EROFS, 0}},
                      Refused{"RemovalOfTheDirectory", Remove, {"unlinkat", EBUSY, 11}},
                      Refused{"Sync", SyncWithParents, {"fsync", EIO, 0}},
                      Refused{"SyncOfAParent", SyncWithParents, {"fsync", EIO, 2}}),
    [](const auto& refused) { return std::string(refused.param.name); });

class IndexDirectoryTest : public test::DeviceRootTest {};

// Its own file is replaced by what cannot be removed as a file.
TEST_F(IndexDirectoryTest, AnEmptyDirectoryInPlaceOfAFileGoesAndAFullOneStays) {
  Prepare();
  test::MakeDirs(std::string(kPath) + "/postlist.glass");
  Remove();
  EXPECT_FALSE(test::Exists(kPath));

  Prepare();
  test::WriteFile(std::string(kPath) + "/postlist.glass/precious", "kept");
  EXPECT_THROW(Remove(), RequestError);
  EXPECT_EQ(test::ReadFile(std::string(kPath) + "/postlist.glass/precious"), "kept");
}

TEST_F(IndexDirectoryTest, OneThatWasHalfEmptiedIsEmptiedByWhoeverMakesItAnew) {
  test::WriteFile(std::string(kPath) + "/tovoelasticd.emptied", "");
  test::WriteFile(std::string(kPath) + "/postlist.glass", "half");
  PrepareIndexDirectory(kPath, false);
  EXPECT_TRUE(TableFiles(kPath).empty());
  EXPECT_FALSE(test::Exists(std::string(kPath) + "/tovoelasticd.emptied"));
}

TEST_F(IndexDirectoryTest, OneThatSomebodyElseUsesTooIsNotMadeAnew) {
  Prepare();
  test::WriteFile(std::string(kPath) + "/notes", "kept");
  EXPECT_THROW(PrepareIndexDirectory(kPath, true), RequestError);
  EXPECT_EQ(test::ReadFile(std::string(kPath) + "/notes"), "kept");
}

TEST_F(IndexDirectoryTest, TablesWithoutContentAreNoDatabase) {
  Prepare();
  test::WriteFile(std::string(kPath) + "/postlist.glass", "");
  EXPECT_FALSE(HoldsDatabase(kPath));
  test::WriteFile(std::string(kPath) + "/postlist.glass", "x");
  EXPECT_THROW(HoldsDatabase(kPath), RequestError) << "the file that tells their state is lost";
}

TEST_F(IndexDirectoryTest, OneThatIsGoneHasNothingToFinishNorToRemove) {
  FinishEmptying(kPath);
  Remove();
  EXPECT_TRUE(TableFiles(kPath).empty());
  EXPECT_FALSE(test::Exists(kPath));
}

TEST_F(IndexDirectoryTest, WhatIsNotThereCannotBeMadeDurable) {
  EXPECT_THROW(SyncWithParents(), RequestError);
}

TEST_F(IndexDirectoryTest, WhatSomebodyElsePutThereStaysAfterTheIndex) {
  Prepare();
  test::WriteFile(std::string(kPath) + "/notes", "kept");
  Remove();
  EXPECT_EQ(test::ReadFile(std::string(kPath) + "/notes"), "kept");
  EXPECT_FALSE(test::Exists(std::string(kPath) + "/tovoelasticd.index"));
}

}  // namespace
}  // namespace searchd
