// What the search daemon does not take.
#include "tool/refusal.h"

#include <gmock/gmock.h>

#include "appindex/error.h"
#include "tool/failure.h"

namespace tool {
namespace {

using ::testing::HasSubstr;
using ::testing::StartsWith;

constexpr std::size_t kMiB = std::size_t{1024} * 1024;

Json::Value Document(const std::string& member, const std::string& text) {
  Json::Value document(Json::objectValue);
  for (const char* name : {"id", "owner", "title", "desc", "keywords", "search_title"}) {
    document[name] = "text";
  }
  document[member] = text;
  return document;
}

std::string CausesOf(const Json::Value& document) {
  std::string causes;
  for (const Refusal& refusal : RefusalsOf(document)) {
    causes += refusal.member + " " + CauseOf(refusal) + "; ";
  }
  return causes;
}

TEST(Refusals, NoneForAUsualDocument) { EXPECT_EQ(CausesOf(Document("title", "Ü 写真")), ""); }

TEST(Refusals, NulInAnyMember) {
  for (const std::string member : {"id", "owner", "title", "desc", "keywords", "search_title"}) {
    EXPECT_EQ(CausesOf(Document(member, std::string("a\0b", 3))),
              member + " holds the character NUL; ");
  }
}

TEST(Refusals, LongTexts) {
  EXPECT_EQ(CausesOf(Document("id", std::string(4096, 'i'))), "");
  EXPECT_EQ(CausesOf(Document("id", std::string(4097, 'i'))), "id is longer than 4096 bytes; ");
  EXPECT_EQ(CausesOf(Document("desc", std::string(kMiB, 'd'))), "");
  EXPECT_EQ(CausesOf(Document("desc", std::string(kMiB + 1, 'd'))),
            "desc is longer than 1048576 bytes; ");
}

TEST(Refusals, ByteThatIsNotUtf8CountsAsThree) {
  EXPECT_EQ(CausesOf(Document("title", std::string(kMiB / 3, '\xFF'))), "");
  EXPECT_EQ(CausesOf(Document("title", std::string(kMiB / 3 + 1, '\xFF'))),
            "title is longer than 1048576 bytes; ");
}

TEST(Refusals, MessageThatIsTooLongAltogether) {
  Json::Value document = Document("title", std::string(kMiB, '\x01'));  // six bytes each in JSON
  document["desc"] = document["title"];
  EXPECT_EQ(CausesOf(document), "");
  document["keywords"] = document["title"];
  EXPECT_EQ(CausesOf(document), " is longer than 16777216 bytes; ");
}

TEST(Refusals, OfWhatIsNotSentAreNone) {
  Json::Value document = Document("title", std::string(kMiB, '\x01'));
  document["desc"] = document["keywords"] = document["title"];
  document["id"] = 5;
  EXPECT_EQ(CausesOf(document), "") << "without an id nothing is sent, however long";
  document = Document("title", "text");
  document["desc"] = Json::Value(Json::arrayValue);
  document["desc"].append(std::string(kMiB + 1, 'd'));
  EXPECT_EQ(CausesOf(document), "");
}

TEST(RequireTaken, ThrowsWithTheCodeThatAddingEndsIn) {
  RequireTaken("enu", Document("title", "text"));
  try {
    RequireTaken("enu", Document("title", std::string(kMiB + 1, 't')));
    FAIL() << "it was taken";
  } catch (const Failure& failure) {
    EXPECT_EQ(failure.code(), 603);
    EXPECT_THAT(failure.what(), HasSubstr("of \"text\" in enu: its \"title\" is longer than"));
  }
  Json::Value document = Document("title", "text");
  document["id"] = 5;
  EXPECT_THROW(RequireTaken("enu", document), velkor::Error);
}

TEST(RequireTaken, MessageThatCannotBeSentIs913) {
  Json::Value document = Document("title", std::string(kMiB, '\x01'));
  document["desc"] = document["keywords"] = document["title"];
  try {
    RequireTaken("enu", document);
    FAIL() << "it was taken";
  } catch (const Failure& failure) {
    EXPECT_EQ(failure.code(), 913);
    EXPECT_THAT(failure.what(), HasSubstr("in enu: it is longer than"));
  }
}

}  // namespace
}  // namespace tool
