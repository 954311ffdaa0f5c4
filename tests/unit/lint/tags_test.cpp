#include "tool/lint/tags.h"

#include <gtest/gtest.h>

#include <regex>
#include <set>

namespace tool::lint {
namespace {

TEST(Tags, NamesAreDistinctAndInKebabCase) {
  std::set<std::string> names;
  for (const Tag& tag : AllTags()) {
    EXPECT_TRUE(std::regex_match(tag.name, std::regex("[a-z0-9]+(-[a-z0-9]+)+"))) << tag.name;
    EXPECT_TRUE(names.insert(tag.name).second) << tag.name;
    EXPECT_EQ(FindTag(tag.name), &tag);
  }
  EXPECT_EQ(FindTag("no-such-tag"), nullptr);
}

// Tags are named in other people's configuration: none may go.
TEST(Tags, PublishedOnesAreThere) {
  for (const char* name : {"json-syntax",          "not-utf8",          "wrong-type",
                           "missing-member",       "params-missing",    "empty-member",
                           "no-entries",           "unknown-member",    "weight-range",
                           "description-missing",  "duplicate-id",      "keyword-repeats-title",
                           "filter-never-passes",  "model-unknown",     "platform-unknown",
                           "reference-unresolved", "english-missing",   "section-missing",
                           "section-uneven",       "text-missing",      "text-empty",
                           "text-untranslated",    "language-absent",   "language-unknown",
                           "texts-not-found",      "texts-ambiguous",   "texts-beyond-reach",
                           "descriptor-missing",   "descriptor-second", "descriptor-beyond-reach",
                           "descriptor-name",      "package-docuvault", "package-unknown",
                           "nul-character",        "text-too-long",     "descriptor-unreadable",
                           "texts-unread"}) {
    EXPECT_NE(FindTag(name), nullptr) << name;
  }
}

TEST(Tags, EachIsExplainedInLinesThatFitATerminal) {
  for (const Tag& tag : AllTags()) {
    const std::string text = std::string(tag.summary) + "\n" + tag.explanation + "\n";
    EXPECT_GT(text.size(), 100U) << tag.name;
    std::size_t begin = 0;
    for (std::size_t end = text.find('\n'); end != std::string::npos;
         end = text.find('\n', begin)) {
      EXPECT_LE(end - begin, 80U) << tag.name << ": " << text.substr(begin, end - begin);
      begin = end + 1;
    }
  }
}

}  // namespace
}  // namespace tool::lint
