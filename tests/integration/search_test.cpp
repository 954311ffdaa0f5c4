// What the library writes is what searches find.
#include <gmock/gmock.h>

#include "appindex/elastic_control.h"
#include "appindex/index_mgr.h"
#include "tests/integration/real_device.h"

namespace velkor::appindex {
namespace {

using test::ConfOf;
using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Not;

class LibrarySearch : public test::RealDeviceTest {};

TEST_F(LibrarySearch, ReindexFindsEveryApplicationAndModuleInEveryLanguage) {
  Reindex();
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Photos"}));
}

TEST_F(LibrarySearch, ReindexFindsWordsOfEachLanguage) {
  Reindex();
  EXPECT_THAT(Found("ger", "Datensicherung"), ElementsAre("Backup"));
  EXPECT_THAT(Found("ger", "fotoalbum"), ElementsAre("Photos"));
  EXPECT_THAT(Found("ger", "Dateimanager"), ElementsAre("Files"));
  EXPECT_THAT(Found("tha", "สำรอง"), ElementsAre("Backup"));
  EXPECT_THAT(Found("tha", "รูปภาพ"), ElementsAre("Photos"));
  EXPECT_THAT(Found("jpn", "バックアップ"), ElementsAre("Backup"));
  EXPECT_THAT(Found("jpn", "写真"), ElementsAre("Photos"));
  EXPECT_THAT(Found("jpn", "album"), ElementsAre("Photos")) << "English goes along";
  EXPECT_THAT(Found("jpn", "Datensicherung"), IsEmpty()) << "others do not";
}

TEST_F(LibrarySearch, HitShowsTheLocalisedTitleAndTheOwner) {
  Reindex();
  Json::Value query;
  query["id"] = "appindex_ger";
  query["query"] = "Datensicherung";
  const Json::Value hit = test::RealDaemon::Ask("search", query)["hits"][0];
  EXPECT_EQ(hit["title"], "Datensicherung");
  EXPECT_EQ(hit["owner"], "");
  query["query"] = "Recycle";
  EXPECT_EQ(test::RealDaemon::Ask("search", query)["hits"][0]["owner"], "Files");
}

TEST_F(LibrarySearch, ReindexForgetsWhatIsNoLongerInstalled) {
  Reindex();
  unlink(ConfOf("Photos").c_str());
  Reindex();
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash"}));
}

TEST_F(LibrarySearch, AddedApplicationIsFoundOnceCommitted) {
  Reindex();
  InstallPackage("Mail", {{"enu", "Mail Server"}, {"ger", "Postamt"}});
  Add(ConfOf("Mail"), true);
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Mail", "Photos"}));
  EXPECT_THAT(Found("ger", "Postamt"), ElementsAre("Mail"));
}

TEST_F(LibrarySearch, AddWithoutCommitIsFoundAfterTheCallersOwnCommit) {
  Reindex();
  InstallPackage("Mail", {{"enu", "Mail Server"}});
  Add(ConfOf("Mail"), false);
  EXPECT_THAT(Found("ger", "everything"), Not(Contains("Mail")));
  elastic::IndexCommit("ger");
  EXPECT_THAT(Found("ger", "everything"), Contains("Mail"));
}

TEST_F(LibrarySearch, AddAgainReplacesTheDocuments) {
  Reindex();
  test::WriteFile(ConfOf("Photos"),
                  R"({"app":"Photos","title":"Camera","keywords":["everything"]})");
  Add(ConfOf("Photos"), true);
  EXPECT_THAT(Found("ger", "Camera"), ElementsAre("Photos"));
  EXPECT_THAT(Found("ger", "fotoalbum"), IsEmpty());
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Photos"}));
}

TEST_F(LibrarySearch, RemovedApplicationIsNotFoundNorAreItsModules) {
  Reindex();
  Del(test::kFilesConf, true);
  EXPECT_EQ(Everything(), Exactly({"Backup", "Photos"}));
  Del(test::kFilesConf, true);
  EXPECT_EQ(Everything(), Exactly({"Backup", "Photos"})) << "removed again";
}

TEST_F(LibrarySearch, AddToADaemonWithoutIndexesRebuildsThemAll) {
  Add(ConfOf("Photos"), true);
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Photos"}));
}

TEST_F(LibrarySearch, AddWhenOneLanguagesIndexIsMissingRebuildsThemAll) {
  Reindex();
  elastic::AppIndexDelete("rus");
  Add(ConfOf("Photos"), true);
  EXPECT_EQ(Everything(), Exactly({"Backup", "Files", "Files?tab=trash", "Photos"}));
}

TEST_F(LibrarySearch, DelFromADaemonWithoutIndexesIsItsError601) {
  EXPECT_EQ(test::ThrownBy([] { Del(ConfOf("Photos"), true); }).code, Error::kDaemonIndexMissing);
}

TEST_F(LibrarySearch, CreatingAnIndexTwiceIsTheDaemonsError602) {
  elastic::AppIndexCreate("enu");
  EXPECT_EQ(test::ThrownBy([] { elastic::AppIndexCreate("enu"); }).code, 602);
}

}  // namespace
}  // namespace velkor::appindex
