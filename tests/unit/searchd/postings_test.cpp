#include "host/searchd/postings.h"

#include <gtest/gtest.h>

#include <utility>
#include <vector>

namespace searchd {
namespace {

using Counts = std::vector<std::pair<Xapian::docid, Xapian::termcount>>;

class PostingReaderTest : public testing::Test {
 protected:
  void Add(const std::vector<std::pair<std::string, Xapian::termcount>>& terms) {
    Xapian::Document document;
    for (const auto& [term, count] : terms) document.add_term(term, count);
    database_.add_document(document);
  }

  static Counts CountsOf(const std::vector<Posting>& postings) {
    Counts counts;
    for (const Posting& posting : postings) counts.emplace_back(posting.document, posting.count);
    return counts;
  }

  Xapian::WritableDatabase database_{"", Xapian::DB_BACKEND_INMEMORY};
};

TEST_F(PostingReaderTest, GivesTheDocumentsOfATermAndHowOftenItStandsThere) {
  Add({{"wmail", 2}});
  Add({{"wmailbox", 1}});
  Add({{"wmail", 1}});
  PostingReader reader(database_);
  EXPECT_EQ(CountsOf(reader.Read({"wmail"})), (Counts{{1, 2}, {3, 1}}));
}

TEST_F(PostingReaderTest, GivesNothingForATermThatIsNotThere) {
  Add({{"wmail", 2}});
  PostingReader reader(database_);
  EXPECT_EQ(CountsOf(reader.Read({"wphoto"})), Counts{});
  EXPECT_EQ(CountsOf(reader.Read({"wphoto", true})), Counts{});
}

TEST_F(PostingReaderTest, AddsUpTheTermsThatBeginSo) {
  Add({{"wmailbox", 1}});
  Add({{"wmail", 2}, {"wmailbox", 3}, {"wphoto", 1}});
  Add({{"wmail", 0}});
  PostingReader reader(database_);
  EXPECT_EQ(CountsOf(reader.Read({"wmai", true})), (Counts{{1, 1}, {2, 5}, {3, 0}}));
  EXPECT_EQ(CountsOf(reader.Read({"wmailb", true})), (Counts{{1, 1}, {2, 3}}));
}

TEST_F(PostingReaderTest, TellsATermFromTheTermsThatBeginSo) {
  Add({{"wmail", 1}});
  Add({{"wmailbox", 1}});
  PostingReader reader(database_);
  EXPECT_EQ(CountsOf(reader.Read({"wmail"})), (Counts{{1, 1}}));
  EXPECT_EQ(CountsOf(reader.Read({"wmail", true})), (Counts{{1, 1}, {2, 1}}));
  EXPECT_EQ(CountsOf(reader.Read({"wmail"})), (Counts{{1, 1}}));
}

}  // namespace
}  // namespace searchd
